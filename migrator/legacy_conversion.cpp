#include "migrator/legacy_conversion.h"

#include <tuple>
#include <utility>

#include "accountsettings/store_watch.h"
#include "migrator/console.h"
#include "migrator/told_removal.h"
#include "platform/platform.h"
#include "records/fact_observer.h"

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
  return platform::current().propertyLists->readDictionary(path).valueOr({});
}

namespace {

// Where a description stands: MailAccounts[2] of /a/file.
std::string placeOf(const LegacySource& source, std::size_t index) {
  return std::string{source.key} + "[" + std::to_string(index) + "] of " + source.path;
}

void tellRefused(const LegacySource& source, const std::string& place) {
  records::tellFact([&] {
    return records::RunFact{.kind = records::RunFact::Kind::failed,
                            .reason = place + " has no class, so no account of this file is converted",
                            .path = source.path};
  });
}

}  // namespace

void noteOrigins(AccountsManager& store, const LegacySource& source, const AccountsManager::Accounts& accounts) {
  accountsettings::StoreWatch* const watch = store._runWatch();
  const Array* const descriptions = source.contents.array(source.key);
  if (watch == nullptr || descriptions == nullptr) return;
  for (std::size_t index = 0; index < accounts.size(); ++index) {
    const Dictionary* const description = (*descriptions)[index].asDictionary();
    watch->comesFrom(*accounts[index], description == nullptr ? Dictionary{} : *description, placeOf(source, index));
  }
}

std::optional<AccountsManager::Accounts> convertedAccounts(const LegacySource& source, const Conversion& convert,
                                                           std::string_view method, std::string_view failureFormat) {
  AccountsManager::Accounts accounts;
  const Array* const descriptions = source.contents.array(source.key);
  if (descriptions == nullptr) return accounts;
  accounts.reserve(descriptions->size());
  for (const PropertyValue& element : *descriptions) {
    const Dictionary* const description = element.asDictionary();
    std::shared_ptr<BasicAccount> account = convert(description == nullptr ? Dictionary{} : *description);
    if (!account) {
      writeToConsole(failureFormat, method, element);
      tellRefused(source, placeOf(source, accounts.size()));
      return std::nullopt;
    }
    accounts.push_back(std::move(account));
  }
  return accounts;
}

std::string originalCompanionOf(const std::string& legacyPath) { return legacyPath + ".original"; }

void removeOriginalCompanion(const std::string& legacyPath) {
  std::ignore = removeAndTell(originalCompanionOf(legacyPath));
}

}  // namespace migrator
