#include <array>

#include "accountsettings/vocabulary.h"
#include "migrator/account_stage.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/stored_names.h"
#include "migrator/version_chain.h"
#include "platform/platform.h"

namespace migrator {
namespace {

using Step = AccountsDataMigrator::Step;

constexpr auto kSteps = std::to_array<Step>({
    {0, "_migrateAccountsFrom7A149:", &AccountsDataMigrator::_migrateAccountsFrom7A149},
    {1, "_migrateAccountsFrom7A150:", &AccountsDataMigrator::_migrateAccountsFrom7A150},
    {2, "_migrateAccountsFrom7A153:", &AccountsDataMigrator::_migrateAccountsFrom7A153},
    {3, "_migrateAccountsFrom7A241:", &AccountsDataMigrator::_migrateAccountsFrom7A241},
    {4, "_migrateAccountsFrom7A242:", &AccountsDataMigrator::_migrateAccountsFrom7A242},
    {5, "_migrateAccountsFrom8A293:", &AccountsDataMigrator::_migrateAccountsFrom8A293},
    {6, "_migrateAccountsFrom8B117:", &AccountsDataMigrator::_migrateAccountsFrom8B117},
    {7, "_migrateAccountsFrom8C136:", &AccountsDataMigrator::_migrateAccountsFrom8C136},
    {8, "_migrateAccountsFrom8F191:", &AccountsDataMigrator::_migrateAccountsFrom8F191},
    {9, "_migrateAccountsFrom9A182:", &AccountsDataMigrator::_migrateAccountsFrom9A182},
    {10, "_migrateAccountsFrom9A334:", &AccountsDataMigrator::_migrateAccountsFrom9A334},
    {11, "_migrateAccountsFrom9B176:", &AccountsDataMigrator::_migrateAccountsFrom9B176},
});
static_assert(leadsTo(accountsettings::kCurrentVersion, kSteps));

// The same reading as the store's: whatever gives no integer is version 0.
std::uint64_t versionOf(const Dictionary& settings) {
  const PropertyValue* const version = settings.find(accountsettings::kPlistVersionKey);
  return static_cast<std::uint64_t>(version != nullptr ? version->integerValue().value_or(0) : 0);
}

Dictionary settingsFile() {
  return platform::current()
      .propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist())
      .valueOr({});
}

}  // namespace

bool AccountsDataMigrator::_migrateNewAccountsInfo(AccountsManager& store) {
  const std::uint64_t storedVersion = versionOf(settingsFile());
  // The report keeps a copy of its own, read before any step can save the file.
  const Dictionary settingsBeforeSteps = settingsFile();
  if (_saveMigrationInformation() && _collatedMigrationData) {
    _collatedMigrationData->set(kOldAccountSettingsKey, settingsBeforeSteps);
  }
  // Compared without sign: a negative stored version counts as newer than every release and is left alone.
  if (storedVersion >= AccountsManager::currentVersion()) return true;
  return runVersionSteps(std::span{kSteps}, storedVersion, [&](const Step& step) {
    const AccountStage stage{step.name, store};
    return (this->*step.run)(store);
  });
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
