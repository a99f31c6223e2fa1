#include "accountsettings/device_local_account.h"

#include <gtest/gtest.h>

#include "tests/support/account_configuration.h"

namespace accountsettings {
namespace {

class DeviceLocal : public testing::Test {
 protected:
  DeviceLocal() { tests::putAccountConfiguration(device); }

  void translate(std::string_view key, std::string_view text) {
    device.strings->texts[{"DeviceLocalAccount", std::string{key}}] = text;
  }
  void tether(std::string_view key, const PropertyValue& value) { device.tetheredSync->domain.set(key, value); }
  void tetherAllTo(std::string_view system) {
    for (const std::string_view key : {"Mail Accounts", "Contacts", "Calendars", "Bookmarks", "Notes"}) {
      tether(key, Dictionary{{"SyncingOS", system}});
    }
  }

  tests::FakeDevice device;
};

TEST_F(DeviceLocal, HasExactlyFivePropertiesWhenNew) {
  translate("ON_MY_DEVICE_TYPE_FERROX", "On My Ferrox");
  const Dictionary properties = DeviceLocalAccount::basicAccountProperties();
  EXPECT_EQ(properties, (Dictionary{{"Type", "OnMyDevice"},
                                    {"Class", "DeviceLocalAccount"},
                                    {"Type String", "On My Ferrox"},
                                    {"Short Type String", "On My Ferrox"},
                                    {"Identifier", "DeviceLocalAccount"}}));
}

TEST_F(DeviceLocal, HasAFixedIdentifier) { EXPECT_EQ(DeviceLocalAccount::_identifier(), "DeviceLocalAccount"); }

TEST_F(DeviceLocal, AnswersItsOwnIdentifiersAndNameWhateverItsPropertiesSay) {
  translate("ON_MY_DEVICE_TYPE_FERROX", "On My Ferrox");
  const std::shared_ptr<BasicAccount> account =
      DeviceLocalAccount::accountWithProperties({{"Type", "OnMyDevice"},
                                                 {"Class", "DeviceLocalAccount"},
                                                 {"Identifier", "Another"},
                                                 {"Sync Identifier", "A third"},
                                                 {"DisplayName", "My own name"}});
  EXPECT_EQ(account->identifier(), Text{"DeviceLocalAccount"});
  EXPECT_EQ(account->syncStoreIdentifier(), Text{"DeviceLocalAccount"});
  EXPECT_EQ(account->displayName(), Text{"On My Ferrox"});
  EXPECT_EQ(account->properties().text("Identifier")->view(), "Another");
}

TEST_F(DeviceLocal, IsRefusedLikeAnyRecordWithoutClass) {
  EXPECT_EQ(DeviceLocalAccount::accountWithProperties({{"Type", "OnMyDevice"}}), nullptr);
  EXPECT_EQ(device.logMessages(), std::vector<std::string>{"Missing account class."});
}

TEST_F(DeviceLocal, IsMadeFromAnotherRecordsProperties) {
  const auto record = BasicAccount::accountWithProperties(DeviceLocalAccount::basicAccountProperties());
  const auto account = DeviceLocalAccount::accountWithBasicAccount(*record);
  EXPECT_EQ(account->properties(), record->properties());
}

TEST_F(DeviceLocal, IsTheFullAccountOfARecordWhoseCreatorNamesItsClass) {
  const Dictionary description{{"Framework", "lib.so"}, {"Class", "DeviceLocalAccount"}};
  const Dictionary entry{{"Type", "FullAccount"}, {"Description", description}};
  device.put("/resources/AccountCreators.plist", Dictionary{{"OnMyDevice", Array{entry}}});
  const auto record = BasicAccount::accountWithProperties(DeviceLocalAccount::basicAccountProperties());
  const auto full = std::dynamic_pointer_cast<DeviceLocalAccount>(record->fullAccountUsingLoader(nullptr));
  ASSERT_NE(full, nullptr);
  EXPECT_EQ(full->properties(), record->properties());
}

TEST_F(DeviceLocal, IsMadeFromPropertiesForACreatorThatNamesItsClassForTheType) {
  const auto* const info =
      dynamic_cast<const AccountClassInfo*>(platform::current().classes->classNamed("DeviceLocalAccount"));
  ASSERT_NE(info, nullptr);
  const auto made = info->initWithProperties(DeviceLocalAccount::basicAccountProperties());
  EXPECT_NE(std::dynamic_pointer_cast<DeviceLocalAccount>(made), nullptr);
}

// A class derived from it, as a program may have one.
class TabletAccount : public DeviceLocalAccount {
 public:
  static constexpr StringConstant className() { return "TabletAccount"; }
};

TEST_F(DeviceLocal, MakesObjectsOfTheReceivingClass) {
  const Dictionary properties = TabletAccount::basicAccountProperties<TabletAccount>();
  EXPECT_EQ(*properties.text("Class"), Text{"TabletAccount"});
  const std::shared_ptr<TabletAccount> account = TabletAccount::accountWithProperties<TabletAccount>(properties);
  ASSERT_NE(account, nullptr);
  const std::shared_ptr<TabletAccount> full = TabletAccount::accountWithBasicAccount<TabletAccount>(*account);
  EXPECT_EQ(full->properties(), properties);
  EXPECT_EQ(TabletAccount::accountWithProperties<TabletAccount>({{"Type", "OnMyDevice"}}), nullptr);
}

TEST_F(DeviceLocal, IsAFullAccountWhereOtherRecordsAreNone) {
  EXPECT_FALSE((std::is_base_of_v<FullAccountObject, BasicAccount>));
  const auto account = DeviceLocalAccount::accountWithProperties(DeviceLocalAccount::basicAccountProperties());
  const auto parent = BasicAccount::accountWithType_class("CalDAV", "Any");
  FullAccountObject& full = *account;
  full.setParentAccount(parent);
  EXPECT_EQ(account->parentAccount(), parent);
}

TEST_F(DeviceLocal, NamesItsTypeByTheDevicesClass) {
  const std::vector<std::pair<std::optional<PropertyValue>, std::string>> table{
      {std::nullopt, "ON_MY_DEVICE_TYPE_FERROX"},
      {PropertyValue{5}, "ON_MY_DEVICE_TYPE_FERROX"},
      {PropertyValue{"Ferrox"}, "ON_MY_DEVICE_TYPE_FERROX"},
      {PropertyValue{"Ferrox Tab 2"}, "ON_MY_DEVICE_TYPE_FERROX_TAB_2"},
      {PropertyValue{"Ferrox für Straße"}, "ON_MY_DEVICE_TYPE_FERROX_FÜR_STRASSE"}};
  for (const auto& [answer, key] : table) {
    device.deviceInfo->answers.clear();
    if (answer) device.deviceInfo->answers.emplace("DeviceClass", *answer);
    EXPECT_EQ(DeviceLocalAccount::class_typeString(), key);
  }
}

TEST_F(DeviceLocal, LooksATextUpInItsOwnTableAndFallsBackToTheKey) {
  device.strings->texts[{"AccountsManager", "ON_MY_DEVICE_TYPE_FERROX"}] = "wrong table";
  EXPECT_EQ(DeviceLocalAccount::class_typeString(), "ON_MY_DEVICE_TYPE_FERROX");
  translate("ON_MY_DEVICE_TYPE_FERROX", "On My Ferrox");
  EXPECT_EQ(DeviceLocalAccount::class_typeString(), "On My Ferrox");
}

TEST_F(DeviceLocal, AsksForTheTetheredSourceOfEachDataclassUnderItsKey) {
  const std::vector<std::pair<Text, std::string>> table{
      {kAccountDataclassMail, " Mail Accounts"},  {kAccountDataclassContacts, " Contacts"},
      {kAccountDataclassCalendars, " Calendars"}, {kAccountDataclassReminders, " Calendars"},
      {kAccountDataclassBookmarks, " Bookmarks"}, {kAccountDataclassNotes, " Notes"},
      {kAccountDataclassMediaStream, ""},         {"anything", ""}};
  for (const auto& [dataclass, key] : table) {
    device.tetheredSync->asked.clear();
    static_cast<void>(DeviceLocalAccount::tetheredSourceForDataClass(dataclass));
    EXPECT_EQ(device.tetheredSync->asked, std::vector<std::string>{"com.vorlix.mobile.tethered_sync" + key});
  }
}

TEST_F(DeviceLocal, TakesTheTetheredSourceFromTheSyncingSystem) {
  const std::vector<std::pair<PropertyValue, std::string>> table{
      {Dictionary{{"SyncingOS", "Drevan"}}, "Drevan"},   {Dictionary{{"SyncingOS", "Windows"}}, "Windows"},
      {Dictionary{{"SyncingOS", "Another"}}, "Another"}, {Dictionary{{"SyncingOS", 5}}, "Ferrox"},
      {Dictionary{{"Other", "Drevan"}}, "Ferrox"},       {"Drevan", "Ferrox"}};
  for (const auto& [value, source] : table) {
    tether("Contacts", value);
    EXPECT_EQ(DeviceLocalAccount::tetheredSourceForDataClass(kAccountDataclassContacts), source);
    EXPECT_EQ(DeviceLocalAccount::isTetheredSyncingDataclass(kAccountDataclassContacts),
              source == "Drevan" || source == "Windows");
  }
}

TEST_F(DeviceLocal, IsLocalWhereTheServiceHasNoValue) {
  EXPECT_EQ(DeviceLocalAccount::tetheredSourceForDataClass(kAccountDataclassNotes), "Ferrox");
  EXPECT_EQ(device.tetheredSync->openConnections, 0);
}

TEST_F(DeviceLocal, TakesTheWholeDomainsSystemForADataclassWithoutKey) {
  tether("SyncingOS", "Drevan");
  EXPECT_EQ(DeviceLocalAccount::tetheredSourceForDataClass(kAccountDataclassMediaStream), "Drevan");
  tether("SyncingOS", 5);
  EXPECT_EQ(DeviceLocalAccount::tetheredSourceForDataClass(kAccountDataclassMediaStream), "Ferrox");
}

TEST_F(DeviceLocal, RemindersFollowCalendars) {
  tether("Calendars", Dictionary{{"SyncingOS", "Windows"}});
  EXPECT_TRUE(DeviceLocalAccount::isTetheredSyncingDataclass(kAccountDataclassReminders));
}

TEST_F(DeviceLocal, DisconnectsAfterEveryQuestion) {
  tetherAllTo("Drevan");
  EXPECT_TRUE(DeviceLocalAccount::isTetheredSyncingDataclass(kAccountDataclassMail));
  EXPECT_EQ(device.tetheredSync->openConnections, 0);
}

TEST_F(DeviceLocal, IsLocalInEveryRespectWhereTheServiceCannotBeReached) {
  tetherAllTo("Drevan");
  device.tetheredSync->isReachable = false;
  for (const Text& dataclass : BasicAccount::allSupportedDataclasses()) {
    EXPECT_EQ(DeviceLocalAccount::tetheredSourceForDataClass(dataclass), "Ferrox");
    EXPECT_FALSE(DeviceLocalAccount::isTetheredSyncingDataclass(dataclass));
    EXPECT_EQ(DeviceLocalAccount::localizedSyncSourceStringForDataClass_forBeginningOfSentence(dataclass, true),
              "ON_MY_DEVICE_TYPE_FERROX");
    EXPECT_EQ(DeviceLocalAccount::localizedReferenceToSyncSourceStringForDataClass(dataclass),
              "ON_YOUR_DEVICE_TYPE_MID_SENTENCE_FERROX");
  }
}

struct SourceTexts {
  std::string_view system;
  std::string_view atBeginning;
  std::string_view inMidSentence;
  std::string_view reference;
};

TEST_F(DeviceLocal, NamesAndRefersToTheSourceByTheSystemItSyncsWith) {
  device.deviceInfo->answers.emplace("DeviceClass", "Ferrox Tab");
  const SourceTexts table[] = {{"Drevan", "FROM_MY_COMPUTER_TYPE_LUMO", "FROM_MY_COMPUTER_TYPE_LUMO_MID_SENTENCE",
                                "SYNCED_WITH_YOUR_COMPUTER_TYPE_LUMO_MID_SENTENCE"},
                               {"Windows", "FROM_MY_COMPUTER_TYPE_PC", "FROM_MY_COMPUTER_TYPE_PC_MID_SENTENCE",
                                "SYNCED_WITH_YOUR_COMPUTER_TYPE_PC_MID_SENTENCE"},
                               {"Another", "ON_MY_DEVICE_TYPE_FERROX_TAB", "ON_MY_DEVICE_TYPE_MID_SENTENCE_FERROX_TAB",
                                "ON_YOUR_DEVICE_TYPE_MID_SENTENCE_FERROX_TAB"}};
  for (const SourceTexts& row : table) {
    tetherAllTo(row.system);
    const Text notes = kAccountDataclassNotes;
    EXPECT_EQ(DeviceLocalAccount::localizedSyncSourceStringForDataClass_forBeginningOfSentence(notes, true),
              row.atBeginning);
    EXPECT_EQ(DeviceLocalAccount::localizedSyncSourceStringForDataClass_forBeginningOfSentence(notes, false),
              row.inMidSentence);
    EXPECT_EQ(DeviceLocalAccount::localizedReferenceToSyncSourceStringForDataClass(notes), row.reference);
  }
}

TEST_F(DeviceLocal, AsksTheServicesAfreshEachTime) {
  tether("Notes", Dictionary{{"SyncingOS", "Drevan"}});
  EXPECT_TRUE(DeviceLocalAccount::isTetheredSyncingDataclass(kAccountDataclassNotes));
  tether("Notes", Dictionary{});
  EXPECT_FALSE(DeviceLocalAccount::isTetheredSyncingDataclass(kAccountDataclassNotes));
}

}  // namespace
}  // namespace accountsettings
