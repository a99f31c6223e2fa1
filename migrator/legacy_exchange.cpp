#include <array>
#include <utility>

#include "migrator/accounts_data_migrator.h"
#include "migrator/legacy_conversion.h"
#include "migrator/stored_names.h"
#include "platform/platform.h"
#include "records/fact_observer.h"

namespace migrator {
namespace {

using namespace accountsettings;

constexpr std::array kRenames{Rename{"DAAccountConfigurationClass", kAccountClass},
                              Rename{"DAAccountDescription", kAccountDisplayName},
                              Rename{"DAAccountConfigurationAccountID", kAccountIdentifier}};

struct Switch {
  StringConstant legacyKey;
  StringConstant dataclass;
};

constexpr std::array kSwitches{Switch{"DAAccountEnabledForCalendar", kAccountDataclassCalendars},
                               Switch{"DAAccountEnabledForContacts", kAccountDataclassContacts},
                               Switch{"DAAccountEnabledForEmail", kAccountDataclassMail},
                               Switch{"DAAccountEnabledForContactsSearch", kAccountDataclassContactsSearch}};

}  // namespace

void tellUnsavedExchange() {
  const std::string path = daAccountPath();
  if (records::factObserver() == nullptr || !platform::current().files->kindOf(path).isOk()) return;
  const Dictionary legacyFile = readLegacyFile(path);
  std::multiset<std::string> saved = savedSyncIdentifiers();
  tellUnsaved({path, legacyFile, "DAAccountsKey", kRenames}, saved);
}

std::shared_ptr<BasicAccount> AccountsDataMigrator::_convertExchangeAccountDescription(const Dictionary& description) {
  Dictionary record = renamed(description, kRenames);
  Array enabled;
  for (const Switch& each : kSwitches) {
    // Switches that were never set, or that hold what is no switch, are on.
    const std::optional<PropertyValue> value = record.remove(each.legacyKey);
    const bool isOn = !value || value->booleanValue().value_or(true);
    if (isOn) enabled.emplace_back(each.dataclass);
  }
  record.set(kAccountEnabledDataclasses, std::move(enabled));
  record.set(kAccountType, kExchangeAccountType);
  record.set(kAccountTypeString, "Exchange");
  record.set(kAccountShortTypeString, "Exchange");
  std::shared_ptr<BasicAccount> account = BasicAccount::initWithProperties(record);
  if (!account) return nullptr;
  // Unlike a mail account, one without an identifier is given no sync identifier of its own here.
  if (const Text* const identifier = record.text(kAccountIdentifier)) {
    account->setAccountProperty_forKey(*identifier, kAccountSyncIdentifier);
  }
  return account;
}

bool AccountsDataMigrator::_migrateDAAccounts(AccountsManager& store) {
  const std::string path = daAccountPath();
  const Dictionary legacyFile = readLegacyFile(path);
  if (!legacyFile.empty()) _foundOldDAAccountsToMigrate = true;
  if (_saveMigrationInformation() && _collatedMigrationData) {
    _collatedMigrationData->set(kOldExchangeAccountsKey, legacyFile);
  }
  const LegacySource source{path, legacyFile, "DAAccountsKey", kRenames};
  const auto accounts = convertedAccounts(source, _convertExchangeAccountDescription,
                                          "-[AccountsDataMigrator(Internal) _migrateDAAccounts:]",
                                          "%s. Could not convert the description for the Exchange account %@");
  if (accounts) {
    noteOrigins(store, source, *accounts);
    store.replaceAccountsWithTypes_withAccounts({kExchangeAccountType}, *accounts);
  }
  removeOriginalCompanion(path);
  return accounts.has_value();
}

}  // namespace migrator
