#include <gtest/gtest.h>
#include <rapidcheck.h>

#include <cstdlib>
#include <map>

#include "accountsettings/assertion_failure.h"
#include "tests/support/account_store.h"
#include "tests/support/store_model.h"

namespace tests {
namespace {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;

// Few names, so that duplicates, shared children and children named like accounts are the rule.
const std::vector<std::string> kIdentifiers{"a", "b", "c", "d", "x", "y", "z"};
constexpr int kChildIdentifiersBegin = 3;  // "d" is an account and a child
const std::vector<std::string> kTypes{"CalDAV", "CardDAV", "Exchange"};
const std::vector<std::string> kSyncIdentifiers{"s", "t"};

// One step, in numbers that make sense in any state; what they choose is taken modulo what there is.
struct Step {
  int operation;
  std::vector<int> choices;
};

std::ostream& operator<<(std::ostream& stream, const Step& step) {
  stream << "step " << step.operation << " (";
  for (const int choice : step.choices) stream << ' ' << choice;
  return stream << " )";
}

class Choices {
 public:
  explicit Choices(const Step& step) : _step{step} {}
  int below(std::size_t limit) {
    const int choice = _next < _step.choices.size() ? _step.choices[_next++] : 0;
    return choice % static_cast<int>(limit);
  }
  bool yes() { return below(2) == 1; }
  template <typename Value>
  const Value& of(const std::vector<Value>& values) {
    return values[static_cast<std::size_t>(below(values.size()))];
  }

 private:
  const Step& _step;
  std::size_t _next = 0;
};

Dictionary childProperties(Choices& choices) {
  const int identifier = kChildIdentifiersBegin + choices.below(kIdentifiers.size() - kChildIdentifiersBegin);
  Dictionary dictionary{{"Identifier", kIdentifiers[static_cast<std::size_t>(identifier)]},
                        {"Type", choices.of(kTypes)}};
  if (choices.below(8) != 7) dictionary.set("Class", "TestAccount");  // else it makes no account
  if (choices.yes()) dictionary.set("Sync Identifier", choices.of(kSyncIdentifiers));
  return dictionary;
}

Array children(Choices& choices) {
  Array array;
  for (int count = choices.below(4); count > 0; --count) array.emplace_back(childProperties(choices));
  return array;
}

Dictionary accountProperties(Choices& choices) {
  Dictionary dictionary{{"Identifier", choices.of(std::vector<std::string>{"a", "b", "c", "d"})},
                        {"Type", choices.of(kTypes)},
                        {"Class", "TestAccount"}};
  if (choices.yes()) dictionary.set("Sync Identifier", choices.of(kSyncIdentifiers));
  if (choices.yes()) dictionary.set("ChildAccounts", children(choices));
  return dictionary;
}

// The store and its model side by side: every record of the model is the counterpart of one of the store.
class Twins {
 public:
  struct Twin {
    Account real;
    model::RecordPtr modelled;
  };

  explicit Twins(const Array& loaded) : _real{AccountsManager::initWithAccounsInfoArray(loaded)} {
    for (std::size_t index = 0; index < loaded.size(); ++index) {
      const model::RecordPtr record = model::recordFrom(*loaded[index].asDictionary());
      _model.registerAccount(record);
      _counterparts[record] = _real->allBasicAccounts()[index];
    }
    compare();
  }

  void run(const Step& step) {
    Choices choices{step};
    using Operation = void (Twins::*)(Choices&);
    static constexpr Operation kOperations[]{
        &Twins::insert,   &Twins::update,      &Twins::remove, &Twins::replace, &Twins::replaceWithTypes,
        &Twins::addChild, &Twins::removeChild, &Twins::edit,   &Twins::reindex, &Twins::removeWithIdentifier};
    (this->*kOperations[step.operation])(choices);
    compare();
  }
  static constexpr int kOperationCount = 10;

 private:
  Twin make(const Dictionary& properties) {
    const Twin twin{BasicAccount::initWithProperties(properties), model::recordFrom(properties)};
    _counterparts[twin.modelled] = twin.real;
    return twin;
  }
  Twin present(Choices& choices) {
    const model::RecordPtr record = choices.of(_model.ordered);
    return {_counterparts.at(record), record};
  }
  Twin someAccount(Choices& choices) {
    return choices.yes() && !_model.ordered.empty() ? present(choices) : make(accountProperties(choices));
  }
  // A new child of some account, or one that the index holds.
  Twin someChild(Choices& choices) {
    if (choices.yes() && !_model.childrenByID.pairs.empty()) {
      const model::RecordPtr record = choices.of(_model.childrenByID.pairs).second;
      return {_counterparts.at(record), record};
    }
    Dictionary properties = childProperties(choices);
    properties.set("Class", "TestAccount");
    const Twin child = make(properties);
    const Twin parent = someAccount(choices);
    child.real->setParentAccount(parent.real);
    child.modelled->parent = parent.modelled;
    return child;
  }

  void insert(Choices& choices) {
    const Twin account = someAccount(choices);
    _real->insertAccount(account.real);
    _model.insert(account.modelled);
  }
  void update(Choices& choices) {
    const Twin account = someAccount(choices);
    _real->updateAccount(account.real);
    _model.update(account.modelled);
  }
  void remove(Choices& choices) {
    const Twin account = someAccount(choices);
    _real->deleteAccount(account.real);
    _model.remove(account.modelled);
  }
  void removeWithIdentifier(Choices& choices) {
    const std::string& identifier = choices.of(kIdentifiers);
    if (const auto account = _model.topLevelByID.at(identifier)) {
      _real->deleteAccountWithIdentifier(identifier);
      _model.remove(*account);
    } else {
      RC_ASSERT_THROWS_AS(_real->deleteAccountWithIdentifier(identifier), accountsettings::AssertionFailure);
    }
  }
  void replace(Choices& choices) {
    if (_model.ordered.empty()) return;
    const Twin old = present(choices);
    const Twin replacing = someAccount(choices);
    _real->replaceAccount_withAccount(old.real, replacing.real);
    _model.replace(old.modelled, replacing.modelled);
  }
  void replaceWithTypes(Choices& choices) {
    std::vector<std::string> types;
    std::ranges::copy_if(kTypes, std::back_inserter(types), [&](const std::string&) { return choices.yes(); });
    Accounts real;
    model::Records modelled;
    for (int count = choices.below(5); count > 0; --count) {
      const Twin given = choices.below(3) == 2 ? someChild(choices) : someAccount(choices);
      real.push_back(given.real);
      modelled.push_back(given.modelled);
    }
    _real->replaceAccountsWithTypes_withAccounts({types.begin(), types.end()}, real);
    _model.replaceWithTypes(types, modelled);
  }
  void addChild(Choices& choices) {
    if (_model.ordered.empty()) return;
    const Twin parent = present(choices);
    const Twin child = someChild(choices);
    _real->addChild_toAccount(child.real, parent.real);
    _model.addChild(child.modelled, parent.modelled);
  }
  void removeChild(Choices& choices) {
    if (_model.ordered.empty()) return;
    const Twin parent = present(choices);
    const std::string& identifier = choices.of(kIdentifiers);
    _real->removeChildWithIdentifier_fromAccount(identifier, parent.real);
    _model.removeChild(identifier, parent.modelled);
  }
  // What callers do to records behind the store's back.
  void edit(Choices& choices) {
    if (_model.ordered.empty()) return;
    const Twin account = present(choices);
    const auto set = [&account](const char* key, const PropertyValue& value) {
      account.real->_forcedSetAccountProperty_forKey(value, key);
      account.modelled->properties.set(key, value);
    };
    switch (choices.below(4)) {
      case 0: return set("Identifier", choices.of(kIdentifiers));
      case 1: return set("Type", choices.of(kTypes));
      case 2: return set("Sync Identifier", choices.of(kSyncIdentifiers));
      default: return set("ChildAccounts", children(choices));
    }
  }
  void reindex(Choices& choices) {
    if (_model.ordered.empty()) return;
    const Twin account = present(choices);
    if (choices.yes()) {
      _real->_loadChildrenFromAccount(account.real);
      _model.loadChildren(account.modelled);
    } else {
      const std::string& identifier = choices.of(kIdentifiers);
      _real->_removeChildrenForAccountWithIdentifier(identifier);
      _model.removeChildren(identifier);
    }
  }

  void compare() {
    RC_ASSERT(_real->count() == _model.ordered.size());
    RC_ASSERT(_real->allBasicAccounts() == counterparts(_model.ordered));
    compareChildIndex();
    for (const std::string& identifier : kIdentifiers) {
      RC_ASSERT(_real->accountWithIdentifier(identifier) == counterpart(_model.accountWithIdentifier(identifier)));
    }
    for (const std::string& identifier : kSyncIdentifiers) compareSync(identifier);
    for (std::size_t index = 0; index < kTypes.size(); ++index) {
      const std::vector<std::string> types{kTypes.begin(), kTypes.begin() + static_cast<std::ptrdiff_t>(index)};
      const Accounts expected = counterparts(_model.basicAccountsWithTypes(types));
      RC_ASSERT(_real->basicAccountsWithTypes({types.begin(), types.end()}) == expected);
      RC_ASSERT(_real->countOfBasicAccountsWithTypes({types.begin(), types.end()}) == expected.size());
    }
  }
  // Both index the same children in the same order. Children that are new since the last step are introduced to each
  // other here; for all others the counterpart must be the very same object.
  void compareChildIndex() {
    const Accounts real = _real->allBasicSyncableAccounts();
    const model::Records modelled = _model.allBasicSyncableAccounts();
    RC_ASSERT(real.size() == modelled.size());
    for (std::size_t index = 0; index < real.size(); ++index) {
      const auto [place, isNew] = _counterparts.try_emplace(modelled[index], real[index]);
      RC_ASSERT(place->second == real[index]);
      RC_ASSERT(real[index]->properties() == modelled[index]->properties);
      RC_ASSERT(real[index]->parentAccount() == counterpart(modelled[index]->parent));
    }
  }
  void compareSync(const std::string& identifier) {
    const model::RecordPtr expected = _model.syncableAccountWithSyncIdentifier(identifier);
    RC_ASSERT(_real->syncableAccountWithSyncIdentifier(identifier) == counterpart(expected));
    const model::RecordPtr shown = expected == nullptr ? nullptr : _model.accountWithIdentifier(expected->identifier());
    RC_ASSERT(_real->displayAccountWithSyncIdentifier(identifier) == counterpart(shown));
  }
  [[nodiscard]] Account counterpart(const model::RecordPtr& record) const {
    return record == nullptr ? nullptr : _counterparts.at(record);
  }
  [[nodiscard]] Accounts counterparts(const model::Records& records) const {
    Accounts accounts;
    for (const model::RecordPtr& record : records) accounts.push_back(counterpart(record));
    return accounts;
  }

  std::shared_ptr<AccountsManager> _real;
  model::Store _model;
  std::map<model::RecordPtr, Account> _counterparts;
};

rc::Gen<Step> steps(int operationCount) {
  return rc::gen::build<Step>(
      rc::gen::set(&Step::operation, rc::gen::inRange(0, operationCount)),
      rc::gen::set(&Step::choices, rc::gen::container<std::vector<int>>(24, rc::gen::inRange(0, 840))));
}

class AccountStoreBesideItsModel : public AccountStore {
 protected:
  AccountStoreBesideItsModel() {
    device.systemLog->readers = false;
    setenv("RC_PARAMS", "max_success=3000 max_size=40", 0);
  }
};

TEST_F(AccountStoreBesideItsModel, IsInTheSameStateAfterEveryStepOfAnySequence) {
  const bool holds = rc::check([] {
    const auto loaded = *rc::gen::container<std::vector<Step>>(*rc::gen::inRange<std::size_t>(0, 4), steps(1));
    const auto sequence = *rc::gen::container<std::vector<Step>>(steps(Twins::kOperationCount));
    Array accounts;
    for (const Step& step : loaded) {
      Choices choices{step};
      accounts.emplace_back(accountProperties(choices));
    }
    Twins twins{accounts};
    for (const Step& step : sequence) twins.run(step);
  });
  EXPECT_TRUE(holds);
}

}  // namespace
}  // namespace tests
