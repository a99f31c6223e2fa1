#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "platform/file_system.h"

namespace tools {

// One thing that is not as a run of this release would have left it. The texts are clauses of a sentence for people;
// they hold no credential. `kind` is for scripts, and so a contract (docs/ACCOUNTCTL.md lists the kinds).
struct Finding {
  std::string_view kind;
  std::string place;       // "Version", "Accounts[2]", "Accounts[2].ChildAccounts[0]"; empty for the file as a whole
  std::string identifier;  // the record's; empty where it has none
  std::string what;
  std::string migration;  // what a migration does about it: "a migration …"
};

using Findings = std::vector<Finding>;

// What is found in a settings file that was read, in its order. Nothing here knows by itself what can be loaded and
// what is repaired: each record is given to the library, and what it makes of it is compared with the record.
[[nodiscard]] Findings findingsOfRoot(const accountsettings::Dictionary& file);
[[nodiscard]] Findings findingsOfVersion(const accountsettings::Dictionary& file);
[[nodiscard]] Findings findingsOfRecords(const accountsettings::Array& accounts);

// The two files of the first releases.
enum class LegacyForm : std::uint8_t { exchange, mail };
// Which of them a property list is; nothing for any other.
[[nodiscard]] std::optional<LegacyForm> legacyFormOf(const accountsettings::Dictionary& file);
[[nodiscard]] platform::Path pathOf(LegacyForm form);
// How many accounts it describes.
[[nodiscard]] std::size_t countOfDescriptions(LegacyForm form, const accountsettings::Dictionary& file);
// The descriptions for which a migration converts nothing of the file.
[[nodiscard]] Findings findingsOfDescriptions(LegacyForm form, const accountsettings::Dictionary& file);
// What a migration makes of the device's own file, which is empty where it cannot be read, beside the settings file.
[[nodiscard]] Findings findingsOfConversion(LegacyForm form, const accountsettings::Dictionary& file);
// The accounts of the settings file that go when the device's own file is converted.
[[nodiscard]] Findings findingsOfReplacement(LegacyForm form, const accountsettings::Dictionary& file,
                                             const accountsettings::Dictionary& settings);
// Whether a run died while it deleted the legacy files: the next one only finishes that.
[[nodiscard]] bool isDeletionUnderWay();

// What stands at a path that should have a regular file, and who may read it. Where nothing does, nothing is found.
enum class Part : std::uint8_t { settings, legacy };
[[nodiscard]] Findings findingsOfStanding(const platform::Path& path, Part part);
// Why a file that stands there was not read, and what that means; not for Cause::missing.
[[nodiscard]] Finding unreadable(const platform::Status& reading, Part part);

// What runs and other programs left beside those files, each with what is found.
struct Leftover {
  platform::Path path;
  Finding finding;
};
[[nodiscard]] std::vector<Leftover> leftoversOnDevice();

}  // namespace tools
