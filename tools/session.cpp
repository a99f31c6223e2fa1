#include "tools/session.h"

#include <algorithm>
#include <cerrno>
#include <exception>
#include <new>
#include <optional>
#include <utility>

#include "platform/base_directories.h"
#include "platform/linux/linux_platform.h"
#include "platform/logs_and_notices.h"

namespace tools {
namespace {

using accountsettings::Array;

constexpr const char* kSavedButNotAnnounced = "the accounts were saved, but not announced";

// In the place of the device's loader while none of its modules may be opened.
class ClosedModuleLoader final : public platform::ModuleLoader {
 public:
  platform::Status open(const std::string&) override {
    return platform::Status::failure(platform::Cause::unsafe, "open a module",
                                     "modules under another root are opened only with --modules");
  }
};

// In the place of this machine's notices: those who follow its mail accounts have nothing to do with another root's.
class NoNotice final : public platform::PreferencesChangedNotice {
 public:
  void post(std::string_view, std::string_view) override {}
};

// Answers another file in the place of the device's settings.
class SettingsFromElsewhere final : public platform::PropertyListStore {
 public:
  SettingsFromElsewhere(std::shared_ptr<PropertyListStore> store, platform::Path file)
      : _store{std::move(store)}, _file{std::move(file)} {}
  platform::Result<accountsettings::Dictionary> readDictionary(const platform::Path& path) override {
    return _store->readDictionary(path == AccountsManager::fullPathToAccountSettingsPlist() ? _file : path);
  }
  platform::SerializedPropertyList serialize(const accountsettings::Dictionary& dictionary) override {
    return _store->serialize(dictionary);
  }

 private:
  std::shared_ptr<PropertyListStore> _store;
  platform::Path _file;
};

bool hasIdentifier(const BasicAccount& account, std::string_view identifier) {
  const auto own = account.identifier();
  return own && *own == identifier;
}

// The children's dictionaries with the changed child's in place of its old one. Of several with one identifier the last
// is the one that the store knows.
Array withChild(const Array& children, const BasicAccount& child) {
  Array changed = children;
  const auto place = std::find_if(changed.rbegin(), changed.rend(), [&](const auto& element) {
    const auto* const properties = element.asDictionary();
    const auto* const identifier =
        properties == nullptr ? nullptr : properties->text(accountsettings::kAccountIdentifier);
    return identifier != nullptr && hasIdentifier(child, *identifier);
  });
  if (place != changed.rend()) *place = child.properties();
  return changed;
}

}  // namespace

Session::Session(const Options& options)
    : _opensModules{options.opensModules()}, _changesNothing{options.changesNothing} {
  auto platform = platform::makeLinuxPlatform(options.device);
  if (!_opensModules) {
    platform.modules = std::make_shared<ClosedModuleLoader>();
    platform.preferencesChanged = std::make_shared<NoNotice>();
  }
  platform::setCurrent(std::move(platform));
  AccountsManager::_setShouldSkipNotifications(!_opensModules);
}

AccountsManager& Session::accounts() {
  if (_accounts == nullptr) loadAccounts();
  return *_accounts;
}

// As AccountsManager::waitForMigrationToFinish does, which cannot tell whether it has.
void Session::waitForMigration() {
  const auto& services = platform::current();
  const platform::Path file = accountsettings::kAccountMigrationLockFilename;
  const auto lock = services.locks->lockNamed(file.filename().native());
  if (!lock.isOk()) return;
  const platform::Status held = lock.value()->lock();
  if (held.isOk()) {
    lock.value()->unlock();
  } else if (held.errorNumber() == ETIMEDOUT) {
    services.console->write("accountctl: " + held.description() + "; what follows is read while a migration may run");
  }
}

void Session::loadAccounts() {
  waitForMigration();
  auto accounts = AccountsManager::init();
  // The store takes a file that it cannot read for an empty one; saving would then lose what is in it.
  if (const auto& outcome = accounts->loadOutcome(); outcome.hasUnreadFile()) {
    throw Failure{ExitStatus::failed,
                  "the account settings cannot be read: " + AccountsManager::fullPathToAccountSettingsPlist().string() +
                      ": " + outcome.reading.reason()};
  }
  _accounts = std::move(accounts);
}

void Session::beginLooking() {
  auto platform = platform::current();
  platform.systemLog = std::make_shared<platform::SilentSystemLog>();
  platform::setCurrent(std::move(platform));
}

void Session::beginExamination(const std::optional<platform::Path>& file) {
  beginLooking();
  auto platform = platform::current();
  if (file) platform.propertyLists = std::make_shared<SettingsFromElsewhere>(platform.propertyLists, *file);
  platform::setCurrent(std::move(platform));
  if (!file) waitForMigration();
}

void Session::beginChanges() {
  if (!_changesNothing) platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  const auto& store = accounts();
  if (AccountsManager::accountSettingsNeedsToBeMigrated()) {
    throw Failure{ExitStatus::failed, "the account settings have data version " + std::to_string(store.dataVersion()) +
                                          " and must be migrated before they are changed"};
  }
}

void Session::keepChanges(const Account& account) {
  const auto& parent = account->parentAccount();
  if (parent == nullptr) return;
  const auto children = parent->accountPropertyForKey(accountsettings::kAccountChildAccounts);
  const auto* const array = children ? children->asArray() : nullptr;
  if (array == nullptr) return;
  parent->setAccountProperty_forKey(withChild(*array, *account), accountsettings::kAccountChildAccounts);
}

// A module may fail in its own way, too; whatever it throws, the message says what became of the change.
void Session::announce(const Concerned& concerned, Announcement announcement, const char* whatBecameOfTheChange) const {
  if (!_opensModules || _changesNothing) return;
  try {
    for (const auto& [account, dataclasses] : concerned) {
      for (const accountsettings::Text& each : dataclasses) announcement(*account, each);
    }
  } catch (const std::exception& failure) {
    throw Failure{ExitStatus::faultyInstallation, std::string{whatBecameOfTheChange} + ": " + failure.what()};
  }
}

void Session::changeAndSave(const Concerned& concerned, const std::function<void()>& change) {
  announce(concerned, AccountsManager::accountWillChange_forDataclass, "nothing was changed");
  change();
  save();
  announce(concerned, AccountsManager::accountDidChange_forDataclass, kSavedButNotAnnounced);
}

void Session::save() {
  if (_changesNothing) return;
  try {
    accounts().saveAllAccounts();
  } catch (const std::bad_alloc&) {
    throw;  // before the file was written or after it
  } catch (const std::exception& failure) {
    if (!accounts().lastSaveOutcome().isSaved()) throw;
    throw Failure{ExitStatus::faultyInstallation, std::string{kSavedButNotAnnounced} + ": " + failure.what()};
  }
  const auto& outcome = accounts().lastSaveOutcome();
  if (outcome.isSaved()) return;
  const auto path = AccountsManager::fullPathToAccountSettingsPlist().string();
  throw Failure{ExitStatus::failed, "the accounts could not be saved to " + path + ": " + outcome.status.description()};
}

}  // namespace tools
