// Lists the accounts of the device whose file tree stands at ROOT ("/" on the device itself). With an identifier and a
// data class, switches that data class of that account on or off first, and saves:
//
//   list-accounts ROOT [IDENTIFIER DATACLASS]

#include <accountsettings/accounts_manager.h>
#include <platform/linux/linux_platform.h>
#include <platform/platform.h>

#include <exception>
#include <iostream>
#include <string_view>

namespace {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;

void show(const BasicAccount& account) {
  std::cout << account.identifier().value_or("?") << "  " << account.type().value_or("?") << "  "
            << account.displayName().value_or("") << '\n';
  for (const auto& dataclass : account.enabledDataclasses().value_or(BasicAccount::Dataclasses{})) {
    std::cout << "    " << dataclass << '\n';
  }
}

bool switchDataclass(AccountsManager& store, std::string_view identifier, std::string_view dataclass) {
  const auto account = store.accountWithIdentifier(identifier);
  if (account == nullptr) return false;
  account->setEnabled_forDataclass(!account->isEnabledForDataclass(dataclass), dataclass);
  store.updateAccount(account);
  store.saveAllAccounts();
  return true;
}

int run(int count, char** arguments) {
  if (count != 2 && count != 4) {
    std::cerr << "Usage: list-accounts ROOT [IDENTIFIER DATACLASS]\n";
    return 2;
  }
  const std::string_view root = arguments[1];
  platform::setCurrent(platform::makeLinuxPlatform({.systemRoot = root}));
  // Those who listen for changes on this machine have nothing to do with another device's.
  AccountsManager::_setShouldSkipNotifications(root != "/");
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  AccountsManager::waitForMigrationToFinish();
  const auto store = AccountsManager::init();
  if (count == 4 && !switchDataclass(*store, arguments[2], arguments[3])) {
    std::cerr << "list-accounts: no account " << arguments[2] << '\n';
    return 1;
  }
  for (const auto& account : store->allBasicAccounts()) show(*account);
  return 0;
}

}  // namespace

int main(int count, char** arguments) {
  try {
    return run(count, arguments);
  } catch (const std::exception& failure) {
    std::cerr << "list-accounts: " << failure.what() << '\n';
    return 1;
  }
}
