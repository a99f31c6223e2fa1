#include "accountsettings/accounts_manager.h"
#include "accountsettings/assertion_failure.h"
#include "accountsettings/file_paths.h"
#include "accountsettings/log_handle.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

using platform::ExclusiveFileLock;

bool skipsNotifications = false;

bool existsAt(const platform::Path& path) { return platform::current().files->kindOf(path).isOk(); }

// Nothing where the file cannot be read, or where it has no version.
std::optional<std::int64_t> savedVersion() {
  const platform::Result<Dictionary> file =
      platform::current().propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist());
  if (!file.isOk()) return std::nullopt;
  const PropertyValue* const entry = file.value().find(kPlistVersionKey);
  const std::optional<std::int64_t> version = entry == nullptr ? std::nullopt : entry->integerValue();
  if (!version) {
    _ASLogSystem().log("+[AccountsManager(MigrationSupport) accountSettingsNeedsToBeMigrated]",
                       "Account Settings plist is missing a version number, returning NO for migration");
  }
  return version;
}

void requireOutParameter(const bool* parameter, std::string_view message) {
  if (parameter != nullptr) return;
  failAssertion("+[AccountsManager(MigrationSupport) shouldMigrateOldMailAccounts:oldDAAccounts:newAccountSettings:]",
                "AccountsManager", message);
}

}  // namespace

std::unique_ptr<ExclusiveFileLock> AccountsManager::createAndLockMigrationLock() {
  auto lock = platform::current().locks->lockNamed(kMigrationLockName);
  return lock.isOk() && lock.value()->lock().isOk() ? lock.take() : nullptr;
}

void AccountsManager::releaseMigrationLock(std::unique_ptr<ExclusiveFileLock> lock) {
  if (lock != nullptr) lock->unlock();
}

void AccountsManager::waitForMigrationToFinish() { releaseMigrationLock(createAndLockMigrationLock()); }

std::uint64_t AccountsManager::currentVersion() { return kCurrentVersion; }

void AccountsManager::_setShouldSkipNotifications(bool skip) { skipsNotifications = skip; }

bool AccountsManager::shouldSkipNotifications() { return skipsNotifications; }

bool AccountsManager::_oldDAAccountsInformationFound() { return existsAt(daAccountPath()); }

bool AccountsManager::_oldMailAccountsInformationFound() { return existsAt(mailAccountsPath()); }

bool AccountsManager::accountSettingsNeedsToBeMigrated() {
  const std::optional<std::int64_t> saved = savedVersion();
  // Without sign, so that a negative version counts as newer than the current one.
  if (!saved || static_cast<std::uint64_t>(*saved) >= currentVersion()) return false;
  _ASLogSystem().log("+[AccountsManager(MigrationSupport) accountSettingsNeedsToBeMigrated]",
                     "Account Settings Version out of date: savedVersion=%ld, currentVersion=%ld", *saved,
                     currentVersion());
  return true;
}

void AccountsManager::shouldMigrateOldMailAccounts_oldDAAccounts_newAccountSettings(bool* migrateOldMailAccounts,
                                                                                    bool* migrateOldDAAccounts,
                                                                                    bool* migrateNewAccounts) {
  requireOutParameter(migrateOldMailAccounts, "migrateOldMailAccounts cannot be nil");
  requireOutParameter(migrateOldDAAccounts, "migrateOldDAAccounts cannot be nil");
  requireOutParameter(migrateNewAccounts, "migrateNewAccounts cannot be nil");
  *migrateOldMailAccounts = _oldMailAccountsInformationFound();
  *migrateOldDAAccounts = _oldDAAccountsInformationFound();
  // Legacy accounts take precedence: where there are any, the settings file is not looked at.
  const bool hasLegacyAccounts = *migrateOldMailAccounts || *migrateOldDAAccounts;
  *migrateNewAccounts = !hasLegacyAccounts && accountSettingsNeedsToBeMigrated();
  if (!hasLegacyAccounts && !*migrateNewAccounts) return;
  _ASLogSystem().log(
      "+[AccountsManager(MigrationSupport) shouldMigrateOldMailAccounts:oldDAAccounts:newAccountSettings:]",
      "Accounts settings needs migration! oldMailAccountsPresent=%d, oldDAAccountsPresent=%d, "
      "migrateNewAccountsInfo=%d",
      *migrateOldMailAccounts, *migrateOldDAAccounts, *migrateNewAccounts);
}

void AccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation() {
  const platform::Path path = fullPathToAccountSettingsPlist();
  if (!existsAt(path)) return;
  const platform::Status removed = platform::current().files->remove(path);
  if (removed.isOk()) return;
  _ASLogSystem().log("+[AccountsManager(MigrationSupport) removeNewAccountSettingsToMigrateOldAccountInformation]",
                     "Could not remove %@. Error %@", path.native(), removed.description());
}

}  // namespace accountsettings
