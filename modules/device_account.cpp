// The account of what is kept only on the device: its record is its full account, and it has no service to refresh
// from.

#include <memory>

#include "accountsettings/device_local_account.h"
#include "platform/class_registry.h"

namespace modules {
namespace {

using accountsettings::AccountClassInfo;
using accountsettings::BasicAccount;
using accountsettings::DeviceLocalAccount;

std::shared_ptr<const AccountClassInfo> creator() {
  auto info = std::make_shared<AccountClassInfo>("DeviceAccountCreator");
  info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>& account) {
    return DeviceLocalAccount::accountWithBasicAccount(*account);
  };
  return info;
}

const platform::ClassRegistration fullAccounts{creator()};

}  // namespace
}  // namespace modules
