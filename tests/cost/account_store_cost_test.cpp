#include <gtest/gtest.h>

#include <ctime>

#include "tests/support/account_store.h"

namespace tests {
namespace {

constexpr std::size_t kFew = 1000;
constexpr std::size_t kTimesMore = 8;
// Eight times the accounts cost about eight times as much, and sixty-four times where every one of them walks all.
constexpr double kMostTimesDearer = 20;

// What an operation on whole stores costs by the number of their accounts, in time of the processor.
class CostOfAccounts : public AccountStore {
 protected:
  CostOfAccounts() { device.systemLog->readers = false; }

  static std::string name(const char* prefix, std::size_t number) { return prefix + std::to_string(number); }
  // Each has a child of its own.
  static Array families(std::size_t count) {
    Array accounts;
    for (std::size_t number = 0; number < count; ++number) {
      const Array children{properties(name("child", number))};
      accounts.emplace_back(properties(name("parent", number), {{"ChildAccounts", children}}));
    }
    return accounts;
  }
  template <typename Operation>
  double secondsFor(std::size_t count, Operation operation) {
    const Array accounts = families(count);
    const Store store = load(accounts);
    const std::clock_t start = std::clock();
    operation(store, accounts);
    return static_cast<double>(std::clock() - start) / CLOCKS_PER_SEC;
  }
  template <typename Operation>
  double timesDearer(Operation operation) {
    secondsFor(kFew, operation);  // what is done once in a process is done here
    return secondsFor(kFew * kTimesMore, operation) / secondsFor(kFew, operation);
  }
};

TEST_F(CostOfAccounts, GrowsWithTheirNumberWhenTheyAreLoaded) {
  const auto load = [](const Store&, const Array& accounts) { AccountsManager::initWithAccounsInfoArray(accounts); };
  EXPECT_LT(timesDearer(load), kMostTimesDearer);
}

TEST_F(CostOfAccounts, GrowsWithTheirNumberWhenEachIsGivenAnotherChild) {
  const auto addChildren = [](const Store& store, const Array&) {
    for (const Account& parent : store->allBasicAccounts()) {
      store->addChild_toAccount(account("new " + parent->identifier()->string()), parent);
    }
  };
  EXPECT_LT(timesDearer(addChildren), kMostTimesDearer);
}

TEST_F(CostOfAccounts, GrowsWithTheirNumberWhenAllAreReplacedAtOnce) {
  const auto replaceAll = [](const Store& store, const Array& accounts) {
    Accounts given;
    for (const PropertyValue& each : accounts) {
      given.push_back(accountsettings::BasicAccount::initWithProperties(*each.asDictionary()));
    }
    store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, given);
  };
  EXPECT_LT(timesDearer(replaceAll), kMostTimesDearer);
}

TEST_F(CostOfAccounts, GrowsWithTheirNumberWhenTheyAreSaved) {
  const auto save = [](const Store& store, const Array&) { store->saveAllAccounts(); };
  EXPECT_LT(timesDearer(save), kMostTimesDearer);
}

}  // namespace
}  // namespace tests
