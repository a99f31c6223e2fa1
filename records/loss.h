#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace records {

// Every way in which a run loses accounts. `dropped…` are records that the required rules leave out of the settings.
enum class LossCode : std::uint8_t {
  droppedNoRecord,
  droppedNoType,
  droppedUnknownType,
  droppedNoClass,
  droppedUnknownClass,
  deleted,
  removed,
  removedFromParent,
  replaced,
  replacedWithType,
  replacedDuplicate,
  refusedDescription,
  refusedFile,
  unreadableLegacyFile,
  unreadableSettingsFile,
  newerSettingsFile,
  failedStep,
  notSaved
};

// A code as machines read it, which stays what it is, and what it means to people.
struct LossMeaning {
  LossCode code;
  std::string_view name;
  std::string_view text;
};

inline constexpr std::array kLossMeanings{
    LossMeaning{LossCode::droppedNoRecord, "dropped-no-record", "it is no account record"},
    LossMeaning{LossCode::droppedNoType, "dropped-no-type", "it has no type"},
    LossMeaning{LossCode::droppedUnknownType, "dropped-unknown-type", "its type is unknown"},
    LossMeaning{LossCode::droppedNoClass, "dropped-no-class", "it has no class"},
    LossMeaning{LossCode::droppedUnknownClass, "dropped-unknown-class",
                "its class is unknown and no directory tells a better one"},
    LossMeaning{LossCode::deleted, "deleted", "it was deleted"},
    LossMeaning{LossCode::removed, "removed", "it was taken out"},
    LossMeaning{LossCode::removedFromParent, "removed-from-parent", "it no longer stands in its parent"},
    LossMeaning{LossCode::replaced, "replaced", "another account was put in its place"},
    LossMeaning{LossCode::replacedWithType, "replaced-with-type",
                "the accounts of its type were replaced, and it is none of the new ones"},
    LossMeaning{LossCode::replacedDuplicate, "replaced-duplicate",
                "another record has its identifier and was written in its place"},
    LossMeaning{LossCode::refusedDescription, "refused-description", "its description in the legacy file has no class"},
    LossMeaning{LossCode::refusedFile, "refused-file",
                "another description was refused, and with it every account of the legacy file"},
    LossMeaning{LossCode::unreadableLegacyFile, "unreadable-legacy-file", "the legacy file could not be read"},
    LossMeaning{LossCode::unreadableSettingsFile, "unreadable-settings-file",
                "the settings file could not be read, and a new one was written in its place"},
    LossMeaning{LossCode::newerSettingsFile, "newer-settings-file",
                "the settings file is of a newer version, and what only that one knows was left out"},
    LossMeaning{LossCode::failedStep, "failed-step", "a version step failed, and no later run tries it again"},
    LossMeaning{LossCode::notSaved, "not-saved", "the legacy file was deleted, but its accounts were not saved"},
};

[[nodiscard]] constexpr const LossMeaning& meaningOf(LossCode code) {
  return kLossMeanings[static_cast<std::size_t>(code)];
}

namespace internal {

constexpr bool isInOrder() {
  for (std::size_t place = 0; place < kLossMeanings.size(); ++place) {
    if (kLossMeanings[place].code != LossCode{static_cast<std::uint8_t>(place)}) return false;
  }
  return kLossMeanings.back().code == LossCode::notSaved;
}

}  // namespace internal

static_assert(internal::isInOrder(), "the table has one row for each code, in the order of the codes");

}  // namespace records
