#include "accounts/edit.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <unordered_set>
#include <utility>

#include "client/changes.h"
#include "client/changing_thread.h"
#include "client/target.h"

namespace accounts {
namespace {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using accountsettings::kAccountChildAccounts;
using accountsettings::kAccountIdentifier;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;
using Record = std::shared_ptr<BasicAccount>;

Outcome done() { return std::monostate{}; }
Outcome failed(Code code, std::string sentence) { return Error{code, std::move(sentence)}; }

Error unknownAccount(std::string_view identifier) {
  return {Code::unknownAccount, "no account has the identifier " + std::string{identifier}};
}

Error finished() { return {Code::finished, "the edit is over"}; }

std::string nameOf(const Dictionary& account) {
  const Text* const identifier = account.text(kAccountIdentifier);
  return "the account " + (identifier == nullptr ? std::string{"without identifier"} : identifier->string());
}

Records recordsOf(const AccountsManager& store) {
  Records records;
  records.reserve(store.count());
  for (const Record& record : store.allBasicAccounts()) records.push_back(record->properties());
  return records;
}

using Identifiers = std::unordered_set<std::string>;

// Takes out every top-level account that has one of the identifiers, all in one walk of the store's order.
void deleteEvery(AccountsManager& store, const Identifiers& identifiers) {
  if (identifiers.empty()) return;
  AccountsManager::Accounts going;
  std::ranges::copy_if(store.allBasicAccounts(), std::back_inserter(going), [&](const Record& record) {
    const std::optional<Text> identifier = record->identifier();
    return identifier && identifiers.contains(identifier->string());
  });
  store.deleteAccounts(going);
}

// --- Bringing a change into another store ---

// Accounts that go are only named, to be taken out together.
Outcome bringInto(AccountsManager& store, const Pair& pair, Identifiers& going) {
  const Dictionary& named = pair.after == nullptr ? *pair.before : *pair.after;
  const Target target = targetIn(store, *named.text(kAccountIdentifier));
  const bool isThere = target.record != nullptr;
  if (pair.after == nullptr) {
    if (isThere && !target.child) going.insert(named.text(kAccountIdentifier)->string());
    return done();
  }
  if (pair.before == nullptr) {
    if (isThere) return failed(Code::conflict, nameOf(named) + " was added by another program meanwhile");
    if (const Record added = BasicAccount::initWithProperties(named)) store.insertAccount(added);
    return done();
  }
  if (!isThere || target.child) {
    return failed(Code::conflict, nameOf(named) + " was removed by another program meanwhile");
  }
  Dictionary& present = target.record->properties();
  for (const std::string& key : differingKeys(pair)) {
    const PropertyValue* const value = pair.after->find(key);
    value == nullptr ? static_cast<void>(present.remove(key)) : present.set(key, *value);
  }
  store._loadChildrenFromAccount(target.record);
  return done();
}

// --- What a save must not bring into the file ---

bool couldBeLoaded(const AccountsManager& store, const Dictionary& properties) {
  const Record record = BasicAccount::initWithProperties(properties);
  if (record == nullptr) return false;
  return std::ranges::all_of(store._createRuntimeFixers(), [&](const auto& fixer) {
    return fixer->fixBasicAccountIfNeeded_loggingMessage(*record, "saving accounts") !=
           accountsettings::FixAnswer::drop;
  });
}

Outcome examine(const AccountsManager& store, const Pair& pair) {
  if (pair.after == nullptr) return done();
  const auto dropped = [](const Dictionary& account) {
    return failed(
        Code::wouldBeDropped,
        nameOf(account) + " could not be loaded again: its type is unknown, or its class is missing or wrong");
  };
  if (!couldBeLoaded(store, *pair.after)) return dropped(*pair.after);
  const Records before = childrenOf(pair.before);
  const Records after = childrenOf(pair.after);
  for (const Pair& child : differingPairs(before, after)) {
    if (child.after != nullptr && BasicAccount::initWithProperties(*child.after) == nullptr) {
      return dropped(*child.after);
    }
  }
  return done();
}

Error failureOf(const platform::Path& file, const platform::Status& status) {
  const int cause = status.errorNumber();
  const std::string sentence = "the accounts could not be saved to " + file.string() + ": " + status.description();
  if (cause == ENOSPC || cause == EDQUOT) return {Code::noSpace, sentence};
  const bool isForbidden = cause == EACCES || cause == EPERM || cause == EROFS;
  return {isForbidden ? Code::noPermission : Code::notSaved, sentence};
}

// Saves without telling any notifier, since modules are not to run while the lock is held.
void saveSilently(AccountsManager& store) {
  struct Silence {
    bool before = AccountsManager::shouldSkipNotifications();
    Silence() { AccountsManager::_setShouldSkipNotifications(true); }
    ~Silence() { AccountsManager::_setShouldSkipNotifications(before); }
  } const silence;
  store.saveAllAccounts();
}

}  // namespace

struct Edit::Content {
  std::shared_ptr<const Device> device;
  Manner manner;
  std::unique_ptr<ChangingThread> thread = nullptr;
  std::optional<HeldLocks> locks = std::nullopt;
  bool isOver = false;
  bool rewrites = false;
  std::optional<Error> failure = std::nullopt;
  FileIdentity file = {};
  Store store = nullptr;
  Records before = {};
  Identifiers going = {};  // of accounts that are removed, but still in the store

  Outcome begin() {
    if (manner == Manner::trial) return read();
    thread = std::make_unique<ChangingThread>(device->settingsFile());
    if (!thread->isFirst()) return failed(Code::nested, "this thread is changing the accounts already");
    Result<HeldLocks> taken = device->takeLocks();
    if (!taken) return taken.error();
    locks = std::move(taken).value();
    return read();
  }

  // The store is read after its file was looked at: what is written in between is noticed, at worst needlessly.
  Outcome read() {
    file = FileIdentity::of(device->settingsFile());
    Result<Store> loaded = device->load(Device::Use::change);
    if (!loaded.isOk()) return loaded.error();
    store = std::move(loaded).value();
    if (!store->loadOutcome().leftOut.empty() && !device->options().mayDropUnreadable) {
      const std::size_t count = store->loadOutcome().leftOut.size();
      const std::string what = std::to_string(count) + (count == 1 ? " record" : " records");
      return failed(Code::wouldDropOthers, what + " of the accounts file cannot be loaded, and a save would remove " +
                                               (count == 1 ? "it" : "them"));
    }
    before = recordsOf(*store);
    return done();
  }

  Outcome readAgain() {
    const Records past = std::move(before);
    const Records now = recordsOf(*store);
    if (Outcome again = read(); !again.isOk()) return again;
    for (const Pair& pair : differingPairs(past, now)) {
      if (Outcome brought = bringInto(*store, pair, going); !brought.isOk()) return brought;
    }
    removeWhatGoes();
    return done();
  }

  void removeWhatGoes() { deleteEvery(*store, std::exchange(going, {})); }

  // As if what goes were gone.
  Target find(std::string_view identifier) {
    const Target target = targetIn(*store, identifier);
    const std::optional<Text> owner = target.record == nullptr ? std::nullopt : target.record->identifier();
    if (!owner || !going.contains(owner->string())) return target;
    removeWhatGoes();  // another account may have had the identifier
    return targetIn(*store, identifier);
  }

  // Null where there is no such account, or it could not be loaded as it was changed.
  Record copyOf(std::string_view identifier) {
    const Target target = find(identifier);
    return target.record == nullptr ? nullptr : recordOf(target);
  }

  Result<Saved> write() {
    const Within within{*device};
    removeWhatGoes();
    if (FileIdentity::of(device->settingsFile()) != file) {
      if (const Outcome again = readAgain(); !again.isOk()) return again.error();
    }
    const Records after = recordsOf(*store);
    const std::vector<Pair> pairs = differingPairs(before, after);
    for (const Pair& pair : pairs) {
      if (const Outcome sound = examine(*store, pair); !sound.isOk()) return sound.error();
    }
    if (pairs.empty() && !rewrites) return Saved{};
    Saved saved{changesBetween(before, after, device), std::nullopt};
    if (manner == Manner::trial) return saved;
    if (const auto prepared = device->prepareSaving(); !prepared.isOk()) {
      return failureOf(device->settingsFile(), prepared);
    }
    saveSilently(*store);
    const auto& outcome = store->lastSaveOutcome();
    return outcome.isSaved() ? Result<Saved>{std::move(saved)} : failureOf(device->settingsFile(), outcome.status);
  }

  [[nodiscard]] std::optional<Error> announce() const {
    if (!device->opensModules() || manner == Manner::trial) return std::nullopt;
    const Outcome told = answerOf([this]() -> Outcome {
      const Within within{*device};
      if (!AccountsManager::shouldSkipNotifications()) store->_sendNotificationsForChangedAccounts();
      return done();
    });
    if (told.isOk()) return std::nullopt;
    return Error{Code::notAnnounced, "the accounts were saved, but not announced: " + told.error().sentence};
  }

  void letGo() {
    isOver = true;
    locks.reset();
    thread.reset();
  }

  // What the step answers; the first that fails is kept.
  template <typename Step>
  auto run(const Step& step) -> decltype(step()) {
    if (isOver) return finished();
    auto answer = answerOf([&] {
      const Within within{*device};
      return step();
    });
    if (!answer.isOk() && !failure) failure = answer.error();
    return answer;
  }

  // Changes the properties of one account by the function, which answers them.
  template <typename Function>
  Outcome alter(std::string_view identifier, const Function& altered) {
    return run([&]() -> Outcome {
      const Target target = find(identifier);
      if (target.record == nullptr) return unknownAccount(identifier);
      Result<Dictionary> properties = altered(target);
      if (!properties.isOk()) return properties.error();
      put(*store, target, std::move(properties).value());
      return done();
    });
  }

  // Changes what the key says of an account by the function, which is given all its properties.
  template <typename Function>
  Outcome alterAt(std::string_view key, std::string_view identifier, const Function& altered) {
    return alter(identifier, [&](const Target& target) -> Result<Dictionary> {
      if (key == kAccountIdentifier || key == kAccountChildAccounts) {
        return Error{Code::unsuitable, std::string{key} + " cannot be changed"};
      }
      Dictionary properties = propertiesOf(target);
      altered(properties);
      return properties;
    });
  }

  Result<Account> addTo(const std::string& parent, const Record& record) {
    if (parent.empty()) {
      // A new one: nothing of what the file holds under its identifier is its own.
      record->setOriginalProperties({});
      store->insertAccount(record);
      return accountOf(device, BasicAccount::initWithProperties(record->properties()));
    }
    const Target target = find(parent);
    if (target.record == nullptr) return unknownAccount(parent);
    if (target.child) return Error{Code::unsuitable, "a child account cannot have children"};
    store->addChild_toAccount(record, target.record);
    return accountOf(device, copyOf(*record->identifier()));
  }
};

Edit::Edit(std::unique_ptr<Content> content) : _content{std::move(content)} {}
Edit::Edit(Edit&&) noexcept = default;
Edit& Edit::operator=(Edit&&) noexcept = default;
Edit::~Edit() = default;

Result<Edit> beginEdit(std::shared_ptr<const Device> device, Manner manner) {
  auto content = std::make_unique<Edit::Content>(Edit::Content{std::move(device), manner});
  if (const Outcome begun = content->begin(); !begun) return begun.error();
  return Edit{std::move(content)};
}

std::vector<Account> Edit::accounts() const {
  std::vector<Account> accounts;
  if (_content == nullptr) return accounts;
  const Within within{*_content->device};
  _content->removeWhatGoes();
  for (const Dictionary& properties : recordsOf(*_content->store)) {
    if (Record record = BasicAccount::initWithProperties(properties)) {
      accounts.push_back(accountOf(_content->device, std::move(record)));
    }
  }
  return accounts;
}

std::optional<Account> Edit::account(std::string_view identifier) const {
  if (_content == nullptr) return std::nullopt;
  const Within within{*_content->device};
  Record record = _content->copyOf(identifier);
  return record == nullptr ? std::nullopt : std::optional{accountOf(_content->device, std::move(record))};
}

Result<Account> Edit::add(const NewAccount& account) {
  if (_content == nullptr) return finished();
  return _content->run([&]() -> Result<Account> {
    Dictionary properties;
    if (!account.type.empty()) properties.set(accountsettings::kAccountType, account.type);
    if (!account.accountClass.empty()) properties.set(accountsettings::kAccountClass, account.accountClass);
    for (const auto& [key, value] : account.properties) properties.set(key, value.content().value);
    const Record record = BasicAccount::initWithProperties(properties);
    if (record == nullptr || !record->identifier()) {
      return Error{Code::wouldBeDropped, "no account can be of the type \"" + account.type + "\" and the class \"" +
                                             account.accountClass + "\""};
    }
    const Text identifier = *record->identifier();
    if (_content->find(identifier).record != nullptr) {
      return Error{Code::alreadyThere, "there is an account with the identifier " + identifier.string()};
    }
    return _content->addTo(account.parentIdentifier, record);
  });
}

Outcome Edit::remove(std::string_view identifier) {
  if (_content == nullptr) return finished();
  return _content->run([&]() -> Outcome {
    const Target target = _content->find(identifier);
    if (target.record == nullptr) return unknownAccount(identifier);
    if (target.child) {
      _content->store->removeChildWithIdentifier_fromAccount(identifier, target.record);
    } else {
      _content->going.emplace(identifier);
    }
    return done();
  });
}

Outcome Edit::set(std::string_view identifier, std::string_view key, const Value& value) {
  if (_content == nullptr) return finished();
  return _content->alterAt(key, identifier,
                           [&](Dictionary& properties) { properties.set(key, value.content().value); });
}

Outcome Edit::erase(std::string_view identifier, std::string_view key) {
  if (_content == nullptr) return finished();
  return _content->alterAt(key, identifier, [&](Dictionary& properties) { properties.remove(key); });
}

Outcome Edit::setEnabled(std::string_view identifier, std::string_view dataclass, bool enabled) {
  if (_content == nullptr) return finished();
  return _content->alter(identifier, [&](const Target& target) -> Result<Dictionary> {
    const Record record = recordOf(target);
    const auto& supported = record == nullptr ? BasicAccount::Dataclasses{} : record->supportedDataclasses();
    if (std::ranges::find(supported, Text{dataclass}) == supported.end()) {
      return Error{Code::unsuitable, nameOf(propertiesOf(target)) + " cannot have " + std::string{dataclass}};
    }
    record->setEnabled_forDataclass(enabled, dataclass);
    return record->properties();
  });
}

std::optional<Error> Edit::failure() const { return _content == nullptr ? std::nullopt : _content->failure; }

void Edit::rewrite() {
  if (_content != nullptr) _content->rewrites = true;
}

Result<Saved> Edit::save() {
  if (_content == nullptr || _content->isOver) return finished();
  Result<Saved> saved = answerOf([this] { return _content->write(); });
  _content->letGo();
  const bool isWritten = saved && (_content->rewrites || !saved->changes.empty());
  if (isWritten) saved.value().notAnnounced = _content->announce();
  return saved;
}

}  // namespace accounts
