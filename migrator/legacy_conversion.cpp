#include "migrator/legacy_conversion.h"

#include <tuple>
#include <utility>

#include "migrator/console.h"
#include "platform/platform.h"

namespace migrator {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;

Dictionary renamed(const Dictionary& description, std::span<const Rename> renames) {
  Dictionary record = description;
  for (const Rename& rename : renames) {
    if (std::optional<PropertyValue> value = record.remove(rename.legacyKey)) record.set(rename.key, *std::move(value));
  }
  return record;
}

Dictionary readLegacyFile(const std::string& path) {
  return platform::current().propertyLists->readDictionary(path).value_or(Dictionary{});
}

std::optional<AccountsManager::Accounts> convertedAccounts(const Dictionary& legacyFile, std::string_view key,
                                                           const Conversion& convert, std::string_view method,
                                                           std::string_view failureFormat) {
  AccountsManager::Accounts accounts;
  const Array* const descriptions = legacyFile.array(key);
  if (descriptions == nullptr) return accounts;
  accounts.reserve(descriptions->size());
  for (const PropertyValue& element : *descriptions) {
    const Dictionary* const description = element.asDictionary();
    std::shared_ptr<BasicAccount> account = convert(description == nullptr ? Dictionary{} : *description);
    if (!account) {
      writeToConsole(failureFormat, method, element);
      return std::nullopt;
    }
    accounts.push_back(std::move(account));
  }
  return accounts;
}

std::string originalCompanionOf(const std::string& legacyPath) { return legacyPath + ".original"; }

void removeOriginalCompanion(const std::string& legacyPath) {
  std::ignore = platform::current().files->remove(originalCompanionOf(legacyPath));
}

}  // namespace migrator
