#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>

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
  // How long a migration, or another program's change, is waited for. 0 waits for nobody.
  std::chrono::milliseconds timeLimit = std::chrono::seconds{30};
  // A device without accounts then has an empty list of them, and the first change makes the file.
  bool mayBeMissing = false;
  // A change may remove records from the file that this release cannot load.
  bool mayDropUnreadable = false;
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

  // The accounts as the file has them now; waits for nobody. Fails like `open`, but never with busy.
  [[nodiscard]] Result<Accounts> accounts() const;

  // Calls the function with the accounts as the file has them now, and saves what it did before anybody else may change
  // them. It answers false to save nothing (cancelled). What the function throws passes through; nothing is saved then.
  // Fails like `open`, and with nested, noSpace, notSaved, wouldBeDropped, wouldDropOthers, conflict or cancelled.
  Result<Saved> change(const std::function<bool(Edit&)>& function) const;

  // The same in two steps, for whom a function does not suit.
  [[nodiscard]] Result<Edit> edit() const;

  // Tells of what differs from the given accounts by now, and then of every change. Fails with notWatched.
  [[nodiscard]] Result<Watch> watch(const Accounts& since, Watch::Callback callback,
                                    Watch::Caller caller = Watch::Caller::ownThread) const;

  struct Content;  // internal
  explicit AccountSettings(std::shared_ptr<const Content> content);

 private:
  std::shared_ptr<const Content> _content;
};

}  // namespace accounts
