#include <gtest/gtest.h>

#include <algorithm>
#include <set>

#include "accountsettings/device_local_account.h"
#include "platform/linux/linux_platform.h"

namespace accountsettings {
namespace {

using Actions = BasicAccount::Actions;
using Names = std::vector<std::string_view>;

// What ships, as the built libraries find it beside themselves, read by the device's own services.
class ShippedResources : public testing::Test {
 protected:
  ShippedResources() { platform::setCurrent(services); }

  [[nodiscard]] Dictionary file(const std::string& name) const {
    return services.propertyLists->readDictionary(services.directories->resources() / name).valueOr({});
  }
  [[nodiscard]] Dictionary types() const { return file("AccountTypesProperties.plist"); }
  [[nodiscard]] Dictionary table(const std::string& language, const std::string& name) const {
    return file("strings/" + language + "/" + name + ".strings");
  }

  platform::Platform services = platform::makeLinuxPlatform();
};

std::set<std::string> keysOf(const Dictionary& dictionary) {
  std::set<std::string> keys;
  for (const auto& entry : dictionary) keys.insert(entry.key.string());
  return keys;
}

Array dataclasses(const Names& names) {
  Array array;
  for (const std::string_view name : names) array.emplace_back("com.vorlix.Dataclass." + std::string{name});
  return array;
}

bool isWordOf(const Names& words, const PropertyValue& value) {
  return value.asText() != nullptr && std::find(words.begin(), words.end(), value.asText()->view()) != words.end();
}

const std::vector<std::pair<StringConstant, Names>> kSupported{
    {kSubscribedCalendarAccountType, {"Calendars"}},
    {kCalDAVAccountType, {"Calendars", "Reminders"}},
    {kCardDAVAccountType, {"Contacts"}},
    {kBookmarkDAVAccountType, {"Bookmarks"}},
    {kSMTPAccountType, {}},
    {kExchangeAccountType, {"Mail", "Contacts", "Calendars", "Reminders", "Notes", "ContactsSearch"}},
    {kLDAPAccountType, {"ContactsSearch"}},
    {kMailAccountType, {"Mail", "Notes"}},
    {kNimbraAccountType,
     {"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "DeviceLocator", "Quorvel", "KeyValue"}},
    {kGmailAccountType, {"Mail", "Contacts", "Calendars", "Notes"}},
    {kYahooAccountType, {"Mail", "Contacts", "Calendars", "Notes"}},
    {kOnMyDeviceAccountType, {"Contacts", "Calendars", "Reminders", "Bookmarks", "Notes"}},
    {kIMAPNotesAccountType, {"Notes"}},
    {kVorlixAccountType,
     {"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "MediaStream", "DeviceLocator", "Backup",
      "Quorvel", "KeyValue", "Tickora", "SharedStreams"}},
    {kKeldorIMAPAccountType, {"Mail", "Notes"}},
};

TEST_F(ShippedResources, ListTheDataclassesOfEachOfTheFifteenAccountTypes) {
  const Dictionary shipped = types();
  EXPECT_EQ(shipped.size(), 15U);
  for (const auto& [type, names] : kSupported) {
    const Dictionary* const section = shipped.dictionary(type);
    ASSERT_NE(section, nullptr) << type.view();
    EXPECT_EQ(*section->find(kPropertiesSupportedDataclasses), PropertyValue{dataclasses(names)}) << type.view();
  }
}

TEST_F(ShippedResources, AreUnderstoodWholeByTheRecord) {
  for (const auto& [type, names] : kSupported) {
    const auto account = BasicAccount::accountWithType_class(type, "Any");
    EXPECT_EQ(account->supportedDataclasses().size(), names.size()) << type.view();
  }
}

TEST_F(ShippedResources, OfferOnlyActionsOfTheVocabulary) {
  const Names toggles{kDataclassToggleActionNone,           kDataclassToggleActionKeepLocalData,
                      kDataclassToggleActionMergeLocalData, kDataclassToggleActionDeleteLocalData,
                      kDataclassToggleActionMergeSyncData,  kDataclassToggleActionDeleteSyncData};
  const Names deletions{kAccountDeleteActionMergeData, kAccountDeleteActionDeleteData};
  for (const auto& [type, section] : types()) {
    for (const StringConstant key : {kPropertiesEnableDataclassActions, kPropertiesDisableDataclassActions}) {
      const Array& actions = *section.asDictionary()->array(key);
      EXPECT_FALSE(actions.empty()) << type;
      for (const PropertyValue& action : actions) EXPECT_TRUE(isWordOf(toggles, action)) << type;
    }
    const Array& actions = *section.asDictionary()->array(kPropertiesDeleteAccountActions);
    for (const PropertyValue& action : actions) EXPECT_TRUE(isWordOf(deletions, action)) << type;
  }
}

TEST_F(ShippedResources, LeaveAnActionWhereKeepingLocalDataIsWithdrawn) {
  for (const auto& [type, names] : kSupported) {
    for (const Text& dataclass : *BasicAccount::supportedDataclassesForAccountType(type)) {
      EXPECT_FALSE(BasicAccount::userActionsToEnableDataclass_forAccountType(dataclass, type)->empty());
      EXPECT_FALSE(BasicAccount::userActionsToDisableDataclass_forAccountType(dataclass, type)->empty());
    }
  }
}

TEST_F(ShippedResources, OfferToMergeBookmarksButNotToKeepThemApart) {
  EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType(kAccountDataclassBookmarks, kVorlixAccountType),
            (Actions{"Merge Local Data", "Delete Local Data"}));
  EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType(kAccountDataclassContacts, kVorlixAccountType),
            (Actions{"Merge Local Data", "Keep Local Data", "Delete Local Data"}));
}

TEST_F(ShippedResources, HaveNoTypeBetterShownWithSeparateRemindersThatHasNone) {
  for (const auto& [type, names] : kSupported) {
    const bool hasReminders = std::find(names.begin(), names.end(), "Reminders") != names.end();
    EXPECT_TRUE(hasReminders || !BasicAccount::showRemindersSeparatelyForAccountType(type)) << type.view();
  }
}

TEST_F(ShippedResources, DescribeTheFourteenDataclassesAndGiveFourOfThemSeveralStores) {
  EXPECT_EQ(BasicAccount::_dataclassesProperties()->size(), 14U);
  const Array several = dataclasses({"Contacts", "Calendars", "Reminders", "Notes"});
  for (const Text& dataclass : BasicAccount::allSupportedDataclasses()) {
    EXPECT_TRUE(BasicAccount::_dataclassesProperties()->contains(dataclass)) << dataclass;
    EXPECT_EQ(BasicAccount::multipleStoresSupportedByDataclass(dataclass),
              std::find(several.begin(), several.end(), PropertyValue{dataclass}) != several.end());
  }
}

TEST_F(ShippedResources, AskForConfirmationOnlyWhereThereIsASwitch) {
  for (const Text& dataclass : BasicAccount::allSupportedDataclasses()) {
    EXPECT_TRUE(BasicAccount::displayToggleForDataclass(dataclass) ||
                !BasicAccount::userConfirmationIsRequiredByDataclass(dataclass))
        << dataclass;
  }
}

TEST_F(ShippedResources, NameAFullAccountAndANotifierOfEveryDataclassForEveryType) {
  for (const auto& [type, names] : kSupported) {
    const Array* const entries = BasicAccount::_accountCreationMap()->array(type);
    ASSERT_NE(entries, nullptr) << type.view();
    EXPECT_EQ(entries->front().asDictionary()->text("Type")->view(), "FullAccount");
    const Dictionary& notifier = *entries->back().asDictionary();
    EXPECT_EQ(notifier.text("Type")->view(), "NotifierAccount");
    EXPECT_EQ(notifier.dictionary("Description")->array("Supported Dataclasses")->size(), 14U);
  }
}

TEST_F(ShippedResources, NameOnlyModulesThatAreThere) {
  for (const auto& [type, entries] : *BasicAccount::_accountCreationMap()) {
    for (const PropertyValue& entry : *entries.asArray()) {
      const Dictionary& description = *entry.asDictionary()->dictionary("Description");
      const platform::Path module = services.directories->systemRoot() / description.text("Framework")->string();
      EXPECT_EQ(services.files->kindOf(module), platform::FileKind::file) << module;
    }
  }
}

TEST_F(ShippedResources, HaveTheSameTextsInEveryLanguage) {
  for (const std::string name : {"DeviceLocalAccount", "AccountsManager"}) {
    const Dictionary english = table("en", name);
    for (const std::string language : {"de", "fr"}) {
      const Dictionary other = table(language, name);
      EXPECT_EQ(keysOf(other), keysOf(english)) << language << " " << name;
      for (const auto& [key, text] : other) {
        EXPECT_FALSE(text.asText()->empty());
        EXPECT_NE(text, *english.find(key)) << language << " " << key;
      }
    }
  }
}

TEST_F(ShippedResources, HaveATextForEveryKeyThatTheLocalAccountLooksUp) {
  std::set<std::string> expected;
  for (const std::string device : {"FERROX", "FERROX_TAB", "TAVO"}) {
    for (const std::string base :
         {"ON_MY_DEVICE_TYPE_", "ON_MY_DEVICE_TYPE_MID_SENTENCE_", "ON_YOUR_DEVICE_TYPE_MID_SENTENCE_"}) {
      expected.insert(base + device);
    }
  }
  for (const std::string computer : {"LUMO", "PC"}) {
    expected.insert("FROM_MY_COMPUTER_TYPE_" + computer);
    expected.insert("FROM_MY_COMPUTER_TYPE_" + computer + "_MID_SENTENCE");
    expected.insert("SYNCED_WITH_YOUR_COMPUTER_TYPE_" + computer + "_MID_SENTENCE");
  }
  EXPECT_EQ(keysOf(table("en", "DeviceLocalAccount")), expected);
}

TEST_F(ShippedResources, NameTheGroupOfSubscribedCalendars) {
  const Dictionary texts = table("en", "AccountsManager");
  EXPECT_EQ(texts.text("SUBSCRIBED_CALENDAR_GROUP_TITLE")->view(), "Subscribed Calendars");
  EXPECT_EQ(texts.text("SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE")->view(), "subscribed calendars");
}

TEST_F(ShippedResources, NameTheDeviceInTheUsersLanguage) {
  ASSERT_EQ(::setenv("LC_ALL", "de_DE.UTF-8", 1), 0);
  EXPECT_EQ(DeviceLocalAccount::class_typeString().substr(0, 10), "Auf meinem");
}

}  // namespace
}  // namespace accountsettings
