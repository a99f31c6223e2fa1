#pragma once

#include <sys/stat.h>

#include <chrono>
#include <exception>
#include <memory>
#include <mutex>
#include <new>
#include <optional>
#include <string>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "platform/exclusive_file_lock.h"
#include "platform/platform.h"

namespace accounts {

using Store = std::shared_ptr<accountsettings::AccountsManager>;
using HeldLock = std::unique_ptr<platform::ExclusiveFileLock>;

// What a change holds: the clients' own lock, by which who only looks can tell a change from a migration, and then the
// migration lock.
struct HeldLocks {
  HeldLock ofClients;
  HeldLock ofMigration;
};

// Which file stood at a path, and when it was last written.
struct FileIdentity {
  dev_t device = 0;
  ino_t node = 0;
  off_t size = 0;
  std::int64_t written = 0;  // nanoseconds
  std::int64_t changed = 0;

  [[nodiscard]] static FileIdentity of(const platform::Path& path);  // all zero where there is none
  friend bool operator==(const FileIdentity&, const FileIdentity&) = default;
};

// One device's accounts file, its lock, and the platform on which the store is to use them.
class Device {
 public:
  explicit Device(OpenOptions options);

  [[nodiscard]] const OpenOptions& options() const { return _options; }
  [[nodiscard]] const platform::Path& settingsFile() const { return _settingsFile; }
  // Where absolute links on the way to it begin, and where that way itself does: there, or at a home outside of it.
  [[nodiscard]] platform::Path root() const { return _services.directories->systemRoot(); }
  [[nodiscard]] platform::Path beginning() const;
  // Whether its modules may be opened, and so whether anybody is told of its changes.
  [[nodiscard]] bool opensModules() const;

  // The store, loaded from the file as it is now, or why a program is not to use it so.
  enum class Use : std::uint8_t { look, change };
  [[nodiscard]] Result<Store> load(Use use = Use::look) const;
  // Returns once no migration is running, or nobody can tell whether one is. A client's change is not waited for.
  [[nodiscard]] Outcome waitForMigration() const;
  // Both locks, held until they go, in turn: whoever is next waits for them alone, and the others for that place, so
  // that a program that changes in a loop comes behind those who wait. A lock file that another user of the machine may
  // have put there is refused.
  [[nodiscard]] Result<HeldLocks> takeLocks() const;
  // Makes sure of the directory in which a save makes the new file, or says why it cannot be made.
  [[nodiscard]] platform::Status prepareSaving() const;

 private:
  friend class Within;
  [[nodiscard]] Result<HeldLock> takeLock(const platform::Path& name, platform::LockManner manner) const;
  [[nodiscard]] bool isTrusted(const platform::Path& lockFile) const;
  [[nodiscard]] std::optional<Error> fault(const accountsettings::LoadOutcome& outcome, Use use) const;

  OpenOptions _options;
  platform::Platform _services;
  platform::Path _settingsFile;
};

// While it lives, the process's platform is this device's, and no other thread is within a device. One thread may be
// within several; they are left in the opposite order.
class Within {
 public:
  explicit Within(const Device& device);
  Within(const Within&) = delete;
  Within& operator=(const Within&) = delete;
  ~Within();

 private:
  std::unique_lock<std::recursive_mutex> _turn;
  platform::Platform _others;
};

// What the function answers; what the store throws becomes an error, but for want of memory.
template <typename Function>
auto answerOf(const Function& function) -> decltype(function()) {
  try {
    return function();
  } catch (const std::bad_alloc&) {
    throw;
  } catch (const std::exception& failure) {
    return Error{Code::brokenInstallation, failure.what()};
  }
}

}  // namespace accounts
