// The shipped configuration and the shipped modules, held against each other by the device's own services.

#include <gmock/gmock.h>

#include <filesystem>
#include <set>
#include <string>

#include "accountsettings/account_objects.h"
#include "accountsettings/basic_account.h"
#include "accountsettings/device_local_account.h"
#include "platform/linux/linux_platform.h"
#include "tests/modules/module_device.h"

namespace tests {
namespace {

using accountsettings::AccountClassInfo;

class ShippedConfiguration : public ::testing::TestWithParam<const char*> {
 protected:
  ShippedConfiguration() { platform::setCurrent(platform::makeLinuxPlatform()); }

  static const Array& entries() { return *BasicAccount::_accountCreationMap()->array(GetParam()); }
  static std::shared_ptr<BasicAccount> account() {
    return BasicAccount::initWithProperties({{"Type", GetParam()}, {"Class", "AnyAccount"}, {"Identifier", "A"}});
  }
  // The class that the entry names, once the module that it names is open.
  static const AccountClassInfo* openedClass(const Dictionary& description) {
    const auto& services = platform::current();
    const auto module = services.directories->systemRoot() / description.text("Framework")->string();
    EXPECT_TRUE(services.modules->open(module).isOk()) << module;
    return dynamic_cast<const AccountClassInfo*>(services.classes->classNamed(*description.text("Class")));
  }
  static bool answers(const AccountClassInfo& info, std::string_view creatorType) {
    if (creatorType == "FullAccount") return info.classForAccountType || info.accountWithBasicAccount;
    if (creatorType == "SyncAccount") return static_cast<bool>(info.accountToRefreshForBasicAccount);
    return creatorType == "NotifierAccount" && info.noteAccountChanges;
  }
};

TEST_P(ShippedConfiguration, NamesModulesThatOpenAndClassesThatAnswerWhatIsAskedOfThem) {
  for (const PropertyValue& entry : entries()) {
    const Dictionary& creator = *entry.asDictionary();
    const Dictionary& description = *creator.dictionary("Description");
    const auto* const info = openedClass(description);
    ASSERT_NE(info, nullptr) << *description.text("Class");
    EXPECT_TRUE(answers(*info, *creator.text("Type"))) << *description.text("Class");
  }
}

TEST_P(ShippedConfiguration, GivesEveryTypeAFullAccount) {
  EXPECT_NE(account()->fullAccountUsingLoader(nullptr), nullptr);
}

// Nothing of a directory is kept, an outgoing server has nothing to fetch, and the device's own data have no service.
TEST_P(ShippedConfiguration, GivesATypeASyncAccountWhereThereIsSomethingToRefresh) {
  const std::string_view type = GetParam();
  const bool hasNothing = type == "LDAP" || type == "SMTP" || type == "OnMyDevice";
  EXPECT_EQ(account()->_cachedSyncAccount() == nullptr, hasNothing);
}

TEST_P(ShippedConfiguration, AnnouncesEveryDataclassOfTheType) {
  for (const auto& dataclass : account()->supportedDataclasses()) {
    EXPECT_THAT(AccountsManager::_notifierClassNamesForAccountType_dataclass(GetParam(), dataclass),
                ::testing::ElementsAre("AccountAnnouncer"));
  }
}

INSTANTIATE_TEST_SUITE_P(AccountTypes, ShippedConfiguration,
                         ::testing::Values("Subscribed Calendar", "CalDAV", "CardDAV", "BookmarkDAV", "SMTP",
                                           "Exchange", "LDAP", "Mail", "Nimbra", "Gmail", "Yahoo", "OnMyDevice",
                                           "IMAPNotes", "VorlixAccount", "KeldorIMAP"));

TEST(ShippedCreators, OfTheDevicesOwnAccountMakeADeviceLocalAccount) {
  platform::setCurrent(platform::makeLinuxPlatform());
  const auto record = BasicAccount::initWithProperties(accountsettings::DeviceLocalAccount::basicAccountProperties());
  const auto full = record->fullAccountUsingLoader(nullptr);
  EXPECT_NE(std::dynamic_pointer_cast<accountsettings::DeviceLocalAccount>(full), nullptr);
}

TEST(ShippedCreators, NameEveryShippedModule) {
  platform::setCurrent(platform::makeLinuxPlatform());
  std::set<std::string> named;
  for (const auto& [type, entries] : *BasicAccount::_accountCreationMap()) {
    for (const PropertyValue& entry : *entries.asArray()) {
      named.insert("/" + entry.asDictionary()->dictionary("Description")->text("Framework")->string());
    }
  }
  std::set<std::string> shipped;
  for (const auto& file : std::filesystem::directory_iterator{SHIPPED_MODULES_DIR}) shipped.insert(file.path());
  EXPECT_EQ(named, shipped);
}

}  // namespace
}  // namespace tests
