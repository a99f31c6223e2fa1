#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/basic_account.h"
#include "migrator/version_chain.h"
#include "platform/data_class_migrator.h"

namespace migrator {

using accountsettings::AccountsManager;
using accountsettings::Array;
using accountsettings::BasicAccount;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;

// The migrator of the data class "accounts": leaves behind one account settings file of the current data version,
// whatever the device held before. One object lives for one run, on the thread that the host calls it on.
class AccountsDataMigrator final : public platform::DataClassMigrator {
 public:
  AccountsDataMigrator() = default;
  ~AccountsDataMigrator() override;

  [[nodiscard]] std::string_view dataClassName() const override;
  // Takes the migration lock, runs the steps and gives the lock back on every path. Catches whatever is thrown.
  bool performMigration() override;
  [[nodiscard]] platform::MigrationFootprint footprint() const override;

  // Everything below is internal: public so that each group of steps, and its tests, can call the others.

  // --- The sequence (accounts_data_migrator.cpp) ---
  bool executeMigrationSteps();

  // --- Records of the run (migration_records.cpp) ---
  void _copyAsideAccountsPlist();
  [[nodiscard]] static platform::Path copyAsidePath();
  [[nodiscard]] static bool _saveMigrationInformation();
  void _saveCollatedMigrationInformation();

  // --- Removal of the legacy files (legacy_removal.cpp) ---
  [[nodiscard]] static std::string _absolutePathToOldAccountsInfoRemovalSentinel();
  [[nodiscard]] static bool _failedToRemoveOldAccountsInfo();
  bool _removeOldAccountsInfo();

  // --- Legacy Exchange accounts (legacy_exchange.cpp) ---
  bool _migrateDAAccounts(AccountsManager& store);
  [[nodiscard]] static std::shared_ptr<BasicAccount> _convertExchangeAccountDescription(const Dictionary& description);

  // --- Legacy mail accounts (legacy_mail.cpp) ---
  bool _migrateMailAccounts(AccountsManager& store);
  [[nodiscard]] static std::shared_ptr<BasicAccount> _convertMailAccountDescription_type(const Dictionary& description,
                                                                                         std::string_view initialType);
  [[nodiscard]] static Text _accountTypeForMailAccountClass(std::string_view className);
  [[nodiscard]] static Text _accountTypeStringForMailAccountClass(std::string_view className);
  [[nodiscard]] static Text _accountShortTypeStringForMailAccountClass(std::string_view className);

  // --- Version steps: dispatch (version_steps.cpp) ---
  bool _migrateNewAccountsInfo(AccountsManager& store);
  [[nodiscard]] static bool _newAccountsInformationPresent();
  // The table of steps: one for each version before the current one, in order.
  using Step = VersionStep<AccountsDataMigrator, AccountsManager>;
  [[nodiscard]] static std::span<const Step> versionSteps();
  bool _migrateAccountsFrom7A149(AccountsManager& store);

  // --- First generation (first_generation_steps.cpp, caldav_matching.cpp) ---
  bool _migrateAccountsFrom7A150(AccountsManager& store);
  bool _migrateAccountsFrom7A153(AccountsManager& store);
  bool _migrateAccountsFrom7A241(AccountsManager& store);
  bool _migrateAccountsFrom7A242(AccountsManager& store);
  [[nodiscard]] static bool _tetheredDisabledInSources(const Array& sources);
  [[nodiscard]] static std::string _urlSafeUsername(std::string_view username);
  [[nodiscard]] static std::vector<std::string> _expectedCalDAVUsernamesForAccount(const BasicAccount& umbrella);
  [[nodiscard]] static std::optional<std::string> _expectedCalDAVHostnameForAccount(const BasicAccount& umbrella);
  [[nodiscard]] static std::vector<std::string> _expectedCalDAVPrincipalURLsForAccount(const BasicAccount& umbrella);
  [[nodiscard]] static bool _calDAVAccount_matchesUmbrellaAccount(const BasicAccount& calDAVAccount,
                                                                  const BasicAccount& umbrella);

  // --- Second generation (second_generation_steps.cpp) ---
  bool _migrateAccountsFrom8A293(AccountsManager& store);
  bool _migrateAccountsFrom8B117(AccountsManager& store);
  bool _migrateAccountsFrom8C136(AccountsManager& store);
  bool _migrateAccountsFrom8F191(AccountsManager& store);

  // --- Third generation (third_generation_steps.cpp) ---
  bool _migrateAccountsFrom9A182(AccountsManager& store);
  bool _migrateAccountsFrom9A334(AccountsManager& store);
  bool _migrateAccountsFrom9B176(AccountsManager& store);
  [[nodiscard]] static bool _account_hasChildAccountOfType(const BasicAccount& account, std::string_view type);
  static void _enableProvisioningForDataClass_toAccount_ifChildAccountExistsOfType(std::string_view dataclass,
                                                                                   BasicAccount& account,
                                                                                   std::string_view type);

  std::optional<Dictionary> _collatedMigrationData;  // what goes into the report; absent where none is wanted
  bool _foundOldMailAccountsToMigrate = false;
  bool _foundOldDAAccountsToMigrate = false;
};

}  // namespace migrator
