// A program on the installed library that calls what the library publishes, by its headers and by its plain names, on
// the device below the directory that it is given. It says what differs, and how the region calls Gmail.

#include <accountsettings/accounts_manager.h>
#include <accountsettings/log_handle.h>
#include <accountsettings/mail_functions.h>
#include <accountsettings/vocabulary.h>
#include <dlfcn.h>
#include <platform/linux/linux_platform.h>

#include <iostream>
#include <string>
#include <string_view>

namespace {

template <typename Published>
Published* named(const char* name) {
  void* const found = dlsym(RTLD_DEFAULT, name);
  if (found == nullptr) std::cout << "not found: " << name << '\n';
  return reinterpret_cast<Published*>(found);
}

template <typename Answer>
void compare(const char* name, const Answer& answer) {
  auto* const function = named<Answer()>(name);
  if (function != nullptr && function() != answer) std::cout << "differs: " << name << '\n';
}

void comparePath() {
  using accountsettings::kAccountMigrationLockFilename;
  auto* const path = named<const char* const>("kAccountMigrationLockFilename");
  if (path != nullptr && std::string_view{*path} != kAccountMigrationLockFilename) std::cout << "another path\n";
}

void compareLog() {
  auto* const log = named<const accountsettings::LogHandle&()>("_ASLogSystem");
  if (log != nullptr && &log() != &accountsettings::_ASLogSystem()) std::cout << "another log\n";
}

void reportBothWays() {
  accountsettings::reportMailAccountClassFound({{"Class", "MailAccount"}}, "by its header");
  using Report = void(const platform::Dictionary&, std::string_view);
  if (auto* const report = named<Report>("reportMailAccountClassFound")) report({}, "by its name");
}

}  // namespace

int main(int, char** arguments) {
  platform::setCurrent(platform::makeLinuxPlatform({.systemRoot = arguments[1]}));
  compare("daAccountPath", accountsettings::daAccountPath());
  compare("mailAccountsPath", accountsettings::mailAccountsPath());
  compare("accountSettingsAccountsPath", accountsettings::accountSettingsAccountsPath());
  compare("_UseGoogleMail", accountsettings::_UseGoogleMail());
  comparePath();
  compareLog();
  reportBothWays();
  std::cout << (accountsettings::_UseGoogleMail() ? "Google Mail" : "Gmail") << '\n';
}
