#include "accountsettings/file_paths.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/legacy_conversion.h"

namespace migrator {

using Part = platform::MigrationFile::Part;

// The copy aside and the report are records of a run: it adds them, and no later run reads them.
platform::MigrationFootprint AccountsDataMigrator::footprint() const {
  const std::string exchange = accountsettings::daAccountPath();
  const std::string mail = accountsettings::mailAccountsPath();
  return {.lockName = std::string{accountsettings::kMigrationLockName.view()},
          .versionKey = std::string{accountsettings::kPlistVersionKey.view()},
          .files = {{Part::settings, AccountsManager::fullPathToAccountSettingsPlist()},
                    {Part::legacy, exchange},
                    {Part::legacy, mail},
                    {Part::other, originalCompanionOf(exchange)},
                    {Part::other, originalCompanionOf(mail)},
                    {Part::other, accountsettings::removalSentinelPath()},
                    {Part::other, accountsettings::mailAutoFetchMarkerPath()}}};
}

}  // namespace migrator
