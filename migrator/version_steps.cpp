#include <array>

#include "accountsettings/vocabulary.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/hostile_accounts.h"
#include "migrator/stored_names.h"
#include "migrator/version_chain.h"
#include "platform/platform.h"

namespace migrator {
namespace {

using Step = AccountsDataMigrator::Step;

constexpr auto kSteps = std::to_array<Step>({
    {0, "_migrateAccountsFrom7A149:", "nothing changes but the version",
     &AccountsDataMigrator::_migrateAccountsFrom7A149},
    {1, "_migrateAccountsFrom7A150:", "each account keeps the identifier it was synced by, and gets one of its own",
     &AccountsDataMigrator::_migrateAccountsFrom7A150},
    {2, "_migrateAccountsFrom7A153:", "the on-device account is made anew, with the data that the device keeps itself",
     &AccountsDataMigrator::_migrateAccountsFrom7A153},
    {3, "_migrateAccountsFrom7A241:", "hosted accounts no longer sync notes",
     &AccountsDataMigrator::_migrateAccountsFrom7A241},
    {4, "_migrateAccountsFrom7A242:", "Gmail and Yahoo accounts get their own type, and their calendars",
     &AccountsDataMigrator::_migrateAccountsFrom7A242},
    {5, "_migrateAccountsFrom8A293:", "small devices keep notes to themselves",
     &AccountsDataMigrator::_migrateAccountsFrom8A293},
    {6, "_migrateAccountsFrom8B117:", "hosted mail accounts get an account above them",
     &AccountsDataMigrator::_migrateAccountsFrom8B117},
    {7, "_migrateAccountsFrom8C136:", "children of a cloud account lose their name, and active mail is switched on",
     &AccountsDataMigrator::_migrateAccountsFrom8C136},
    {8, "_migrateAccountsFrom8F191:", "nothing changes but the version",
     &AccountsDataMigrator::_migrateAccountsFrom8F191},
    {9, "_migrateAccountsFrom9A182:", "one account becomes the primary one, and reminders follow calendars",
     &AccountsDataMigrator::_migrateAccountsFrom9A182},
    {10, "_migrateAccountsFrom9A334:", "documents stay with the primary account, and children's data is provisioned",
     &AccountsDataMigrator::_migrateAccountsFrom9A334},
    {11, "_migrateAccountsFrom9B176:", "passes follow documents in the primary account, and cloud tabs bookmarks",
     &AccountsDataMigrator::_migrateAccountsFrom9B176},
});
static_assert(leadsTo(accountsettings::kCurrentVersion, kSteps));

Dictionary settingsFile() {
  return platform::current()
      .propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist())
      .valueOr({});
}

}  // namespace

bool AccountsDataMigrator::_migrateNewAccountsInfo(AccountsManager& store) {
  // The same reading as the store's: whatever gives no integer is version 0.
  const Dictionary settings = settingsFile();
  const PropertyValue* const version = settings.find(accountsettings::kPlistVersionKey);
  const auto storedVersion = static_cast<std::uint64_t>(version != nullptr ? version->integerValue().value_or(0) : 0);
  // The report keeps a copy of its own, read before any step can save the file.
  const Dictionary settingsBeforeSteps = settingsFile();
  if (_saveMigrationInformation() && _collatedMigrationData) {
    _collatedMigrationData->set(kOldAccountSettingsKey, settingsBeforeSteps);
  }
  // Compared without sign: a negative stored version counts as newer than every release and is left alone.
  if (storedVersion >= AccountsManager::currentVersion()) return true;
  refuseHostileAccounts(store);
  return runVersionSteps(std::span{kSteps}, storedVersion,
                         [&](const Step& step) { return runAsStage(*this, step, store); });
}

std::span<const AccountsDataMigrator::Step> AccountsDataMigrator::versionSteps() { return kSteps; }

bool AccountsDataMigrator::_newAccountsInformationPresent() {
  return platform::current().files->kindOf(AccountsManager::fullPathToAccountSettingsPlist()).isOk();
}

// Nothing changed between the first two releases but the version.
bool AccountsDataMigrator::_migrateAccountsFrom7A149(AccountsManager& store) {
  store.setDataVersion(1);
  return true;
}

}  // namespace migrator
