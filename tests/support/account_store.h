#pragma once

#include <gtest/gtest.h>

#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "tests/support/account_configuration.h"

namespace tests {

using accountsettings::kCurrentVersion;
using Account = accountsettings::AccountsManager::Account;
using Accounts = accountsettings::AccountsManager::Accounts;

// A property dictionary that makes an account, with further properties after the three that it needs.
[[nodiscard]] inline Dictionary properties(std::string_view identifier,
                                           std::initializer_list<Dictionary::Entry> more = {},
                                           std::string_view type = "CalDAV") {
  Dictionary dictionary{{"Identifier", identifier}, {"Type", type}, {"Class", "TestAccount"}};
  for (const Dictionary::Entry& entry : more) dictionary.set(entry.key, entry.value);
  return dictionary;
}

[[nodiscard]] inline Account account(std::string_view identifier, std::initializer_list<Dictionary::Entry> more = {},
                                     std::string_view type = "CalDAV") {
  return accountsettings::BasicAccount::initWithProperties(properties(identifier, more, type));
}

// A configured device whose settings file a test writes, loads and reads again.
class AccountStore : public testing::Test {
 protected:
  AccountStore() { putAccountConfiguration(device); }

  using AccountsManager = accountsettings::AccountsManager;
  using Store = std::shared_ptr<AccountsManager>;

  void putFile(const Array& accounts, const PropertyValue& version = kCurrentVersion) {
    device.put(kSettingsFile, Dictionary{{"Accounts", accounts}, {"Version", version}});
  }
  Store load(const Array& accounts) {
    putFile(accounts);
    return AccountsManager::init();
  }
  Dictionary file() { return device.dictionaryAt(kSettingsFile); }
  Array fileAccounts() {
    const Dictionary root = file();
    const Array* const accounts = root.array("Accounts");
    return accounts == nullptr ? Array{} : *accounts;
  }

  [[nodiscard]] static std::vector<std::string> identifiersOf(const Accounts& accounts) {
    std::vector<std::string> identifiers;
    for (const Account& each : accounts) identifiers.push_back(each->identifier().value_or("(none)").string());
    return identifiers;
  }

  // The messages of one method, in order.
  [[nodiscard]] std::vector<std::string> messagesOf(std::string_view method) const {
    std::vector<std::string> messages;
    const std::vector<std::string> all = device.logMessages();
    for (std::size_t line = 0; line < all.size(); ++line) {
      if (device.systemLog->lines[line].method == method) messages.push_back(all[line]);
    }
    return messages;
  }

  FakeDevice device;
};

}  // namespace tests
