#include "tools/session.h"

#include "commandline/program.h"
#include "platform/linux/linux_platform.h"
#include "platform/logs_and_notices.h"

namespace tools {
namespace {

using accounts::AccountSettings;
using accounts::Code;
using accounts::Edit;

constexpr const char* kSavedButNotAnnounced = "the accounts were saved, but not announced: ";
constexpr std::chrono::seconds kPatienceOfReaders{5};
constexpr std::chrono::hours kPatienceOfWriters{24 * 365};  // as long as it takes

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

void sayThatRecordsWent(std::size_t count) {
  if (count == 0) return;
  commandline::say("accountctl", std::to_string(count) + (count == 1 ? " record" : " records") +
                                     " that could not be loaded went with the save");
}

}  // namespace

void fail(const accounts::Error& error) {
  switch (error.code) {
    case Code::unknownAccount: throw Failure{ExitStatus::noSuchAccount, error.sentence};
    case Code::alreadyThere:
    case Code::unsuitable:
    case Code::wouldBeDropped: throw Failure{ExitStatus::wrongUse, error.sentence};
    case Code::notAnnounced:
    case Code::brokenInstallation: throw Failure{ExitStatus::faultyInstallation, error.sentence};
    case Code::wouldDropOthers:
      throw Failure{ExitStatus::failed,
                    error.sentence + "; accountctl verify tells why, and --drop-unreadable removes such records"};
    default: throw Failure{ExitStatus::failed, error.sentence};
  }
}

Session::Session(const Options& options) : _changesNothing{options.changesNothing} {
  platform::setCurrent(platform::makeLinuxPlatform(options.device));
  const auto textOf = [](const auto& path) { return path ? path->string() : std::string{}; };
  _options.root = textOf(options.device.systemRoot);
  _options.home = textOf(options.device.home);
  _options.resources = textOf(options.device.resources);
  _options.whileWaiting = [](const std::string& sentence) { commandline::say("accountctl", sentence); };
  _options.mayBeMissing = true;
  _options.mayDropUnreadable = options.dropsUnreadable;
  _options.opensModules = options.opensModules();
}

void Session::waitForMigration() const {
  const auto waited = AccountSettings::waitForMigration(_options);
  if (waited || waited.error().code != Code::busy) return;
  commandline::say("accountctl", waited.error().sentence + "; what follows is read while a migration may run");
}

const AccountSettings& Session::settings() {
  if (_settings) return *_settings;
  const bool isWriter = _changes && !_changesNothing;
  _options.timeLimit = isWriter ? std::chrono::milliseconds{kPatienceOfWriters} : kPatienceOfReaders;
  _options.mayBeOfOtherRelease = !_changes;
  _options.mayBeMigrating = !isWriter;
  if (!isWriter) waitForMigration();
  return _settings.emplace(required(AccountSettings::open(_options)));
}

const accounts::Accounts& Session::accounts() {
  if (!_accounts) _accounts = required(settings().accounts());
  return *_accounts;
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
  _options.timeLimit = kPatienceOfReaders;
  if (!file) waitForMigration();
}

// A module may fail in its own way, too; whatever it says, the message says what became of the change.
void Session::announce(const Concerned& concerned, Announcement announcement, const char* whatBecameOfTheChange) {
  for (const auto& [account, dataclasses] : concerned) {
    for (const std::string& each : dataclasses) {
      const auto told = (settings().*announcement)(account, each);
      if (!told) throw Failure{ExitStatus::faultyInstallation, whatBecameOfTheChange + told.error().sentence};
    }
  }
}

void Session::tryOut(const Steps& steps) {
  Edit edit = required(settings().trial());
  steps(edit);
  required(edit.save());
}

void Session::change(const Concerned& concerned, const Steps& steps) {
  if (_changesNothing) return tryOut(steps);
  announce(concerned, &AccountSettings::willChange, "nothing was changed: ");
  const std::size_t unreadable = accounts().unreadable();
  Edit edit = required(settings().edit());
  steps(edit);
  const auto saved = required(edit.save());
  sayThatRecordsWent(unreadable);
  if (saved.notAnnounced) fail(*saved.notAnnounced);
  announce(concerned, &AccountSettings::didChange, kSavedButNotAnnounced);
}

}  // namespace tools
