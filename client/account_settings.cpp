#include "accounts/account_settings.h"

#include <utility>

#include "client/contents.h"

namespace accounts {

struct AccountSettings::Content {
  std::shared_ptr<const Device> device;
  FileIdentity file;
  mutable Store store;  // what opening loaded, for the first look, where the file is still the same
  mutable std::mutex mutex = {};

  Content(std::shared_ptr<const Device> opened, const FileIdentity& identity, Store loaded)
      : device{std::move(opened)}, file{identity}, store{std::move(loaded)} {}

  [[nodiscard]] Result<Store> load() const {
    const std::lock_guard guard{mutex};
    Store opened = std::exchange(store, nullptr);
    if (opened != nullptr && FileIdentity::of(device->settingsFile()) == file) return opened;
    return device->load();
  }
};

namespace {

Outcome told(const Device& device, void (*announcement)(const accountsettings::BasicAccount&, std::string_view),
             const Account& account, std::string_view dataclass) {
  if (!device.opensModules()) return std::monostate{};
  Outcome outcome = answerOf([&]() -> Outcome {
    const Within within{device};
    announcement(*account.content().record, dataclass);
    return std::monostate{};
  });
  return outcome ? outcome : Error{Code::notAnnounced, outcome.error().sentence};
}

}  // namespace

AccountSettings::AccountSettings(std::shared_ptr<const Content> content) : _content{std::move(content)} {}

Result<AccountSettings> AccountSettings::open(const OpenOptions& options) {
  return answerOf([&]() -> Result<AccountSettings> {
    auto device = std::make_shared<const Device>(options);
    const Outcome waited = options.mayBeMigrating ? std::monostate{} : device->waitForMigration();
    if (!waited) return waited.error();
    const FileIdentity file = FileIdentity::of(device->settingsFile());
    const Result<Store> store = device->load();
    if (!store) return store.error();
    return AccountSettings{std::make_shared<const Content>(std::move(device), file, *store)};
  });
}

Outcome AccountSettings::waitForMigration(const OpenOptions& options) {
  return answerOf([&] { return Device{options}.waitForMigration(); });
}

Result<Accounts> AccountSettings::accounts() const {
  return answerOf([this]() -> Result<Accounts> {
    Result<Store> store = _content->load();
    if (!store.isOk()) return store.error();
    return accountsOf(_content->device, std::move(store).value());
  });
}

Result<Edit> AccountSettings::edit() const {
  return answerOf([this] { return beginEdit(_content->device, Manner::change); });
}

Result<Edit> AccountSettings::trial() const {
  return answerOf([this] { return beginEdit(_content->device, Manner::trial); });
}

Outcome AccountSettings::willChange(const Account& account, std::string_view dataclass) const {
  return told(*_content->device, accountsettings::AccountsManager::accountWillChange_forDataclass, account, dataclass);
}

Outcome AccountSettings::didChange(const Account& account, std::string_view dataclass) const {
  return told(*_content->device, accountsettings::AccountsManager::accountDidChange_forDataclass, account, dataclass);
}

Result<Saved> AccountSettings::change(const std::function<bool(Edit&)>& function) const {
  Result<Edit> edit = this->edit();
  if (!edit.isOk()) return edit.error();
  if (!function(edit.value())) return edit->failure().value_or(Error{Code::cancelled, "the change was given up"});
  return edit.value().save();
}

Result<Watch> AccountSettings::watch(const Accounts& since, Watch::Callback callback, Watch::Caller caller) const {
  return answerOf([&] { return beginWatch(_content->device, since, std::move(callback), caller); });
}

}  // namespace accounts
