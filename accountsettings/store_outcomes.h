#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/property_value.h"
#include "platform/status.h"
#include "records/loss.h"

namespace accountsettings {

// Why an element of the file became no account.
enum class WhyLeftOut : std::uint8_t {
  noRecord,     // it is no dictionary
  noType,       // it says no type
  unknownType,  // its type is none that is configured, or no text
  noClass,      // its type is known, but nothing was made of it
  givenUp       // a fixer found that it is beyond repair: its class is unknown
};

// What a run tells of an element that was left out.
[[nodiscard]] constexpr records::LossCode lossCodeOf(WhyLeftOut why) {
  switch (why) {
    case WhyLeftOut::noRecord: return records::LossCode::droppedNoRecord;
    case WhyLeftOut::noType: return records::LossCode::droppedNoType;
    case WhyLeftOut::unknownType: return records::LossCode::droppedUnknownType;
    case WhyLeftOut::noClass: return records::LossCode::droppedNoClass;
    case WhyLeftOut::givenUp: break;
  }
  return records::LossCode::droppedUnknownClass;
}

struct LeftOutRecord {
  std::size_t position = 0;  // in the file's list of accounts
  platform::PropertyValue element;
  WhyLeftOut why = WhyLeftOut::noRecord;
};

// How a store came by its accounts.
struct LoadOutcome {
  bool isFromFile = false;  // false: the accounts were in memory already, and nothing else is said here
  // Success where the file was read; missing where there is none. Any other failure is that of a file which stands
  // there and counts as an empty one (see PropertyListStore::readDictionary).
  platform::Status reading;
  std::optional<std::int64_t> storedVersion;  // nothing where the file has no version that is a number
  std::vector<LeftOutRecord> leftOut;

  // Whether there is a file that could not be read, so that a save puts another one in its place.
  [[nodiscard]] bool hasUnreadFile() const { return !reading.isOk() && reading.cause() != platform::Cause::missing; }
};

// How far a save came.
struct SaveOutcome {
  enum class Stage : std::uint8_t {
    none,         // there was none yet
    merging,      // the accounts are put together with what the file holds
    serializing,  // they become bytes
    naming,       // a name for a temporary file is found
    creating,     // the temporary file is made
    givingAway,   // it gets its owner
    replacing,    // it is moved onto the settings file
    saved         // all is done
  };
  Stage stage = Stage::none;  // the one that failed, unless it is one of the two outer ones
  // Why. Success also where the save failed since it was ended by an exception, out of memory for example.
  platform::Status status = {};

  [[nodiscard]] bool isSaved() const { return stage == Stage::saved; }
  [[nodiscard]] bool hasFailed() const { return stage != Stage::none && stage != Stage::saved; }
};

}  // namespace accountsettings
