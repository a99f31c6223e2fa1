#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/property_value.h"

namespace platform {

// A record as people and files know it. Whatever a record does not have is empty.
struct RecordName {
  std::string type{};
  std::string name{};  // what its user calls it
  std::string identifier{};
  std::string parent{};  // the identifier of the record that it lies in

  friend bool operator==(const RecordName&, const RecordName&) = default;
};

// One key of a record that has another value, or stands there no longer (no `to`), or is new (no `from`). Where the
// value is that of a key which went at the same time, `oldKey` is that key, and it is not told of separately. The
// values are whole and may be credentials: whoever shows them goes by platform/description.h.
struct RecordChange {
  std::string key;
  std::string oldKey{};
  std::optional<PropertyValue> from{};
  std::optional<PropertyValue> to{};

  friend bool operator==(const RecordChange&, const RecordChange&) = default;
};

// One thing that a stage of a run did. What is said of each kind beside the subject:
struct RunFact {
  enum class Kind : std::uint8_t {
    loaded,         // records were read: `count`, `version`; no subject
    unread,         // the file `path` stands there and none of its records was read; `reason`; no subject
    added,          // a new record
    converted,      // a new record, or one in place of that with its identifier: `reason` is from what, and `changes`
    changed,        // a record: `changes`
    moved,          // a record into `others`, one record, or out of its parent where there is none
    folded,         // a record that went, since `others` do its work; `reason`
    dropped,        // a record that went; `reason` is the rule by which it did
    repeated,       // a record that now stands once more
    unrepaired,     // a record that stays as it is; `reason` is what is wrong with it
    failed,         // the records of the file `path` were not converted; `reason`; no subject
    saved,          // records were written to `path`: `count`, `version`; no subject
    saveFailed,     // records were not written to `path`; `reason`; no subject
    fileRemoved,    // the file `path`; no subject
    sourceRemoved,  // the file `path`, out of which records were converted; no subject
    fileUnremoved   // the file `path`, which was to go and is still there; `reason`; no subject
  };

  Kind kind;
  RecordName subject{};
  std::vector<RecordChange> changes{};
  std::vector<RecordName> others{};
  std::string reason{};
  std::string path{};
  std::size_t count = 0;
  std::uint64_t version = 0;

  friend bool operator==(const RunFact&, const RunFact&) = default;
};

}  // namespace platform
