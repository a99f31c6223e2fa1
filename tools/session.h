#pragma once

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "tools/options.h"

namespace tools {

using accounts::Account;
using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using Dataclasses = std::vector<std::string>;

// The value; throws Failure, with the status that fits, where there is none.
[[noreturn]] void fail(const accounts::Error& error);
template <typename Value>
Value required(accounts::Result<Value> result) {
  if (!result) fail(result.error());
  return std::move(result).value();
}

// The accounts of one device, for one command, through the interface for programs. Making a session sets the process's
// platform, for whatever looks at files beside that.
class Session {
 public:
  explicit Session(const Options& options);

  // As they were when they were first asked for. A migration is waited for; after a while, a command that changes
  // nothing goes on all the same, and says so. Throws Failure where they cannot be looked at.
  [[nodiscard]] const accounts::Accounts& accounts();

  // The account or child account that the word means: the one of that identifier, else the only one whose identifier
  // begins so or that is called so (lookup.cpp says how). Throws Failure where there is none, or more than one.
  [[nodiscard]] Account accountMeantBy(const std::string& word);

  // Makes the session one that only looks and of which nobody is told, not even the log. To be called before anything
  // else.
  void beginLooking();
  // The same, and the settings are read from the file that is named, wherever it lies, else from the device's own once
  // no migration is running. To be called before anything else.
  void beginExamination(const std::optional<platform::Path>& file);

  // To be called before the accounts are looked at in order to change them: those of another release are refused then.
  void beginChanges() { _changes = true; }
  // What the steps make of the accounts, which are not changed. Throws Failure where they could not be saved so.
  using Steps = std::function<void(accounts::Edit&)>;
  void tryOut(const Steps& steps);
  // The accounts that a change concerns, each with the data classes that it concerns of it.
  using Concerned = std::vector<std::pair<Account, Dataclasses>>;
  // Changes the accounts as they are by now and saves them, telling those who follow these data classes before and
  // after; or only tries it, where that is asked for. Throws Failure, which says what became of the change, where it
  // cannot be saved or a module is at fault.
  void change(const Concerned& concerned, const Steps& steps);

 private:
  using Announcement = accounts::Outcome (accounts::AccountSettings::*)(const Account&, std::string_view) const;
  void announce(const Concerned& concerned, Announcement announcement, const char* whatBecameOfTheChange);
  void waitForMigration() const;
  const accounts::AccountSettings& settings();

  accounts::OpenOptions _options;
  bool _changesNothing;  // what is asked for is only tried
  bool _changes = false;
  std::optional<accounts::AccountSettings> _settings;
  std::optional<accounts::Accounts> _accounts;
};

}  // namespace tools
