#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "platform/property_value.h"
#include "records/loss.h"

namespace records {

using platform::PropertyValue;

// A record as people and files know it. Whatever a record does not have is empty.
struct Name {
  std::string type{};
  std::string name{};  // what its user calls it
  std::string identifier{};
  std::string parent{};  // the identifier of the record that it lies in

  friend bool operator==(const Name&, const Name&) = default;
};

// One key of a record that has another value, or stands there no longer (no `to`), or is new (no `from`). Where the
// value is that of a key which went at the same time, `oldKey` is that key, and it is not told of separately. The
// values are whole and may be credentials: whoever shows them goes by records/description.h.
struct Change {
  std::string key;
  std::string oldKey{};
  std::optional<PropertyValue> from{};
  std::optional<PropertyValue> to{};

  friend bool operator==(const Change&, const Change&) = default;
};

// --- The facts of a run: what a stage of it did. Accounts are named as of the end of the stage. ---

// The settings file was read; where there is none, as no accounts of version 0.
struct Loaded {
  std::size_t accounts = 0;
  std::uint64_t version = 0;
  friend bool operator==(const Loaded&, const Loaded&) = default;
};

// The settings file was copied, as it stood before the run.
struct CopiedAside {
  std::string file;
  friend bool operator==(const CopiedAside&, const CopiedAside&) = default;
};

// A file that the run takes away, though accounts in it stand nowhere else, was kept first where no run overwrites it.
struct KeptAside {
  std::string file;  // empty for the settings file
  std::string where;
  friend bool operator==(const KeptAside&, const KeptAside&) = default;
};

// A temporary file that a program which was killed had left behind was removed.
struct Swept {
  std::string file;
  friend bool operator==(const Swept&, const Swept&) = default;
};

// A new account.
struct Added {
  Name account;
  friend bool operator==(const Added&, const Added&) = default;
};

// An account made of a description in a legacy file, new or in place of the one with its identifier.
struct Converted {
  Name account;
  std::string from;  // where the description stands, for people
  std::string file;
  bool isReplacement = false;
  std::vector<Change> changes{};  // since the description, or of the account that was replaced
  friend bool operator==(const Converted&, const Converted&) = default;
};

struct Changed {
  Name account;
  std::vector<Change> changes;
  friend bool operator==(const Changed&, const Changed&) = default;
};

// Into another account, or out of its parent where there is none.
struct Moved {
  Name account;
  std::optional<Name> into{};
  friend bool operator==(const Moved&, const Moved&) = default;
};

// An account that went since others do its work, and is therefore not lost.
struct Folded {
  Name account;
  std::vector<Name> into;
  std::string reason;
  friend bool operator==(const Folded&, const Folded&) = default;
};

// An account that went, or a whole file of them.
struct Lost {
  LossCode code{};
  Name account{};        // empty where the loss is no single account's
  std::string detail{};  // what the code leaves open, such as the unknown type
  std::string file{};    // the file that it was in; empty for the settings file
  std::string where{};   // what still has its data; empty where that is not known, or nothing has
  friend bool operator==(const Lost&, const Lost&) = default;
};

// An account that now stands once more.
struct Repeated {
  Name account;
  friend bool operator==(const Repeated&, const Repeated&) = default;
};

// An account that stays as it is, though something is wrong with it.
struct Unrepaired {
  Name account;
  std::string reason;
  friend bool operator==(const Unrepaired&, const Unrepaired&) = default;
};

struct Saved {
  std::string file;
  std::size_t accounts = 0;
  std::uint64_t version = 0;
  friend bool operator==(const Saved&, const Saved&) = default;
};

struct SaveFailed {
  std::string file;
  std::string cause;
  std::size_t accounts = 0;
  std::uint64_t version = 0;
  friend bool operator==(const SaveFailed&, const SaveFailed&) = default;
};

struct FileRemoved {
  std::string file;
  bool isSource = false;  // a legacy file, whose accounts are on the device no longer unless they were saved
  friend bool operator==(const FileRemoved&, const FileRemoved&) = default;
};

// A file that was to go and is still there.
struct FileNotRemoved {
  std::string file;
  std::string cause;
  friend bool operator==(const FileNotRemoved&, const FileNotRemoved&) = default;
};

using Fact = std::variant<Loaded, CopiedAside, KeptAside, Swept, Added, Converted, Changed, Moved, Folded, Lost,
                          Repeated, Unrepaired, Saved, SaveFailed, FileRemoved, FileNotRemoved>;

// Makes one visitor of several functions; the compiler refuses one that leaves a kind of fact out.
template <typename... Functions>
struct Visitor : Functions... {
  using Functions::operator()...;
};
template <typename... Functions>
Visitor(Functions...) -> Visitor<Functions...>;

// The name of a fact's kind, as machines and people read it.
[[nodiscard]] inline std::string_view nameOf(const Fact& fact) {
  return std::visit(
      Visitor{[](const Loaded&) { return "loaded"; }, [](const CopiedAside&) { return "copied-aside"; },
              [](const KeptAside&) { return "kept-aside"; }, [](const Swept&) { return "swept"; },
              [](const Added&) { return "added"; }, [](const Converted&) { return "converted"; },
              [](const Changed&) { return "changed"; }, [](const Moved&) { return "moved"; },
              [](const Folded&) { return "folded"; }, [](const Lost&) { return "lost"; },
              [](const Repeated&) { return "repeated"; }, [](const Unrepaired&) { return "kept"; },
              [](const Saved&) { return "saved"; }, [](const SaveFailed&) { return "save-failed"; },
              [](const FileRemoved& removed) { return removed.isSource ? "source-removed" : "file-removed"; },
              [](const FileNotRemoved&) { return "file-not-removed"; }},
      fact);
}

}  // namespace records
