#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <initializer_list>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/vocabulary.h"
#include "migrator/accounts_data_migrator.h"
#include "tests/support/account_configuration.h"

namespace tests {

// An account of this type and class, with further properties.
inline Dictionary account(std::string_view type, std::string_view className, std::string_view identifier,
                          std::initializer_list<Dictionary::Entry> more = {}) {
  Dictionary properties{{"Type", type}, {"Class", className}, {"Identifier", identifier}};
  for (const Dictionary::Entry& entry : more) properties.set(entry.key, entry.value);
  return properties;
}

inline Array dataclasses(std::initializer_list<std::string_view> names) {
  Array array;
  for (const std::string_view name : names) array.emplace_back("com.vorlix.Dataclass." + std::string{name});
  return array;
}

// A device in memory and a store loaded from its settings file, for one version step to upgrade.
class StepTest : public testing::Test {
 protected:
  StepTest() {
    putAccountConfiguration(device);
    accountsettings::AccountsManager::_setShouldSkipNotifications(true);  // as during every migration
  }

  void putSettings(const Dictionary& settings) {
    device.put(accountsettings::AccountsManager::fullPathToAccountSettingsPlist(), settings);
  }
  void load(const Array& accounts, const PropertyValue& version = 0) {
    putSettings({{"Version", version}, {"Accounts", accounts}});
    store = accountsettings::AccountsManager::initInsideOfMigration();
    device.outputs.clear();
    device.console->lines.clear();
    device.systemLog->lines.clear();
  }

  [[nodiscard]] accountsettings::BasicAccount& at(std::size_t place) { return *store->allBasicAccounts().at(place); }
  // The value of the account at this place, for comparing; a text that no value has where it is absent.
  [[nodiscard]] PropertyValue value(std::size_t place, std::string_view key) {
    return at(place).accountPropertyForKey(key).value_or("(absent)");
  }
  [[nodiscard]] bool isEnabled(std::size_t place, std::string_view dataclass) {
    return at(place).isEnabledForDataclass("com.vorlix.Dataclass." + std::string{dataclass});
  }
  // The data classes that the account's own list names, each without the common prefix.
  [[nodiscard]] std::vector<std::string> storedDataclasses(std::size_t place, std::string_view key) {
    std::vector<std::string> names;
    const Array* const list = at(place).properties().array(key);
    for (const PropertyValue& name : list != nullptr ? *list : Array{}) {
      names.push_back(name.asText()->string().substr(std::string_view{"com.vorlix.Dataclass."}.size()));
    }
    return names;
  }
  [[nodiscard]] Array savedAccounts() {
    const Dictionary file = device.dictionaryAt(accountsettings::AccountsManager::fullPathToAccountSettingsPlist());
    const Array* const accounts = file.array("Accounts");
    return accounts != nullptr ? *accounts : Array{};
  }
  // How often the settings file was replaced so far.
  [[nodiscard]] std::ptrdiff_t saves() const {
    return std::ranges::count_if(device.files->calls,
                                 [](const std::string& call) { return call.starts_with("rename"); });
  }

  FakeDevice device;
  migrator::AccountsDataMigrator migrator;
  std::shared_ptr<accountsettings::AccountsManager> store;
};

inline const PropertyValue kAbsent{"(absent)"};

}  // namespace tests
