#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "accounts/account.h"
#include "accounts/edit.h"
#include "accounts/result.h"
#include "accounts/value.h"
#include "accounts/watch.h"

namespace accounts {

// Which device is opened, and how.
struct OpenOptions {
  // The root of the device's file tree; empty for the device that the program runs on. Nobody is told of changes below
  // another root than "/".
  std::string root;
  // The mobile user's home directory, and the directory of the configuration; empty for those of the root and of the
  // installed library.
  std::string home;
  std::string resources;
  // How long a migration, or another program's change, is waited for. 0 waits for nobody.
  std::chrono::milliseconds timeLimit = std::chrono::seconds{30};
  // Called by the thread that waits, once a wait takes longer than a second, with a sentence that says for whom.
  std::function<void(const std::string& sentence)> whileWaiting;
  // A device without accounts then has an empty list of them, and the first change makes the file.
  bool mayBeMissing = false;
  // A change may remove records from the file that this release cannot load.
  bool mayDropUnreadable = false;
  // The accounts of an earlier or a later release can be looked at, too. A change of them still fails.
  bool mayBeOfOtherRelease = false;
  // Opening waits for no migration, which may replace what is looked at. A change still waits.
  bool mayBeMigrating = false;
  // Below another root than "/", too, the account modules of that device are opened, and told of changes. They run in
  // this process: only for a device that is trusted.
  bool opensModules = false;
};

// The accounts of one device: look at them, change them, watch them. Nothing here throws but for want of memory, and
// any thread may call anything at any time. Copies are the same.
//
// One thread at a time reads or writes the file, so nobody waits for another thread longer than that takes; a program
// that also uses the store's own classes does so while no other thread is in here.
class ACCOUNTS_API AccountSettings {
 public:
  // Waits for a migration that is under way. Fails with missing, notMigrated, newer, unreadable, refused, noPermission,
  // busy or brokenInstallation.
  [[nodiscard]] static Result<AccountSettings> open(const OpenOptions& options = {});

  // Returns once no migration is under way, whatever the accounts are like. Fails with busy.
  [[nodiscard]] static Outcome waitForMigration(const OpenOptions& options = {});

  // The accounts as the file has them now; waits for nobody. Fails like `open`, but never with busy.
  [[nodiscard]] Result<Accounts> accounts() const;

  // Calls the function with the accounts as the file has them now, and saves what it did before anybody else may change
  // them. It answers false to save nothing: the answer then is the error of its first step that failed, else cancelled.
  // What the function throws passes through; nothing is saved then. Fails like `open`, and with nested, noSpace,
  // notSaved, wouldBeDropped, wouldDropOthers or conflict.
  Result<Saved> change(const std::function<bool(Edit&)>& function) const;

  // The same in two steps, for whom a function does not suit.
  [[nodiscard]] Result<Edit> edit() const;
  // To see what a change would do: it takes no lock, and its `save` answers what would be saved, or why not, and writes
  // nothing. What only writing shows (a full disk, missing rights) is taken to succeed.
  [[nodiscard]] Result<Edit> trial() const;

  // Tell the modules that follow the data class that the account is about to change, before the change begins, and that
  // it has, after it was saved; for a program that changes accounts at a person's request. Each save itself tells them
  // what it brought. Not to be called within a change. Fails with notAnnounced, and the module's own words.
  Outcome willChange(const Account& account, std::string_view dataclass) const;
  Outcome didChange(const Account& account, std::string_view dataclass) const;

  // Tells of what differs from the given accounts by now, and then of every change. Fails with notWatched.
  [[nodiscard]] Result<Watch> watch(const Accounts& since, Watch::Callback callback,
                                    Watch::Caller caller = Watch::Caller::ownThread) const;

  struct Content;  // internal
  explicit AccountSettings(std::shared_ptr<const Content> content);

 private:
  std::shared_ptr<const Content> _content;
};

}  // namespace accounts
