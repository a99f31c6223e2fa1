#pragma once

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "tools/options.h"

namespace tools {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using Account = AccountsManager::Account;

// A client waits for a migration and holds nobody up, so it makes no lock file. One that only reads never hangs: after
// a while it goes on, and says what it does.
inline constexpr platform::LockManner kLocksOfWriters{.isShared = true};
inline constexpr platform::LockManner kLocksOfReaders{.isShared = true, .timeLimit = std::chrono::seconds{5}};

// The accounts of one device, for one command. Making a session sets the process's platform.
class Session {
 public:
  explicit Session(const Options& options);

  [[nodiscard]] bool opensModules() const { return _opensModules; }

  // The store, loaded at its first use and once no migration is running, or the platform's locks are waited for no
  // longer. Throws Failure where the file is there but
  // cannot be read as account settings.
  [[nodiscard]] AccountsManager& accounts();

  // The account or child account that the word means: the one of that identifier, else the only one whose identifier
  // begins so or that is called so (lookup.cpp says how). Throws Failure where there is none, or more than one.
  [[nodiscard]] Account accountMeantBy(const std::string& word);

  // Makes the session one that only looks and of which nobody is told, not even the log. To be called before anything
  // else.
  void beginLooking();
  // The same, and the settings are read from
  // the file that is named, wherever it lies, else from the device's own once no migration is running. To be called
  // before anything else.
  void beginExamination(const std::optional<platform::Path>& file);

  // To be called before the accounts are changed: throws Failure where they are of an earlier release, since saving
  // them would mark them as migrated.
  void beginChanges();
  // Keeps what was changed of the account: a child's record is a copy of what its parent holds.
  static void keepChanges(const Account& account);
  // The accounts that a change concerns, each with the data classes that it concerns of it.
  using Concerned = std::vector<std::pair<Account, BasicAccount::Dataclasses>>;
  // Changes the accounts in memory and saves them, telling those who follow these data classes before and after. Throws
  // Failure, which says what became of the change, where it cannot be saved or a module is at fault.
  void changeAndSave(const Concerned& concerned, const std::function<void()>& change);
  // Writes the file, unless the session changes nothing. Throws Failure, with the cause, where it cannot be written,
  // and where it was but nobody could be told.
  void save();

 private:
  using Announcement = void (*)(const BasicAccount& account, std::string_view dataclass);
  void announce(const Concerned& concerned, Announcement announcement, const char* whatBecameOfTheChange) const;
  static void waitForMigration();
  void loadAccounts();

  bool _opensModules;
  bool _changesNothing;  // what is asked for is only tried
  std::shared_ptr<AccountsManager> _accounts;
};

}  // namespace tools
