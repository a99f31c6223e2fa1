#include "migrator/legacy_conversion.h"

#include <tuple>
#include <utility>

#include "accountsettings/change_tracker.h"
#include "migrator/telling.h"
#include "platform/platform.h"
#include "records/fact_observer.h"

namespace migrator {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;
using records::LossCode;
using records::Lost;

Dictionary renamed(const Dictionary& description, std::span<const Rename> renames) {
  Dictionary record = description;
  for (const Rename& rename : renames) {
    if (std::optional<PropertyValue> value = record.remove(rename.legacyKey)) record.set(rename.key, *std::move(value));
  }
  return record;
}

Dictionary readLegacyFile(const std::string& path) {
  auto read = platform::current().propertyLists->readDictionary(path);
  if (!read.isOk()) {
    records::tellFact(
        [&] { return Lost{.code = LossCode::unreadableLegacyFile, .detail = read.status().reason(), .file = path}; });
  }
  return std::move(read).valueOr({});
}

namespace {

// Where a description stands: MailAccounts[2] of /a/file.
std::string placeOf(const std::string& path, std::string_view key, std::size_t index) {
  return std::string{key} + "[" + std::to_string(index) + "] of " + path;
}

records::Name nameOf(const PropertyValue& description, std::span<const Rename> renames) {
  const Dictionary* const properties = description.asDictionary();
  return properties == nullptr ? records::Name{} : accountsettings::nameOf(renamed(*properties, renames));
}

// One description that is refused keeps the whole file from being converted.
void tellRefused(const LegacySource& source, std::size_t refused) {
  for (const std::string_view key : {source.key, source.otherKey}) {
    const Array* const descriptions = key.empty() ? nullptr : source.contents.array(key);
    for (std::size_t index = 0; descriptions != nullptr && index < descriptions->size(); ++index) {
      const bool isRefused = key == source.key && index == refused;
      records::tellFact([&] {
        return Lost{.code = isRefused ? LossCode::refusedDescription : LossCode::refusedFile,
                    .account = nameOf((*descriptions)[index], source.renames),
                    .detail = placeOf(source.path, key, index),
                    .file = source.path};
      });
    }
  }
}

void collectSyncIdentifiers(const Array* records, std::multiset<std::string>& identifiers) {
  for (std::size_t index = 0; records != nullptr && index < records->size(); ++index) {
    const Dictionary* const record = (*records)[index].asDictionary();
    if (record == nullptr) continue;
    const Text* const identifier = record->text(accountsettings::kAccountSyncIdentifier);
    if (identifier != nullptr) identifiers.insert(identifier->string());
    collectSyncIdentifiers(record->array(accountsettings::kAccountChildAccounts), identifiers);
  }
}

}  // namespace

std::multiset<std::string> savedSyncIdentifiers() {
  const auto settings =
      platform::current().propertyLists->readDictionary(AccountsManager::fullPathToAccountSettingsPlist()).valueOr({});
  std::multiset<std::string> identifiers;
  collectSyncIdentifiers(settings.array(accountsettings::kPlistAccountsKey), identifiers);
  return identifiers;
}

void tellUnsaved(const LegacySource& source, std::multiset<std::string>& saved) {
  const Array* const descriptions = source.contents.array(source.key);
  for (std::size_t index = 0; descriptions != nullptr && index < descriptions->size(); ++index) {
    records::Name name = nameOf((*descriptions)[index], source.renames);
    if (const auto found = saved.find(name.identifier); found != saved.end()) {
      saved.erase(found);
      continue;
    }
    records::tellFact([&] {
      return Lost{.code = LossCode::notSaved,
                  .account = std::move(name),
                  .detail = placeOf(source.path, source.key, index),
                  .file = source.path};
    });
  }
}

void noteOrigins(AccountsManager& store, const LegacySource& source, const AccountsManager::Accounts& accounts) {
  accountsettings::ChangeTracker* const tracker = store.changeTracker();
  const Array* const descriptions = source.contents.array(source.key);
  if (tracker == nullptr || descriptions == nullptr) return;
  for (std::size_t index = 0; index < accounts.size(); ++index) {
    const Dictionary* const description = (*descriptions)[index].asDictionary();
    tracker->comesFrom(*accounts[index], description == nullptr ? Dictionary{} : *description,
                       placeOf(source.path, source.key, index), source.path);
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
      tellRefused(source, accounts.size());
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
