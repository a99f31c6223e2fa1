#pragma once

#include <memory>
#include <mutex>
#include <vector>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "client/device.h"

// What the values of the interface hold.
namespace accounts {

struct Value::Content {
  platform::PropertyValue value;
};

[[nodiscard]] inline Value valueOf(platform::PropertyValue value) {
  return Value{std::make_shared<const Value::Content>(Value::Content{std::move(value)})};
}

// The record is never changed from then on.
struct Account::Content {
  std::shared_ptr<const Device> device;
  std::shared_ptr<accountsettings::BasicAccount> record;
};

[[nodiscard]] inline Account accountOf(std::shared_ptr<const Device> device,
                                       std::shared_ptr<accountsettings::BasicAccount> record) {
  return Account{std::make_shared<const Account::Content>(Account::Content{std::move(device), std::move(record)})};
}

// The store is never changed from then on.
struct Accounts::Content {
  std::shared_ptr<const Device> device;
  std::shared_ptr<accountsettings::AccountsManager> store;

  Content(std::shared_ptr<const Device> ofDevice, std::shared_ptr<accountsettings::AccountsManager> loaded)
      : device{std::move(ofDevice)}, store{std::move(loaded)} {}

  // Made for whoever asks first: who looks for one account of many needs no other.
  [[nodiscard]] const std::vector<Account>& topLevel() const {
    std::call_once(_made, [this] {
      _topLevel.reserve(store->count());
      for (const auto& record : store->allBasicAccounts()) _topLevel.push_back(accountOf(device, record));
    });
    return _topLevel;
  }

 private:
  mutable std::once_flag _made;
  mutable std::vector<Account> _topLevel;
};

[[nodiscard]] inline Accounts accountsOf(std::shared_ptr<const Device> device,
                                         std::shared_ptr<accountsettings::AccountsManager> store) {
  return Accounts{std::make_shared<const Accounts::Content>(std::move(device), std::move(store))};
}

enum class Manner : std::uint8_t { change, trial };
[[nodiscard]] Result<Edit> beginEdit(std::shared_ptr<const Device> device, Manner manner);
[[nodiscard]] Result<Watch> beginWatch(std::shared_ptr<const Device> device, const Accounts& since,
                                       Watch::Callback callback, Watch::Caller caller);

}  // namespace accounts
