#include "bench/pieces.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <memory>
#include <string>

#include "accountsettings/accounts_manager.h"
#include "accountsettings/log_handle.h"
#include "accountsettings/record_changes.h"
#include "bench/memory_device.h"
#include "bench/unchanging_files.h"
#include "migrator/accounts_data_migrator.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "records/description.h"
#include "records/fact_observer.h"

namespace bench {
namespace {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using migrator::AccountsDataMigrator;
using platform::Array;
using platform::Bytes;
using platform::Dictionary;
using platform::PropertyValue;

using Action = std::function<void()>;
using Store = std::shared_ptr<AccountsManager>;

// Keeps the compiler from leaving out what nobody looks at.
template <typename Value>
void use(const Value& value) {
  asm volatile("" : : "g"(&value) : "memory");
}

const PropertyValue kOtherName{"another name"};

// --- Values ---

Action copyAndEdit(const Population& population) {
  return [accounts = accountsOf(population)] {
    Array copies = accounts;
    for (PropertyValue& each : copies) {
      Dictionary copy = *each.asDictionary();
      copy.set("DisplayName", kOtherName);
      each = std::move(copy);
    }
    use(copies);
  };
}

Action compareEqual(const Population& population) {
  return [left = accountsOf(population), right = accountsOf(population)] { use(left == right); };
}

Action compareIdentical(const Population& population) {
  const Dictionary settings = settingsOf(population);
  return [left = settings, right = settings] { use(left == right); };
}

Action describe(const Population& population) {
  return [accounts = accountsOf(population)] {
    for (const PropertyValue& each : accounts) use(records::description(each));
  };
}

// --- Property lists ---

class OneFile final : public UnchangingFiles {
 public:
  explicit OneFile(Bytes bytes) : _bytes{std::move(bytes)} {}
  platform::Result<platform::FileKind> kindOf(const Path& /*path*/) override { return nothing(); }
  platform::Result<Bytes> read(const Path& /*path*/, std::size_t /*limit*/) override { return _bytes; }
  platform::Result<Path> temporaryName() override { return nothing(); }

 private:
  static platform::Status nothing() { return platform::Status::failure(ENOENT, "find anything"); }

  Bytes _bytes;
};

std::shared_ptr<platform::PropertyListStore> listStore(Bytes file) {
  return platform::makeLibplistPropertyListStore(std::make_shared<OneFile>(std::move(file)));
}

Action parse(const Population& population) {
  Bytes file = *listStore({})->serialize(settingsOf(population)).data;
  return [store = listStore(std::move(file))] { use(store->readDictionary("/file")); };
}

Action serialize(const Population& population) {
  return [store = listStore({}), settings = settingsOf(population)] { use(store->serialize(settings)); };
}

// --- The store ---

Store loaded(const Population& population) {
  static const bool isSet = [] {
    platform::setCurrent(makeMemoryDevice());
    AccountsManager::_setShouldSkipNotifications(true);  // as in a run
    return true;
  }();
  use(isSet);
  use(platform::current().propertyLists->serialize(settingsOf(population)));
  return AccountsManager::init();
}

// The action on a store that was loaded from the device's file.
Piece ofStore(const char* name, void (*act)(AccountsManager&)) {
  return {name,
          [act](const Population& population) -> Action { return [store = loaded(population), act] { act(*store); }; }};
}

std::shared_ptr<BasicAccount> stranger() {
  return BasicAccount::accountWithType_class(accountsettings::kCalDAVAccountType, "MobileCalDAVAccount");
}

void load(AccountsManager& /*store*/) { use(AccountsManager::init()); }

void save(AccountsManager& store) { store.saveAllAccounts(); }

void saveChanged(AccountsManager& store) {
  for (const auto& account : store.allBasicAccounts()) account->setDisplayName("another name");
  store.saveAllAccounts();
}

void merge(AccountsManager& store) {
  for (const auto& account : store.allBasicAccounts()) {
    Dictionary changed = account->properties();
    changed.set("DisplayName", kOtherName);
    use(AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(
        changed, account->originalProperties(), &account->properties()));
  }
}

void lookUp(AccountsManager& store) {
  for (const auto& account : store.allBasicSyncableAccounts()) use(store.accountWithIdentifier(*account->identifier()));
}

void insert(AccountsManager& store) {
  for (std::size_t count = store.count(); count > 0; --count) store.insertAccount(stranger());
}

// These walk the order by their definition, so their number stays the same: of ten accounts those without children.
constexpr std::size_t kFew = 9;

void update(AccountsManager& store) {
  for (std::size_t number = 0; number < std::min(kFew, store.count()); ++number) {
    const AccountsManager::Account account = store.allBasicAccounts()[number];
    account->_forcedSetEnabled_forDataclass(true, accountsettings::kAccountDataclassNotes);
    store.updateAccount(account);
  }
}

void remove(AccountsManager& store) {
  for (std::size_t number = 0; number < kFew && store.count() > 0; ++number) {
    store.deleteAccount(AccountsManager::Account{store.allBasicAccounts()[store.count() / 2]});
  }
}

void removeAll(AccountsManager& store) { store.deleteAccounts(store.allBasicAccounts()); }

void addChildren(AccountsManager& store) {
  for (const auto& account : store.allBasicAccounts()) store.addChild_toAccount(stranger(), account);
}

void replaceAll(AccountsManager& store) {
  const AccountsManager::Accounts accounts = store.allBasicAccounts();
  store.replaceAccountsWithTypes_withAccounts({accountsettings::kMailAccountType}, accounts);
}

// However many children have the identifier.
Action removeAlike(const Population& population) {
  const Store store = loaded(population);
  for (const auto& account : store->allBasicAccounts()) {
    const auto property = account->accountPropertyForKey(accountsettings::kAccountChildAccounts);
    if (!property) continue;
    Array children = *property->asArray();
    for (PropertyValue& each : children) {
      Dictionary child = *each.asDictionary();
      child.set(accountsettings::kAccountIdentifier, "alike");
      each = std::move(child);
    }
    account->setAccountProperty_forKey(std::move(children), accountsettings::kAccountChildAccounts);
  }
  return [store] {
    for (const auto& account : store->allBasicAccounts())
      store->removeChildWithIdentifier_fromAccount("alike", account);
  };
}

void logUnread(AccountsManager& store) {
  for (const auto& account : store.allBasicAccounts()) {
    accountsettings::_ASLogSystem().log("-[Bench logUnread]", "An account: %@ %@", account->properties(),
                                        account->originalProperties());
  }
}

// --- What a run's observer is told ---

class SilentObserver final : public records::FactObserver {
 public:
  void stageBegan(std::string_view /*stage*/, std::string_view /*words*/) override {}
  void stageEnded(std::string_view /*stage*/) override {}
  void told(const records::Fact& fact) override { use(fact); }
  void lostTrack() noexcept override { std::abort(); }
};

void setObserver(std::shared_ptr<platform::RunObserver> observer) {
  platform::Platform services = platform::current();
  services.observer = std::move(observer);
  platform::setCurrent(std::move(services));
}

// Two saves of changed accounts, of which the second tells of other accounts than the first.
Action explain(const Population& population) {
  use(loaded(population));
  setObserver(std::make_shared<SilentObserver>());
  Store store = AccountsManager::init();
  setObserver(nullptr);
  return [store = std::move(store)] {
    saveChanged(*store);
    store->deleteAccount(AccountsManager::Account{store->allBasicAccounts().front()});
    store->saveAllAccounts();
  };
}

// One account, of which every key is given another name.
Action renameKeys(const Population& population) {
  const auto stateWith = [](const std::string& prefix, std::size_t first, std::size_t step, std::size_t count) {
    Dictionary properties{{accountsettings::kAccountIdentifier, "one"}};
    for (std::size_t key = first; count > 0; key += step, --count) {
      properties.set(prefix + std::to_string(key), "the text of " + std::to_string(key));
    }
    return accountsettings::StoreState{{nullptr, std::move(properties)}};
  };
  const std::size_t keys = population.accounts;
  return [before = stateWith("old ", 0, 1, keys), after = stateWith("new ", keys - 1, std::size_t(-1), keys)] {
    use(accountsettings::differencesBetween(before, after));
  };
}

// --- Version steps ---

Piece ofStep(const char* name, bool (AccountsDataMigrator::*step)(AccountsManager&)) {
  return {name, [step](Population population) -> Action {
            population.version = 0;
            return [store = loaded(population), step] {
              AccountsDataMigrator migrator;
              use((migrator.*step)(*store));
            };
          }};
}

}  // namespace

const std::vector<Piece>& pieces() {
  static const std::vector<Piece> all{
      {"copy", &copyAndEdit},
      {"equality", &compareEqual},
      {"identity", &compareIdentical},
      {"description", &describe},
      {"parse", &parse},
      {"serialize", &serialize},
      ofStore("load", &load),
      ofStore("save", &save),
      ofStore("save changed", &saveChanged),
      ofStore("merge", &merge),
      ofStore("look-up", &lookUp),
      ofStore("insert", &insert),
      ofStore("update", &update),
      ofStore("remove", &remove),
      ofStore("remove all", &removeAll),
      ofStore("add children", &addChildren),
      ofStore("replace all", &replaceAll),
      {"remove alike", &removeAlike},
      {"explain", &explain},
      {"rename keys", &renameKeys},
      ofStore("log unread", &logUnread),
      ofStep("7A149", &AccountsDataMigrator::_migrateAccountsFrom7A149),
      ofStep("7A150", &AccountsDataMigrator::_migrateAccountsFrom7A150),
      ofStep("7A153", &AccountsDataMigrator::_migrateAccountsFrom7A153),
      ofStep("7A241", &AccountsDataMigrator::_migrateAccountsFrom7A241),
      ofStep("7A242", &AccountsDataMigrator::_migrateAccountsFrom7A242),
      ofStep("8A293", &AccountsDataMigrator::_migrateAccountsFrom8A293),
      ofStep("8B117", &AccountsDataMigrator::_migrateAccountsFrom8B117),
      ofStep("8C136", &AccountsDataMigrator::_migrateAccountsFrom8C136),
      ofStep("8F191", &AccountsDataMigrator::_migrateAccountsFrom8F191),
      ofStep("9A182", &AccountsDataMigrator::_migrateAccountsFrom9A182),
      ofStep("9A334", &AccountsDataMigrator::_migrateAccountsFrom9A334),
      ofStep("9B176", &AccountsDataMigrator::_migrateAccountsFrom9B176),
  };
  return all;
}

}  // namespace bench
