// A module with one class of each kind: a maker of full accounts, a maker of sync accounts, and a notifier. What they
// do is to write a line to standard error.

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "accountsettings/basic_account.h"
#include "records/description.h"

namespace {

using accountsettings::AccountClassInfo;
using accountsettings::BasicAccount;
using platform::Dictionary;

void say(const std::string& line) { std::fprintf(stderr, "example-accounts: %s\n", line.c_str()); }

class ExampleAccount final : public accountsettings::FullAccountObject {
 public:
  explicit ExampleAccount(Dictionary properties) : _properties{std::move(properties)} {}

  void setParentAccount(std::shared_ptr<BasicAccount> parent) override { _parent = std::move(parent); }

 private:
  Dictionary _properties;
  std::shared_ptr<BasicAccount> _parent;
};

class ExampleSyncAccount final : public accountsettings::SyncAccountObject {
 public:
  explicit ExampleSyncAccount(const std::shared_ptr<BasicAccount>& account) : _account{account} {}

  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                   std::string_view dataclass, bool) override {
    return begin(dataclass, "container " + std::string{identifier});
  }
  bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool) override {
    return begin(dataclass, "the list of containers");
  }
  bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool) override {
    return begin(dataclass, "all containers");
  }

 private:
  bool begin(std::string_view dataclass, const std::string& what) {
    const auto account = _account.lock();
    if (account == nullptr || !account->isEnabledForDataclass(dataclass)) return false;
    say("refreshing " + what);
    return true;
  }

  // The record owns this object; owning the record in turn would keep both for ever.
  std::weak_ptr<BasicAccount> _account;
};

std::shared_ptr<const AccountClassInfo> accountCreator() {
  auto info = std::make_shared<AccountClassInfo>("ExampleAccountCreator");
  info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>& account) {
    return std::make_shared<ExampleAccount>(account->properties());
  };
  info->accountToRefreshForBasicAccount = [](const std::shared_ptr<BasicAccount>& account) {
    return std::make_shared<ExampleSyncAccount>(account);
  };
  return info;
}

std::shared_ptr<const AccountClassInfo> notifier() {
  auto info = std::make_shared<AccountClassInfo>("ExampleNotifier");
  info->accountDidChange_forDataclass = [](std::string_view identifier, std::string_view dataclass) {
    say(std::string{identifier} + " changed for " + std::string{dataclass});
  };
  info->noteAccountChanges = [](const std::vector<Dictionary>& changes) {
    for (const Dictionary& change : changes) say(records::description(change));
  };
  return info;
}

// Opening the module makes these, and with them its classes known.
const platform::ClassRegistration kAccountClass{accountCreator()};
const platform::ClassRegistration kNotifierClass{notifier()};

}  // namespace
