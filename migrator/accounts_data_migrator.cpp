#include "migrator/accounts_data_migrator.h"

#include <exception>
#include <memory>
#include <tuple>
#include <utility>

#include "accountsettings/file_paths.h"
#include "accountsettings/product_values.h"
#include "migrator/legacy_conversion.h"
#include "migrator/telling.h"
#include "platform/modules.h"
#include "platform/platform.h"
#include "platform/run_observer.h"

namespace migrator {
namespace {

const platform::ClassRegistration kRegistration{std::make_shared<platform::DataClassMigratorClass>(
    "AccountsDataMigrator", [] { return std::make_unique<AccountsDataMigrator>(); })};

// Says what was thrown. Out of memory even for that, it says less, and at last nothing.
void reportThrown(std::string_view what) noexcept {
  try {
    writeToConsole("AccountsDataMigrator: The migration was given up. %s", what);
  } catch (...) {
    try {
      writeToConsole("AccountsDataMigrator: The migration was given up.");
    } catch (...) {
      return;
    }
  }
}

void reportCurrentException() noexcept {
  try {
    throw;
  } catch (const std::exception& exception) {
    reportThrown(exception.what());
  } catch (...) {
    reportThrown("Something was thrown that is no exception");
  }
}

struct Decision {
  bool mail = false;
  bool exchange = false;
  bool newSettings = false;

  [[nodiscard]] bool isLegacyFound() const { return mail || exchange; }
  [[nodiscard]] bool isAnythingToMigrate() const { return isLegacyFound() || newSettings; }
};

Decision decide() {
  const platform::RunStage stage{"decision"};
  Decision decision;
  AccountsManager::shouldMigrateOldMailAccounts_oldDAAccounts_newAccountSettings(&decision.mail, &decision.exchange,
                                                                                 &decision.newSettings);
  return decision;
}

std::shared_ptr<AccountsManager> loadStore() {
  const platform::RunStage stage{"load"};
  return AccountsManager::initInsideOfMigration();
}

// The version steps alone decide the outcome: a conversion that failed shows only in the log, and its legacy file is
// deleted like any other. They run after a conversion too, so that converted accounts pass through them.
bool migrate(AccountsDataMigrator& migrator, AccountsManager& store, const Decision& decision) {
  migrator._collatedMigrationData.reset();
  if (AccountsDataMigrator::_saveMigrationInformation()) migrator._collatedMigrationData.emplace();
  writeToConsole("Migrating accounts");
  if (decision.exchange) {
    const AccountStage stage{"exchange conversion", store};
    std::ignore = migrator._migrateDAAccounts(store);
  }
  if (decision.mail) {
    const AccountStage stage{"mail conversion", store};
    std::ignore = migrator._migrateMailAccounts(store);
  }
  const platform::RunStage stage{"version steps"};
  return migrator._migrateNewAccountsInfo(store);
}

void concludeSuccessfulRun(AccountsDataMigrator& migrator, const Decision& decision) {
  // Nobody asks whether the save went through: the legacy files go after every successful run, and with them, where the
  // file could not be saved, the only copy of the accounts in them. Who cannot bear that keeps a copy of the device.
  if (decision.isLegacyFound()) {
    const platform::RunStage stage{"legacy removal"};
    migrator._removeOldAccountsInfo();
  }
  if (AccountsDataMigrator::_saveMigrationInformation()) {
    const platform::RunStage stage{"report"};
    migrator._saveCollatedMigrationInformation();
  }
  std::ignore = removeAndTell(accountsettings::mailAutoFetchMarkerPath());
  platform::current().preferencesChanged->post(accountsettings::kMailPreferencesDomain,
                                               accountsettings::kMailPreferencesAccountsKey);
}

}  // namespace

AccountsDataMigrator::~AccountsDataMigrator() { _collatedMigrationData.reset(); }

std::string_view AccountsDataMigrator::dataClassName() const { return "accounts"; }

// The copy aside and the report are records of a run: it adds them, and no later run reads them.
platform::MigrationFootprint AccountsDataMigrator::footprint() const {
  using Part = platform::MigrationFile::Part;
  const std::string exchange = accountsettings::daAccountPath();
  const std::string mail = accountsettings::mailAccountsPath();
  return {.lockName = std::string{accountsettings::kMigrationLockName.view()},
          .versionKey = std::string{accountsettings::kPlistVersionKey.view()},
          .currentVersion = static_cast<std::int64_t>(AccountsManager::currentVersion()),
          .files = {{Part::settings, AccountsManager::fullPathToAccountSettingsPlist()},
                    {Part::legacy, exchange},
                    {Part::legacy, mail},
                    {Part::other, originalCompanionOf(exchange)},
                    {Part::other, originalCompanionOf(mail)},
                    {Part::sentinel, accountsettings::removalSentinelPath()},
                    {Part::marker, accountsettings::mailAutoFetchMarkerPath()}},
          .copyAside = copyAsidePath()};
}

bool AccountsDataMigrator::performMigration() {
  std::unique_ptr<platform::ExclusiveFileLock> lock;
  bool hasSucceeded = false;
  try {
    lock = AccountsManager::createAndLockMigrationLock();
    hasSucceeded = lock != nullptr && executeMigrationSteps();
  } catch (...) {
    reportCurrentException();
    AccountsManager::_setShouldSkipNotifications(false);
  }
  try {
    AccountsManager::releaseMigrationLock(std::move(lock));
  } catch (...) {
    reportCurrentException();
  }
  return hasSucceeded;
}

bool AccountsDataMigrator::executeMigrationSteps() {
  AccountsManager::_setShouldSkipNotifications(true);
  _copyAsideAccountsPlist();
  if (_failedToRemoveOldAccountsInfo()) {
    const platform::RunStage stage{"legacy removal"};
    writeToConsole("Detected that a removal old accounts info was in progress. Early return!.");
    tellUnsavedExchange();
    tellUnsavedMail();
    _removeOldAccountsInfo();
    return true;  // and leaves notifications off for the rest of the process, as this exit always has
  }
  const Decision decision = decide();
  std::shared_ptr<AccountsManager> store = loadStore();
  const bool hasSucceeded = !decision.isAnythingToMigrate() || migrate(*this, *store, decision);
  // Also after failed steps: the file is stamped with the current version whatever became of the run.
  store->setDataVersion(AccountsManager::currentVersion());
  store->saveAllAccounts();
  store.reset();
  if (hasSucceeded) concludeSuccessfulRun(*this, decision);
  AccountsManager::_setShouldSkipNotifications(false);
  return hasSucceeded;
}

}  // namespace migrator
