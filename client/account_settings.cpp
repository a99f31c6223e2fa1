#include "accounts/account_settings.h"

#include <utility>

#include "client/contents.h"

namespace accounts {

struct AccountSettings::Content {
  std::shared_ptr<const Device> device;
};

AccountSettings::AccountSettings(std::shared_ptr<const Content> content) : _content{std::move(content)} {}

Result<AccountSettings> AccountSettings::open(const OpenOptions& options) {
  return answerOf([&]() -> Result<AccountSettings> {
    auto device = std::make_shared<const Device>(options);
    if (const Outcome waited = device->waitForMigration(); !waited.isOk()) return waited.error();
    if (const Result<Store> store = device->load(); !store.isOk()) return store.error();
    return AccountSettings{std::make_shared<const Content>(Content{std::move(device)})};
  });
}

Result<Accounts> AccountSettings::accounts() const {
  return answerOf([this]() -> Result<Accounts> {
    Result<Store> store = _content->device->load();
    if (!store.isOk()) return store.error();
    return accountsOf(_content->device, std::move(store).value());
  });
}

Result<Edit> AccountSettings::edit() const {
  return answerOf([this] { return beginEdit(_content->device); });
}

Result<Saved> AccountSettings::change(const std::function<bool(Edit&)>& function) const {
  Result<Edit> edit = this->edit();
  if (!edit.isOk()) return edit.error();
  if (!function(edit.value())) return Error{Code::cancelled, "the change was given up"};
  return edit.value().save();
}

Result<Watch> AccountSettings::watch(const Accounts& since, Watch::Callback callback, Watch::Caller caller) const {
  return answerOf([&] { return beginWatch(_content->device, since, std::move(callback), caller); });
}

}  // namespace accounts
