// Looks at and changes one account of the device below ROOT, with the store alone and through the interface for
// programs, and removes each as a trial, for whoever counts what `measuredPiece` takes; prints the names of the pieces.
// Usage: client-cost ROOT ID

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <utility>

#include "accounts/account_settings.h"
#include "accountsettings/accounts_manager.h"
#include "platform/linux/linux_platform.h"
#include "platform/logs_and_notices.h"
#include "platform/platform.h"

extern "C" __attribute__((noinline)) void measuredPiece(const std::function<void()>& action) { action(); }

namespace {

using accounts::AccountSettings;
using accountsettings::AccountsManager;

void useDevice(const char* root) {
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = root});
  services.systemLog = std::make_shared<platform::SilentSystemLog>();
  platform::keepTemporaryDirectoryOnDeviceVolume(services);
  platform::setCurrent(std::move(services));
  AccountsManager::_setShouldSkipNotifications(true);
}

void require(bool isDone) {
  if (isDone) return;
  std::fputs("it could not be done\n", stderr);
  std::exit(1);
}

}  // namespace

int main(int, char** arguments) {
  useDevice(arguments[1]);
  const char* const identifier = arguments[2];
  const auto opened = AccountSettings::open();
  require(opened.isOk() && opened->accounts().isOk());
  // Another one at each change, in whichever run: what the file holds already would not be made anew.
  std::int64_t port = opened->accounts().value().withIdentifier(identifier)->integer("Port").value();
  const std::pair<const char*, std::function<void()>> pieces[] = {
      {"look in the store", [&] { require(AccountsManager::init()->accountWithIdentifier(identifier) != nullptr); }},
      {"look", [&] { require(opened->accounts().value().withIdentifier(identifier).has_value()); }},
      {"change in the store",
       [&] {
         const auto store = AccountsManager::init();
         store->accountWithIdentifier(identifier)->setAccountProperty_forKey(++port, "Port");
         store->saveAllAccounts();
         require(store->lastSaveOutcome().isSaved());
       }},
      {"change",
       [&] {
         const auto saved =
             opened->change([&](accounts::Edit& edit) { return edit.set(identifier, "Port", ++port).isOk(); });
         require(saved.isOk() && saved->changes.size() == 1);
       }},
      {"remove each",
       [&] {
         auto edit = opened->trial();
         for (const auto& account : edit->accounts()) require(edit->remove(account.identifier()).isOk());
         require(edit->accounts().empty());
       }},
  };
  for (const auto& [name, action] : pieces) action();  // what is done once in a process is done here
  for (const auto& [name, action] : pieces) {
    measuredPiece(action);
    std::puts(name);
  }
}
