#include "client/device.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>

#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_platform.h"
#include "platform/logs_and_notices.h"

namespace accounts {
namespace {

using accountsettings::AccountsManager;
using accountsettings::LoadOutcome;
using platform::Path;
using platform::Status;
using std::chrono::milliseconds;
using std::chrono::steady_clock;

const Path kMigrationLock = Path{accountsettings::kAccountMigrationLockFilename}.filename();
constexpr unsigned kOwnerOnly = 0700;
constexpr const char* kOwner = "mobile";
constexpr std::string_view kClientsLock = "AccountSettingsChange";
constexpr std::string_view kNextsLock = "AccountSettingsNext";
constexpr std::int64_t kNanoseconds = 1'000'000'000;

// New files come to lie on the volume of the device's settings, whatever the program's environment says.
class FilesOnOneVolume final : public platform::FileSystem {
 public:
  FilesOnOneVolume(std::shared_ptr<FileSystem> files, Path directory)
      : _files{std::move(files)}, _directory{std::move(directory)} {}

  platform::Result<platform::FileKind> kindOf(const Path& path) override { return _files->kindOf(path); }
  platform::Result<platform::Bytes> read(const Path& path, std::size_t limit) override {
    return _files->read(path, limit);
  }
  Status create(const Path& path, std::span<const std::uint8_t> bytes) override { return _files->create(path, bytes); }
  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    return _files->replace(path, bytes);
  }
  Status copy(const Path& from, const Path& to) override { return _files->copy(from, to); }
  Status remove(const Path& path) override { return _files->remove(path); }
  Status createDirectories(const Path& path, unsigned permissions) override {
    return _files->createDirectories(path, permissions);
  }
  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    return _files->setOwner(path, owner, group);
  }
  platform::Result<Path> temporaryName() override {
    const platform::Result<Path> name = _files->temporaryName();
    if (!name.isOk()) return name;
    return _directory / name.value().filename();
  }
  Status rename(const Path& from, const Path& to) override { return _files->rename(from, to); }

 private:
  std::shared_ptr<FileSystem> _files;
  Path _directory;
};

// Those of a device that is merely mounted somewhere are foreign code.
class ClosedModules final : public platform::ModuleLoader {
 public:
  Status open(const std::string&) override {
    return Status::failure(platform::Cause::unsafe, "open a module",
                           "modules under another root are opened only where that is asked for");
  }
};

bool mayOpenModules(const OpenOptions& options, const platform::Platform& services) {
  return options.opensModules || options.root.empty() || services.directories->systemRoot() == "/";
}

platform::Platform ownServices(const OpenOptions& options) {
  if (options.root.empty() && options.home.empty() && options.resources.empty()) return platform::current();
  const auto given = [](const std::string& path) { return path.empty() ? std::nullopt : std::optional<Path>{path}; };
  return platform::makeLinuxPlatform(
      {.systemRoot = given(options.root), .home = given(options.home), .resources = given(options.resources)});
}

Path temporaryDirectory(const platform::Platform& services) {
  return services.directories->systemRoot() / "var/mobile/tmp";
}

platform::Platform servicesFor(const OpenOptions& options) {
  platform::Platform services = ownServices(options);
  services.files = std::make_shared<FilesOnOneVolume>(services.files, temporaryDirectory(services));
  services.console = std::make_shared<platform::SilentConsoleLog>();
  if (!mayOpenModules(options, services)) {
    services.modules = std::make_shared<ClosedModules>();
    services.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  }
  return services;
}

std::recursive_mutex& turns() {
  static std::recursive_mutex& mutex = *new std::recursive_mutex;  // destructors of globals may come here
  return mutex;
}

bool isOfFullDisk(const Status& status) { return status.errorNumber() == ENOSPC || status.errorNumber() == EDQUOT; }
bool isForbidden(const Status& status) { return status.errorNumber() == EACCES || status.errorNumber() == EPERM; }

Error unreadFile(const Path& path, const Status& reading) {
  const std::string sentence = "the account settings cannot be read: " + path.string() + ": " + reading.reason();
  if (reading.cause() == platform::Cause::unsafe) return {Code::refused, sentence};
  return {isForbidden(reading) ? Code::noPermission : Code::unreadable, sentence};
}

}  // namespace

FileIdentity FileIdentity::of(const Path& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return {};
  return {status.st_dev, status.st_ino, status.st_size, status.st_mtim.tv_sec * kNanoseconds + status.st_mtim.tv_nsec,
          status.st_ctim.tv_sec * kNanoseconds + status.st_ctim.tv_nsec};
}

Within::Within(const Device& device) : _turn{turns()}, _others{platform::current()} {
  platform::setCurrent(device._services);
}

Within::~Within() { platform::setCurrent(std::move(_others)); }

Device::Device(OpenOptions options) : _options{std::move(options)} {
  const std::unique_lock turn{turns()};
  _services = servicesFor(_options);
  const Within within{*this};
  _settingsFile = AccountsManager::fullPathToAccountSettingsPlist();
}

Path Device::beginning() const {
  const Path root = this->root();
  const Path below = _settingsFile.lexically_relative(root);
  return below.empty() || *below.begin() == ".." ? _services.directories->home() : root;
}

bool Device::opensModules() const { return mayOpenModules(_options, _services); }

Outcome Device::waitForMigration() const {
  const platform::LockManner glance{.isShared = true, .timeLimit = milliseconds{0}};
  const auto isBusy = [](const Result<HeldLock>& lock) { return !lock.isOk() && lock.error().code == Code::busy; };
  const bool isMigrating = isBusy(takeLock(kMigrationLock, glance)) && !isBusy(takeLock(kClientsLock, glance));
  if (!isMigrating) return std::monostate{};
  const auto waited = takeLock(kMigrationLock, {.isShared = true, .timeLimit = _options.timeLimit});
  return isBusy(waited) ? Outcome{waited.error()} : std::monostate{};
}

Result<HeldLocks> Device::takeLocks() const {
  const auto began = steady_clock::now();
  const auto inTime = [&]() -> platform::LockManner {
    const auto waited = std::chrono::duration_cast<milliseconds>(steady_clock::now() - began);
    return {.timeLimit = std::max(milliseconds{0}, _options.timeLimit - waited)};
  };
  const auto ofClientsInTurn = [&]() -> Result<HeldLock> {
    const Result<HeldLock> next = takeLock(kNextsLock, inTime());
    return next ? takeLock(kClientsLock, inTime()) : next.error();
  };
  Result<HeldLock> ofClients = ofClientsInTurn();
  if (!ofClients) return ofClients.error();
  Result<HeldLock> ofMigration = takeLock(kMigrationLock, inTime());
  if (!ofMigration) return ofMigration.error();
  return HeldLocks{std::move(ofClients).value(), std::move(ofMigration).value()};
}

Result<HeldLock> Device::takeLock(const Path& name, platform::LockManner manner) const {
  const Path directory = _services.directories->systemRoot() / "tmp";
  const auto say = [this](std::string_view line) {
    if (_options.whileWaiting) _options.whileWaiting(std::string{line});
  };
  const auto locks = platform::makeFileLocks(
      {.directory = directory, .trees = platform::treesOf(*_services.directories), .manner = manner, .say = say});
  auto made = locks->lockNamed(name.native());
  if (!made.isOk()) {
    if (isOfFullDisk(made.status())) return Error{Code::noSpace, made.status().description()};
    return Error{isForbidden(made.status()) ? Code::noPermission : Code::refused, made.status().description()};
  }
  if (!manner.isShared && !isTrusted(directory / name)) {
    return Error{Code::refused, "the lock file " + (directory / name).string() + " belongs to another user"};
  }
  HeldLock lock = made.take();
  const Status held = lock->lock();
  if (held.isOk()) return lock;
  return Error{held.errorNumber() == ETIMEDOUT ? Code::busy : Code::refused, held.description()};
}

// Once a trusted user's file stands there, nobody else can take it away from a sticky directory, and a lock counts only
// on the file that stands there.
bool Device::isTrusted(const Path& lockFile) const {
  struct stat file {};
  struct stat settings {};
  if (::lstat(lockFile.c_str(), &file) != 0) return true;
  if (file.st_uid == 0 || file.st_uid == ::geteuid()) return true;
  return ::stat(_settingsFile.c_str(), &settings) == 0 && file.st_uid == settings.st_uid;
}

Status Device::prepareSaving() const {
  const Path directory = temporaryDirectory(_services);
  if (_services.files->kindOf(directory).isOk()) return {};
  const Status made = _services.files->createDirectories(directory, kOwnerOnly);
  if (made.isOk()) static_cast<void>(_services.files->setOwner(directory, kOwner, kOwner));
  return made;
}

Result<Store> Device::load(Use use) const {
  return answerOf([&]() -> Result<Store> {
    const Within within{*this};
    static_cast<void>(accountsettings::BasicAccount::accountTypes());  // which fails where there is no configuration
    Store store = AccountsManager::init();
    if (const std::optional<Error> found = fault(store->loadOutcome(), use)) return *found;
    return store;
  });
}

std::optional<Error> Device::fault(const LoadOutcome& outcome, Use use) const {
  const std::string path = _settingsFile.string();
  const bool mayBeOther = use == Use::look && _options.mayBeOfOtherRelease;
  if (outcome.hasUnreadFile()) return unreadFile(_settingsFile, outcome.reading);
  if (!outcome.reading.isOk()) {
    const bool isLegacy =
        AccountsManager::_oldMailAccountsInformationFound() || AccountsManager::_oldDAAccountsInformationFound();
    if (isLegacy && !mayBeOther) {
      return Error{Code::notMigrated, "the accounts are still in files of the first releases"};
    }
    if (isLegacy || _options.mayBeMissing) return std::nullopt;
    return Error{Code::missing, "there are no accounts: " + path + " does not exist"};
  }
  if (!outcome.storedVersion || mayBeOther) return std::nullopt;
  const auto version = static_cast<std::uint64_t>(*outcome.storedVersion);
  if (version == AccountsManager::currentVersion()) return std::nullopt;
  const std::string stands = "the account settings have data version " + std::to_string(*outcome.storedVersion);
  if (version > AccountsManager::currentVersion()) return Error{Code::newer, stands + ", a later release's"};
  return Error{Code::notMigrated, stands + " and must be migrated before they are changed"};
}

}  // namespace accounts
