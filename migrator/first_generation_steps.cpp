#include <algorithm>
#include <array>
#include <map>
#include <set>

#include "accountsettings/change_tracker.h"
#include "accountsettings/device_local_account.h"
#include "accountsettings/vocabulary.h"
#include "migrator/account_reads.h"
#include "migrator/accounts_data_migrator.h"
#include "migrator/hostile_accounts.h"
#include "migrator/stored_names.h"
#include "migrator/telling.h"
#include "platform/platform.h"

namespace migrator {
namespace {

using namespace accountsettings;  // the vocabulary
using platform::SyncDataType;

using Accounts = AccountsManager::Accounts;

// --- Identifiers ---

std::optional<Text> unlessEmpty(std::optional<Text> text) {
  return text && !text->empty() ? std::move(text) : std::nullopt;
}

void settleIdentifier(BasicAccount& account) {
  // Read from the account's own properties: a unique id names this very record and is never a parent's.
  const Text* const uniqueId = account.properties().text(kUniqueIdKey);
  if (uniqueId != nullptr && !uniqueId->empty()) {
    account.setAccountProperty_forKey(*uniqueId, kAccountIdentifier);
    account.removeAccountPropertyForKey(kUniqueIdKey);
  } else if (!unlessEmpty(textForKey(account, kAccountIdentifier))) {
    account.setAccountProperty_forKey(BasicAccount::createNewAccountUID(), kAccountIdentifier);
  }
}

// --- The on-device account ---

struct DataclassSources {
  StringConstant dataclass;
  SyncDataType sources;
};

constexpr std::array<DataclassSources, 4> kDataclassesOnDevice{{{kAccountDataclassBookmarks, SyncDataType::bookmarks},
                                                                {kAccountDataclassCalendars, SyncDataType::calendars},
                                                                {kAccountDataclassContacts, SyncDataType::contacts},
                                                                {kAccountDataclassNotes, SyncDataType::notes}}};

// Whether the device keeps data of this class itself: it does unless an external source claims the only store.
bool isKeptOnDevice(const DataclassSources& kind) {
  const platform::ExternalSources external = platform::current().externalSources->enabledSources(kind.sources);
  if (external.error && !external.error->empty()) {
    writeToConsole("[%s]Error while retreiving external sources for dataclass %@ [%@]",
                   "-[AccountsDataMigrator(Internal) _migrateAccountsFrom7A153:]", kind.dataclass, *external.error);
    return false;
  }
  if (!external.sources || external.sources->empty()) return true;
  return !AccountsDataMigrator::_tetheredDisabledInSources(*external.sources) &&
         BasicAccount::multipleStoresSupportedByDataclass(kind.dataclass);
}

// --- CalDAV ---

// The calendar accounts of a store, found by all that makes one somebody's partner.
class CalDAVAccounts {
 public:
  explicit CalDAVAccounts(const AccountsManager& store) {
    for (const AccountsManager::Account& account : store.allBasicAccounts()) {
      if (hasClassAmong(*account, {kCalDAVAccountClass})) add(account);
    }
  }

  // In the order of the store.
  [[nodiscard]] Accounts partnersOf(const BasicAccount& umbrella) const {
    const auto host = AccountsDataMigrator::_expectedCalDAVHostnameForAccount(umbrella);
    if (!host) return {};
    std::set<std::size_t> places;
    for (const std::string& login : AccountsDataMigrator::_expectedCalDAVUsernamesForAccount(umbrella)) {
      for (const std::string& path : AccountsDataMigrator::_expectedCalDAVPrincipalURLsForAccount(umbrella)) {
        const auto found = _places.find({*host, login, path});
        if (found != _places.end()) places.insert(found->second.begin(), found->second.end());
      }
    }
    Accounts partners;
    for (const std::size_t place : places) {
      if (AccountsDataMigrator::_calDAVAccount_matchesUmbrellaAccount(*_accounts[place], umbrella)) {
        partners.push_back(_accounts[place]);
      }
    }
    return partners;
  }

 private:
  using Identity = std::array<std::string, 3>;  // server, login and principal path

  // One that lacks any of these is nobody's partner.
  void add(const AccountsManager::Account& account) {
    const Dictionary principal = dictionaryForKey(*account, kCalDAVPrincipalKey).value_or(Dictionary{});
    const Dictionary configuration = dictionaryForKey(*account, kCalDAVConfigurationKey).value_or(Dictionary{});
    const Text* const server = principal.text(kCalDAVServerKey);
    const Text* const login = principal.text(kCalDAVLoginKey);
    const Text* const path = configuration.text(kCalDAVPrincipalPathKey);
    if (server == nullptr || login == nullptr || path == nullptr) return;
    _places[{server->string(), login->string(), path->string()}].push_back(_accounts.size());
    _accounts.push_back(account);
  }

  Accounts _accounts;
  std::map<Identity, std::vector<std::size_t>> _places;
};

// Every partner is folded in, not just the first; one with two umbrellas is listed for each.
void foldPartnersInto(BasicAccount& umbrella, const CalDAVAccounts& candidates, Accounts& folded,
                      ChangeTracker* tracker) {
  if (!hasClassAmong(umbrella, {kGmailAccountClass, kYahooAccountClass})) return;
  const Accounts partners = candidates.partnersOf(umbrella);
  if (!partners.empty()) umbrella.setEnabled_forDataclass(true, kAccountDataclassCalendars);
  refuseAbove(kMaxFolded, folded.size() + partners.size(), "pairs of a mail account and its calendar account");
  for (const AccountsManager::Account& partner : partners) {
    folded.push_back(partner);
    if (tracker != nullptr) tracker->willBeFolded(*partner, umbrella, "the same user's calendars at the same service");
  }
}

}  // namespace

bool AccountsDataMigrator::_migrateAccountsFrom7A150(AccountsManager& store) {
  Accounts incoming = store.basicAccountsWithTypes({kNimbraAccountType, kMailAccountType});
  std::ranges::copy(store.basicAccountsWithTypes({kExchangeAccountType}), std::back_inserter(incoming));
  for (const AccountsManager::Account& account : incoming) {
    if (const auto identifier = unlessEmpty(textForKey(*account, kAccountIdentifier))) {
      account->setAccountProperty_forKey(*identifier, kAccountSyncIdentifier);
    }
    settleIdentifier(*account);
  }
  // Outgoing servers have no data to sync, and so no sync identifier to keep.
  const Accounts outgoing = store.basicAccountsWithTypes({kSMTPAccountType});
  for (const AccountsManager::Account& account : outgoing) settleIdentifier(*account);

  store.replaceAccountsWithTypes_withAccounts({kNimbraAccountType, kMailAccountType, kExchangeAccountType}, incoming);
  store.replaceAccountsWithTypes_withAccounts({kSMTPAccountType}, outgoing);
  store.setDataVersion(2);
  return true;
}

bool AccountsDataMigrator::_migrateAccountsFrom7A153(AccountsManager& store) {
  const AccountsManager::Account onDevice =
      BasicAccount::initWithProperties(DeviceLocalAccount::basicAccountProperties());
  if (onDevice != nullptr) {  // else the device knows no such accounts, and none was loaded
    BasicAccount::Dataclasses kept;
    for (const DataclassSources& kind : kDataclassesOnDevice) {
      if (isKeptOnDevice(kind)) kept.emplace_back(kind.dataclass);
    }
    onDevice->setEnabledForDataclasses(kept);
    store.replaceAccountsWithTypes_withAccounts({kOnMyDeviceAccountType}, {onDevice});
  }
  store.setDataVersion(3);
  return true;
}

bool AccountsDataMigrator::_tetheredDisabledInSources(const Array& sources) {
  return std::ranges::find(sources, PropertyValue{"DenyTethered"}) != sources.end();
}

bool AccountsDataMigrator::_migrateAccountsFrom7A241(AccountsManager& store) {
  const Accounts hosted = store.basicAccountsWithTypes({kNimbraAccountType});
  for (const AccountsManager::Account& account : hosted) {
    std::optional<BasicAccount::Dataclasses> enabled = account->enabledDataclasses();
    if (enabled) std::erase(*enabled, kAccountDataclassNotes);
    // Written back in any case: the list that goes back is the one that counts today, and an absent one stays absent.
    account->setAccountProperty_forKey(enabled ? std::optional<PropertyValue>{arrayOf(*enabled)} : std::nullopt,
                                       kAccountEnabledDataclasses);
  }
  store.replaceAccountsWithTypes_withAccounts({kNimbraAccountType}, hosted);
  store.setDataVersion(4);
  return true;
}

bool AccountsDataMigrator::_migrateAccountsFrom7A242(AccountsManager& store) {
  const CalDAVAccounts candidates{store};
  Accounts folded;
  for (const AccountsManager::Account& account : store.allBasicAccounts()) {
    const bool isMail = hasClassAmong(
        *account, {kIMAPAccountClass, kGmailAccountClass, kYahooAccountClass, kAOLAccountClass, kNimbraAccountClass});
    if (isMail && isActiveUnlessSaidOtherwise(*account)) {
      account->setEnabled_forDataclass(true, kAccountDataclassMail);
      account->setEnabled_forDataclass(true, kAccountDataclassNotes);
    }
    if (hasClassAmong(*account, {kGmailAccountClass})) {
      account->_forcedSetAccountProperty_forKey(kGmailAccountType, kAccountType);
    }
    if (hasClassAmong(*account, {kYahooAccountClass})) {
      account->_forcedSetAccountProperty_forKey(kYahooAccountType, kAccountType);
    }
    foldPartnersInto(*account, candidates, folded, store.changeTracker());
  }
  store.deleteAccounts(folded);
  store.setDataVersion(5);
  return true;
}

}  // namespace migrator
