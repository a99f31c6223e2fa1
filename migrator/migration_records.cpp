#include <tuple>

#include "accountsettings/file_paths.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/stored_names.h"
#include "migrator/telling.h"
#include "platform/platform.h"
#include "platform/run_observer.h"
#include "records/fact_observer.h"
#include "records/message.h"

namespace migrator {
namespace {

using platform::FileKind;
using platform::Path;

constexpr std::string_view kSwitchDomain = "com.vorlix.accountsettings-logging";
constexpr std::string_view kSwitchKey = "ASSaveMigrationInformation";
constexpr unsigned kOpenToEverybody = 0777;
// No minutes and no seconds: reports of one tenth of a second of one hour share a name, and the later one stays.
constexpr std::string_view kReportTimePattern = "Y-M-d-H-M-S";

// Answers whether reports can be written there.
bool prepareReportDirectory(const Path& directory) {
  platform::FileSystem& files = *platform::current().files;
  const platform::Result<FileKind> kind = files.kindOf(directory);
  if (!kind.isOk()) {
    const platform::Status made = files.createDirectories(directory, kOpenToEverybody);
    if (made.isOk()) return true;
    writeToConsole(
        "AccountMigration warning: Could not create the directory to store migration information at %@ [Error = %@]",
        directory.native(), made.description());
    return false;
  }
  if (kind == FileKind::directory) return true;
  writeToConsole("AccountMigrator warning: %@ already exists and is not a directory", directory.native());
  return false;
}

}  // namespace

Path AccountsDataMigrator::copyAsidePath() {
  return platform::current().directories->sharedResources() / accountsettings::kCrashReporterDirectory /
         Path{AccountsManager::fullPathToAccountSettingsPlist()}.filename();
}

void AccountsDataMigrator::_copyAsideAccountsPlist() {
  const platform::RunStage stage{"copy aside"};
  platform::FileSystem& files = *platform::current().files;
  const Path source = AccountsManager::fullPathToAccountSettingsPlist();
  const Path destination = copyAsidePath();
  if (files.kindOf(destination).isOk() && !files.remove(destination).isOk()) {
    writeToConsole("Couldn't remove existing accountsettings copy at %@", destination.native());
  }
  const platform::Status copied = files.copy(source, destination);
  if (!copied.isOk())
    return writeToConsole("Error trying to save an accountsettings plist copy: %@", copied.description());
  records::tellFact([&] { return records::CopiedAside{destination.string()}; });
}

bool AccountsDataMigrator::_saveMigrationInformation() {
  static bool hasBeenRead = false;
  static bool isOn = false;
  if (!hasBeenRead) {
    hasBeenRead = true;
    platform::PreferencesStore& preferences = *platform::current().preferences;
    preferences.synchronize(kSwitchDomain);
    isOn = preferences.boolean(kSwitchDomain, kSwitchKey).value_or(false);
  }
  return isOn;
}

void AccountsDataMigrator::_saveCollatedMigrationInformation() {
  writeToConsole("Saving collated migration information");
  if (_collatedMigrationData) {
    const Path settingsFile = AccountsManager::fullPathToAccountSettingsPlist();
    _collatedMigrationData->set(kSavedSettingsKey,
                                platform::current().propertyLists->readDictionary(settingsFile).valueOr({}));
  }
  const Path directory =
      platform::current().directories->home() / accountsettings::kCrashReporterDirectory / "AccountMigration";
  // The directory is made also for a run that migrated nothing and so has nothing to report.
  if (!prepareReportDirectory(directory) || !_collatedMigrationData) return;
  // A binary property list, whatever its ".txt" says. Nobody hears of a report that cannot be written.
  const platform::Platform& services = platform::current();
  const std::string time = services.clock->currentLocalTime(kReportTimePattern).valueOr({});
  const std::string name = records::message("AccountMigrationInformation-%@.txt", {time});
  const auto serialized = services.propertyLists->serialize(*_collatedMigrationData);
  if (serialized.data != nullptr) std::ignore = services.files->replace(directory / name, *serialized.data);
}

}  // namespace migrator
