// Lists the accounts of the device whose file tree stands at ROOT ("/" on the device itself). With an identifier and a
// data class, switches that data class of that account on or off first:
//
//   list-accounts ROOT [IDENTIFIER DATACLASS]

#include <accounts/account_settings.h>

#include <iostream>

namespace {

void show(const accounts::Account& account) {
  std::cout << account.identifier() << "  " << account.type() << "  " << account.displayName().value_or("") << '\n';
  for (const std::string& dataclass : account.enabledDataclasses()) std::cout << "    " << dataclass << '\n';
}

int fail(const accounts::Error& error) {
  std::cerr << "list-accounts: " << error.sentence << '\n';
  return 1;
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 2 && count != 4) {
    std::cerr << "Usage: list-accounts ROOT [IDENTIFIER DATACLASS]\n";
    return 2;
  }
  accounts::OpenOptions options;
  options.root = arguments[1];
  const auto settings = accounts::AccountSettings::open(options);
  if (!settings) return fail(settings.error());
  if (count == 4) {
    const auto saved = settings->change([&](accounts::Edit& edit) {
      const auto account = edit.account(arguments[2]);
      return edit.setEnabled(arguments[2], arguments[3], account && !account->isEnabled(arguments[3])).isOk();
    });
    if (!saved) return fail(saved.error());
  }
  const auto accounts = settings->accounts();
  if (!accounts) return fail(accounts.error());
  for (const accounts::Account& account : *accounts) show(account);
}
