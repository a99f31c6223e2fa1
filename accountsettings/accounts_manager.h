#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "accountsettings/basic_account.h"
#include "accountsettings/runtime_fixer.h"
#include "accountsettings/store_outcomes.h"
#include "platform/exclusive_file_lock.h"
#include "platform/export.h"
#include "platform/file_system.h"
#include "platform/insertion_ordered_map.h"
#include "platform/status.h"

namespace accountsettings {

class ChangeTracker;

// The data version that this release writes: the one that the last step of a migration leaves.
inline constexpr std::uint64_t kCurrentVersion = 12;

// The change that a change entry tells of.
enum class ChangeType : std::int32_t { added = 0, present = 1, removed = 2 };

// The store of one account settings file: loads it, finds and edits its accounts, and saves it by merging each account
// with what the file holds by then. Top-level accounts stand in file order; children live inside their parent's
// "ChildAccounts" property, and one record for each is indexed. Not thread-safe; takes no locks.
class ACCOUNT_EXPORT AccountsManager {
 public:
  using Account = std::shared_ptr<BasicAccount>;
  using Accounts = std::vector<Account>;
  using AccountsByID = platform::InsertionOrderedMap<Account>;
  using Types = std::vector<Text>;

  // --- The file (accounts_manager_file.cpp) ---

  // Where the account settings file lies.
  [[nodiscard]] static platform::Path fullPathToAccountSettingsPlist();
  // A store loaded from the file; a missing or unreadable file gives an empty store with data version 0.
  static std::shared_ptr<AccountsManager> init();
  static std::shared_ptr<AccountsManager> initInsideOfMigration();
  // A store of accounts already in memory, data version 0.
  static std::shared_ptr<AccountsManager> initWithAccounsInfoArray(const Array& accounts);
  // Internal.
  static std::shared_ptr<AccountsManager> _initWithAccountsInfo(const Array* accounts);

  AccountsManager(const AccountsManager&) = delete;
  AccountsManager& operator=(const AccountsManager&) = delete;
  ~AccountsManager();

  // Repairs, merges and writes the file as the current data version, whatever version was loaded. The file is the old
  // one or the new one, never in between. Success is seen in the log, in whether notifications follow, and in
  // `lastSaveOutcome`; after a failure the accounts and what they are compared with are as before. Accounts that only
  // the file holds are dropped from it.
  void saveAllAccounts();
  // Internal: how the store came by its accounts, and how its last save ended.
  [[nodiscard]] const LoadOutcome& loadOutcome() const { return _loadOutcome; }
  [[nodiscard]] const SaveOutcome& lastSaveOutcome() const { return _lastSaveOutcome; }
  // Internal: takes the state against which the next save's change notifications are computed.
  void _setOriginalAccountDictionaries();
  // Internal: new fixers, one of each kind; the store asks its own at each load and each save.
  using RuntimeFixers = std::vector<std::shared_ptr<RuntimeFixer>>;
  [[nodiscard]] RuntimeFixers _createRuntimeFixers() const;
  // Internal: what follows the accounts for a run's observer; null where none wants to know.
  [[nodiscard]] ChangeTracker* changeTracker() const { return _tracker.get(); }
  // Internal: tells the run's observer, if there is one, what became of the accounts since it last was told.
  void tellChanges() const;

  // --- Migration support (accounts_manager_migration_support.cpp) ---

  // The migration lock, held, once nobody else holds it; null where it cannot be had.
  [[nodiscard]] static std::unique_ptr<platform::ExclusiveFileLock> createAndLockMigrationLock();
  static void releaseMigrationLock(std::unique_ptr<platform::ExclusiveFileLock> lock);
  // For other clients of the library: returns when no migration is running.
  static void waitForMigrationToFinish();
  [[nodiscard]] static std::uint64_t currentVersion();  // kCurrentVersion, as this library was built with it
  [[nodiscard]] std::uint64_t dataVersion() const { return _dataVersion; }
  void setDataVersion(std::uint64_t version) { _dataVersion = version; }
  // Internal: while set, saves send no notifications. Process-wide, written by the migration's thread only.
  static void _setShouldSkipNotifications(bool skip);
  [[nodiscard]] static bool shouldSkipNotifications();
  [[nodiscard]] static bool _oldDAAccountsInformationFound();
  [[nodiscard]] static bool _oldMailAccountsInformationFound();
  // Whether the file's version is older than the current one, compared without sign; a file that cannot be read or has
  // no version needs no migration.
  [[nodiscard]] static bool accountSettingsNeedsToBeMigrated();
  // Decides what a run migrates; all three pointers must be given, else AssertionFailure.
  static void shouldMigrateOldMailAccounts_oldDAAccounts_newAccountSettings(bool* migrateOldMailAccounts,
                                                                            bool* migrateOldDAAccounts,
                                                                            bool* migrateNewAccounts);
  // Deletes the account settings file, so that a following run is decided by legacy files alone.
  static void removeNewAccountSettingsToMigrateOldAccountInformation();

  // --- Look-up (accounts_manager_lookup.cpp) ---

  // For a child's identifier: its top-level parent, the account that the user sees.
  [[nodiscard]] Account accountWithIdentifier(std::string_view identifier) const;
  [[nodiscard]] Account syncableAccountWithSyncIdentifier(std::string_view identifier) const;
  [[nodiscard]] Account displayAccountWithSyncIdentifier(std::string_view identifier) const;
  // The live array; must not be walked while the store is edited.
  [[nodiscard]] const Accounts& allBasicAccounts() const { return _orderedTopLevelAccounts; }
  [[nodiscard]] Accounts allBasicSyncableAccounts() const;
  [[nodiscard]] Accounts basicAccountsWithTypes(const Types& types) const;
  [[nodiscard]] std::size_t countOfBasicAccountsWithTypes(const Types& types) const;
  [[nodiscard]] std::size_t count() const { return _orderedTopLevelAccounts.size(); }
  using FullAccount = std::shared_ptr<FullAccountObject>;
  [[nodiscard]] FullAccount fullAccountWithIdentifier_loader(std::string_view identifier,
                                                             const AccountClassInfo* loader) const;
  [[nodiscard]] std::vector<FullAccount> accountsWithTypes_withLoader(const Types& types,
                                                                      const AccountClassInfo* loader) const;
  [[nodiscard]] std::vector<FullAccount> accountsWithTypes(const Types& types) const;
  [[nodiscard]] std::vector<FullAccount> allMailAccounts() const;
  // Makes and adds the device-local account where there is none; does not save.
  [[nodiscard]] FullAccount fullDeviceLocalAccount();
  [[nodiscard]] static std::optional<std::string> displayNameForGroupOfAccountType_forBeginningOfSentence(
      std::string_view type, bool beginningOfSentence);
  // Internal: the child index.
  void _loadChildrenFromAccount(const Account& account);
  void _removeChildrenForAccountWithIdentifier(const Text& identifier);

  // --- Mutations and merge (accounts_manager_mutations.cpp, accounts_manager_merge.cpp); in memory until saved ---

  void insertAccount(const Account& account);
  void updateAccount(const Account& account);
  void deleteAccount(const Account& account);
  // Internal: deletes each of them in turn, in one walk over the store.
  void deleteAccounts(const Accounts& accounts);
  // The identifier must be a registered top-level account's.
  void deleteAccountWithIdentifier(std::string_view identifier);
  // The old account must be in the order. The new one is found by identifier only in a store loaded afresh.
  void replaceAccount_withAccount(const Account& oldAccount, const Account& newAccount);
  // Internal: the same for the account at a place of the order, which need not be looked for.
  void replaceAccountAt(std::size_t place, const Account& newAccount);
  void replaceAccountsWithTypes_withAccounts(const Types& types, const Accounts& accounts);
  void addChild_toAccount(const Account& child, const Account& parent);
  void removeChildWithIdentifier_fromAccount(std::string_view identifier, const Account& parent);
  // Key by key: what was changed or removed in memory wins, everything else is as the file has it.
  [[nodiscard]] static Dictionary mergeInMemoryProperties_originalProperties_onDiskProperties(
      const Dictionary& inMemory, const Dictionary& original, const Dictionary* onDisk);

  // --- Change notifications (accounts_manager_notifications.cpp) ---

  // For callers that switch one data class: before and after.
  static void accountWillChange_forDataclass(const BasicAccount& account, std::string_view dataclass);
  static void accountDidChange_forDataclass(const BasicAccount& account, std::string_view dataclass);
  // Internal.
  using NotificationTable = platform::InsertionOrderedMap<std::vector<Dictionary>>;
  [[nodiscard]] static std::vector<std::string> _notifierClassNamesForAccountType_dataclass(
      std::optional<std::string_view> type, std::string_view dataclass);
  void _addNotificationToDictionary_forChangeType_originalProperties_currentProperties(NotificationTable& table,
                                                                                       ChangeType change,
                                                                                       const Dictionary* original,
                                                                                       const Dictionary* current) const;
  void _sendNotificationsForChangedAccounts();

 private:
  ACCOUNT_HIDDEN AccountsManager();
  // Loading. An element that is no dictionary is read as an empty one.
  [[nodiscard]] ACCOUNT_HIDDEN static std::shared_ptr<AccountsManager> loadedFromFile(
      std::unique_ptr<ChangeTracker> tracker);
  [[nodiscard]] ACCOUNT_HIDDEN static std::shared_ptr<AccountsManager> loaded(const Array* accounts,
                                                                              std::unique_ptr<ChangeTracker> tracker);
  [[nodiscard]] ACCOUNT_HIDDEN bool offerLoaded(const Account& account, std::size_t position,
                                                const PropertyValue& element);
  ACCOUNT_HIDDEN void loadAccounts(const Array& accounts);
  [[nodiscard]] ACCOUNT_HIDDEN static Account accountFromElement(const PropertyValue& element);
  ACCOUNT_HIDDEN void registerAccount(const Account& account);
  ACCOUNT_HIDDEN void loadChild(const PropertyValue& properties, const Account& parent,
                                const std::optional<Text>& parentIdentifier);

  ACCOUNT_HIDDEN void leaveOut(std::size_t position, const PropertyValue& element, WhyLeftOut why);

  // Saving. Fixing, like offering, answers whether a fixer had something to do.
  ACCOUNT_HIDDEN void writeFile();
  [[nodiscard]] ACCOUNT_HIDDEN bool fixAccountsForSaving();
  [[nodiscard]] ACCOUNT_HIDDEN Array mergedRecords() const;
  ACCOUNT_HIDDEN void tellFixers(bool saved);

  // By notifier, what changed since the state was last taken.
  [[nodiscard]] ACCOUNT_HIDDEN NotificationTable notificationTable() const;

  // Takes the identifier, whichever record is registered under it, and its children out of the indexes.
  ACCOUNT_HIDDEN void forgetIdentifierOfAccount(const BasicAccount& account);

  // The order and the index that replacing accounts by types builds, and the accounts that have no place in it yet.
  struct Replacement {
    Accounts order;
    AccountsByID byID;
    Accounts toPlace;
  };
  ACCOUNT_HIDDEN void replaceInPlace(const Types& types, Replacement& replacement);
  ACCOUNT_HIDDEN void appendAccount(const Account& account, Replacement& replacement);
  ACCOUNT_HIDDEN void moveChild(const Account& child, const Replacement& replacement);
  ACCOUNT_HIDDEN void takeFromRecordedParent(const Text& child, const Account& newParent);

  AccountsByID _topLevelAccountsByID;
  Accounts _orderedTopLevelAccounts;
  AccountsByID _childAccountsByID;
  platform::InsertionOrderedMap<Text> _childAccountIDToParentAccountID;
  // The children that were indexed when each parent was last registered; one that another parent has taken over since
  // may still stand here, so `_childAccountIDToParentAccountID` decides.
  platform::InsertionOrderedMap<std::vector<Text>> _childIdentifiersByParentID;
  // In their order, the last of each identifier counting. Every load makes it and few look anything up in it, so an
  // index is made by those.
  std::vector<std::pair<Text, Dictionary>> _originalAccountsByID;
  std::uint64_t _dataVersion = 0;
  LoadOutcome _loadOutcome;
  SaveOutcome _lastSaveOutcome;
  RuntimeFixers _runtimeFixers;
  std::unique_ptr<ChangeTracker> _tracker;  // null unless a run is observed
};

// Paths of the account settings file and of the two legacy files.
[[nodiscard]] ACCOUNT_EXPORT std::string daAccountPath();
[[nodiscard]] ACCOUNT_EXPORT std::string mailAccountsPath();
[[nodiscard]] ACCOUNT_EXPORT std::string accountSettingsAccountsPath();

}  // namespace accountsettings
