#include <gtest/gtest.h>

#include "accountsettings/basic_account.h"
#include "tests/support/account_configuration.h"

namespace accountsettings {
namespace {

using Events = std::vector<std::string>;

class PlainFullAccount : public FullAccountObject {
 public:
  void setParentAccount(std::shared_ptr<BasicAccount> /*parent*/) override {}
};

class PlainSyncAccount : public SyncAccountObject {
 public:
  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view, std::string_view, bool) override {
    return false;
  }
  bool refreshContainerListForDataclass_isUserRequested(std::string_view, bool) override { return false; }
  bool refreshContainersForDataclass_isUserRequested(std::string_view, bool) override { return false; }
};

// Says, as a record lets go of it, what the record still has.
template <typename Object>
class Witness final : public Object {
 public:
  Witness(std::string_view name, const BasicAccount& record, Events& events)
      : _name{name}, _record{record}, _events{events} {}
  Witness(const Witness&) = delete;
  Witness& operator=(const Witness&) = delete;
  ~Witness() override {
    if (_record.parentAccount() != nullptr) _name += ", parent still there";
    if (!_record.originalProperties().empty()) _name += ", original properties still there";
    if (!_record.properties().empty()) _name += ", properties still there";
    _events.push_back(_name);
  }

 private:
  std::string _name;
  const BasicAccount& _record;
  Events& _events;
};

TEST(AnEndingRecord, LetsGoOfParentThenPropertiesThenFullAccountThenSyncAccount) {
  tests::FakeDevice device;
  tests::putAccountConfiguration(device);
  const Dictionary description{{"Framework", "sync.so"}, {"Class", "WitnessCreator"}};
  device.put("/resources/AccountCreators.plist",
             Dictionary{{"Mail", Array{Dictionary{{"Type", "SyncAccount"}, {"Description", description}}}}});
  Events events;
  const auto info = std::make_shared<AccountClassInfo>("WitnessCreator");
  info->accountToRefreshForBasicAccount = [&events](const std::shared_ptr<BasicAccount>& record) {
    return std::make_shared<Witness<PlainSyncAccount>>("sync account", *record, events);
  };
  const platform::ClassRegistration registration{info};

  auto account = BasicAccount::accountWithType_class("Mail", "Any");
  account->setParentAccount(std::make_shared<Witness<BasicAccount>>("parent", *account, events));
  account->setFullAccount(std::make_shared<Witness<PlainFullAccount>>("full account", *account, events));
  account->_cachedSyncAccount();
  account.reset();
  EXPECT_EQ(events, (Events{"parent, original properties still there, properties still there", "full account",
                            "sync account"}));
}

}  // namespace
}  // namespace accountsettings
