#include "tests/support/step_test.h"

namespace migrator {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using tests::account;
using tests::dataclasses;
using tests::kAbsent;

// Once notes are no data class of a small device, only a type that offers nothing else still lists them.
class NotesOnSmallDevices : public tests::StepTest {
 protected:
  void migrateOn(const PropertyValue& architecture, const Array& accounts) {
    device.deviceInfo->answers.insert_or_assign("CPUArchitecture", architecture);
    load(accounts);
    EXPECT_TRUE(migrator._migrateAccountsFrom8A293(*store));
  }
  const Array usual{account("IMAPNotes", "N", "1", {{"Enabled Dataclasses", dataclasses({"Notes"})}}),
                    account("Mail", "IMAPAccount", "2", {{"Enabled Dataclasses", dataclasses({"Mail"})}}),
                    account("OnMyDevice", "D", "3", {{"Enabled Dataclasses", dataclasses({"Contacts"})}})};
};

TEST_F(NotesOnSmallDevices, GoFromOnlineAccountsToTheOnDeviceAccount) {
  migrateOn("armv6", usual);
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), IsEmpty());
  EXPECT_NE(value(0, "Enabled Dataclasses"), kAbsent);
  EXPECT_THAT(storedDataclasses(1, "Enabled Dataclasses"), ElementsAre("Mail"));
  EXPECT_THAT(storedDataclasses(2, "Enabled Dataclasses"), ElementsAre("Contacts", "Notes"));
}

TEST_F(NotesOnSmallDevices, AreForcedOnForAnOnDeviceAccountWithoutAList) {
  migrateOn("armv6", {account("OnMyDevice", "D", "3")});
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Notes"));
}

TEST_F(NotesOnSmallDevices, AreLostByACalDAVAccountWhoseTypeOffersThem) {
  Dictionary types = tests::accountTypesProperties();
  types.set("CalDAV", Dictionary{{"Supported Dataclasses", dataclasses({"Notes"})}});
  device.put("/resources/AccountTypesProperties.plist", types);
  migrateOn("armv6", {account("CalDAV", "MobileCalDAVAccount", "C",
                              {{"Enabled Dataclasses", dataclasses({"Calendars", "Notes"})}})});
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Calendars"));
}

TEST_F(NotesOnSmallDevices, StayInAListThatDoesNotMakeThemEnabled) {
  const Dictionary mail =
      account("Mail", "IMAPAccount", "2", {{"Enabled Dataclasses", dataclasses({"Notes", "Mail"})}});
  migrateOn("armv6", {mail});
  EXPECT_EQ(at(0).properties(), mail);
}

TEST_F(NotesOnSmallDevices, StayWhereTheyAreOnEveryOtherDevice) {
  for (const PropertyValue& architecture :
       {PropertyValue{"armv7"}, PropertyValue{"ARMV6"}, PropertyValue{"armv6l"}, PropertyValue{Array{"armv6"}}}) {
    migrateOn(architecture, usual);
    for (std::size_t place = 0; place < usual.size(); ++place) {
      EXPECT_EQ(PropertyValue{at(place).properties()}, usual[place]);
    }
    EXPECT_EQ(store->dataVersion(), 6U);
  }
}

TEST_F(NotesOnSmallDevices, StayWhereTheyAreWhereTheDeviceDoesNotSayWhatItIs) {
  load(usual);
  EXPECT_TRUE(migrator._migrateAccountsFrom8A293(*store));
  EXPECT_EQ(PropertyValue{at(2).properties()}, usual[2]);
}

class HostedParents : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom8B117(*store)); }

  // The only child of the account at this place.
  [[nodiscard]] Dictionary onlyChild(std::size_t place) {
    const Array* const children = at(place).properties().array("ChildAccounts");
    EXPECT_TRUE(children != nullptr && children->size() == 1U);
    return *children->front().asDictionary();
  }
};

const Dictionary kHostedMail = account("Nimbra", "NimbraAccount", "M",
                                       {{"Username", "jane"},
                                        {"DisplayName", "Jane's mail"},
                                        {"Enabled Dataclasses", dataclasses({"Contacts", "Mail"})},
                                        {"Provisioned Dataclasses", dataclasses({"Mail"})},
                                        {"ChildAccounts", Array{account("CalDAV", "C", "Child")}},
                                        {"CalDAVEnabled", true},
                                        {"Subscribed Calendars", Array{"webcal://example"}},
                                        {"DAExoSubscribedCalendarInfos", Array{Dictionary{{"Title", "Holidays"}}}},
                                        {"Sync Identifier", "S"},
                                        {"Hostname", "mail.nimbra.com"}});

TEST_F(HostedParents, TakeOverWhatBelongsToTheWholeAccount) {
  load({kHostedMail});
  migrate();
  ASSERT_EQ(store->count(), 1U);
  Dictionary parent = at(0).properties();
  EXPECT_EQ(at(0).identifier()->size(), 36U);
  EXPECT_EQ(parent.remove("Identifier"), parent.remove("Sync Identifier"));
  EXPECT_EQ(parent.array("ChildAccounts")->front(), kHostedMail.array("ChildAccounts")->front());
  EXPECT_EQ(parent.array("ChildAccounts")->size(), 2U);
  parent.remove("ChildAccounts");
  EXPECT_EQ(
      parent,
      (Dictionary{{"Username", "jane@nimbra.com"},
                  {"DisplayName", "Jane's mail"},
                  {"Enabled Dataclasses", dataclasses({"Contacts", "Mail"})},
                  {"Provisioned Dataclasses", dataclasses({"Mail", "Contacts", "Calendars", "Reminders", "Bookmarks",
                                                           "Notes", "DeviceLocator", "Quorvel", "KeyValue"})},
                  {"CalDAVEnabled", true},
                  {"Subscribed Calendars", Array{"webcal://example"}},
                  {"DAExoSubscribedCalendarInfos", Array{Dictionary{{"Title", "Holidays"}}}},
                  {"Type String", "Nimbra"},
                  {"Short Type String", "Nimbra"},
                  {"Type", "VorlixAccount"},
                  {"Class", "NimbraAccount"}}));
}

TEST_F(HostedParents, HoldTheirEntriesInOneOrderWhateverTheMailAccounts) {
  Dictionary reversed;
  for (auto entry = kHostedMail.end(); entry != kHostedMail.begin();) {
    --entry;
    reversed.set(entry->key, entry->value);
  }
  load({reversed});
  migrate();
  std::vector<std::string> keys;
  for (const auto& entry : at(0).properties()) keys.push_back(entry.key.string());
  EXPECT_THAT(keys,
              ElementsAre("Username", "DisplayName", "Enabled Dataclasses", "Provisioned Dataclasses", "ChildAccounts",
                          "CalDAVEnabled", "Subscribed Calendars", "DAExoSubscribedCalendarInfos", "Type String",
                          "Short Type String", "Type", "Class", "Identifier", "Sync Identifier"));
}

TEST_F(HostedParents, LeaveTheRestWithTheMailAccountWhichBecomesTheLastChild) {
  load({kHostedMail});
  migrate();
  Dictionary expected = kHostedMail;
  for (const std::string_view moved :
       {"Enabled Dataclasses", "ChildAccounts", "Subscribed Calendars", "DAExoSubscribedCalendarInfos"}) {
    expected.remove(moved);
  }
  EXPECT_EQ(at(0).properties().array("ChildAccounts")->back(), PropertyValue{expected});
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("S")->parentAccount(), store->allBasicAccounts()[0]);
}

TEST_F(HostedParents, AreParentsOfTheVeryRecordsThatTheyWereMadeFor) {
  load({kHostedMail});
  const auto mail = store->allBasicAccounts()[0];
  migrate();
  EXPECT_EQ(mail->parentAccount(), store->allBasicAccounts()[0]);
}

TEST_F(HostedParents, TakeThePlacesOfTheirMailAccounts) {
  load({account("LDAP", "LDAPAccount", "1"), account("Nimbra", "WexmoAccount", "2", {{"Username", "a"}}),
        account("LDAP", "LDAPAccount", "3"), account("Mail", "NimbraAccount", "4", {{"Username", "b"}})});
  migrate();
  std::vector<std::string> types;
  for (const auto& record : store->allBasicAccounts()) types.push_back(record->type()->string());
  EXPECT_THAT(types, ElementsAre("LDAP", "VorlixAccount", "LDAP", "VorlixAccount"));
}

TEST_F(HostedParents, NameTheirUserWithTheMailDomainOfTheService) {
  const std::vector<std::tuple<std::string_view, PropertyValue, PropertyValue>> cases{
      {"WexmoAccount", "jane", "jane@wexmo.com"},
      {"NimbraAccount", "jane", "jane@nimbra.com"},
      {"NimbraAccount", "jane@elsewhere", "jane@elsewhere"},
      {"WexmoAccount", "@", "@"},
      {"NimbraAccount", "", "@nimbra.com"},
      {"NimbraAccount", 7, kAbsent}};
  for (const auto& [className, username, expected] : cases) {
    load({account("Nimbra", className, "M", {{"Username", username}})});
    migrate();
    EXPECT_EQ(value(0, "Username"), expected);
    EXPECT_EQ(*onlyChild(0).find("Username"), username);
  }
}

TEST_F(HostedParents, HaveNoEntryForWhatTheMailAccountLacks) {
  load({account("Nimbra", "WexmoAccount", "M")});
  migrate();
  Dictionary parent = at(0).properties();
  for (const std::string_view key : {"Identifier", "Sync Identifier", "ChildAccounts", "Provisioned Dataclasses"}) {
    EXPECT_TRUE(parent.remove(key)) << key;
  }
  EXPECT_EQ(parent, (Dictionary{{"Type String", "Nimbra"},
                                {"Short Type String", "Nimbra"},
                                {"Type", "VorlixAccount"},
                                {"Class", "WexmoAccount"}}));
}

TEST_F(HostedParents, TakeOverValuesOfOddKindsAsTheyAre) {
  load({account("Nimbra", "NimbraAccount", "M",
                {{"DisplayName", 1}, {"CalDAVEnabled", "maybe"}, {"Subscribed Calendars", false}})});
  migrate();
  EXPECT_EQ(value(0, "DisplayName"), PropertyValue{1});
  EXPECT_EQ(value(0, "CalDAVEnabled"), PropertyValue{"maybe"});
  EXPECT_EQ(value(0, "Subscribed Calendars"), PropertyValue{false});
}

TEST_F(HostedParents, OfferMailOnlyForAnAccountThatSaysItIsActive) {
  const std::vector<std::pair<PropertyValue, bool>> cases{{true, true},  {false, false}, {1, true},       {0, false},
                                                          {"yes", true}, {"", false},    {Array{}, false}};
  for (const auto& [isActive, offersMail] : cases) {
    load({account("Nimbra", "NimbraAccount", "M", {{"IsActive", isActive}})});
    migrate();
    EXPECT_EQ(isEnabled(0, "Mail"), offersMail);
    EXPECT_EQ(*onlyChild(0).find("IsActive"), isActive);
  }
  load({account("Nimbra", "NimbraAccount", "M")});
  migrate();
  EXPECT_EQ(value(0, "Enabled Dataclasses"), kAbsent);
}

TEST_F(HostedParents, AreMadeForTwoClassesOnly) {
  const Array others{account("Mail", "IMAPAccount", "1"), account("VorlixAccount", "KQAccount", "2"),
                     account("CalDAV", "nimbraaccount", "3")};
  load(others);
  migrate();
  for (std::size_t place = 0; place < others.size(); ++place) {
    EXPECT_EQ(PropertyValue{at(place).properties()}, others[place]);
  }
}

TEST_F(HostedParents, AreMadeAnewForAParentThatStillHasTheClassName) {
  load({account("VorlixAccount", "NimbraAccount", "P")});
  migrate();
  EXPECT_EQ(*onlyChild(0).find("Identifier"), PropertyValue{"P"});
}

TEST_F(HostedParents, AreMadeForEveryPlaceOfARecordThatStandsTwice) {
  const Dictionary twin = account("Nimbra", "NimbraAccount", "M", {{"Username", "jane"}});
  load({twin, twin});
  store->updateAccount(store->allBasicAccounts()[0]);
  ASSERT_EQ(store->allBasicAccounts()[0], store->allBasicAccounts()[1]);
  migrate();
  ASSERT_EQ(store->count(), 2U);
  EXPECT_EQ(at(0).type(), Text{"VorlixAccount"});
  EXPECT_EQ(at(1).type(), Text{"VorlixAccount"});
  EXPECT_NE(at(0).identifier(), at(1).identifier());
}

TEST_F(HostedParents, AreNotMadeWhereTheDeviceKnowsNoCloudAccounts) {
  tests::removeAccountType(device, "VorlixAccount");
  load({kHostedMail});
  migrate();
  ASSERT_EQ(store->count(), 1U);
  EXPECT_EQ(at(0).properties(), kHostedMail);
}

TEST_F(HostedParents, ReachTheFileInPlaceOfTheirMailAccounts) {
  load({kHostedMail});
  migrate();
  EXPECT_EQ(savedAccounts(), (Array{at(0).properties()}));
  EXPECT_TRUE(device.console->lines.empty());
}

class CloudChildren : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom8C136(*store)); }
  void loadCloudAccountWith(const PropertyValue& children) {
    load({account("VorlixAccount", "KQAccount", "K", {{"ChildAccounts", children}})});
  }
  static Dictionary withoutName(Dictionary child) {
    child.remove("DisplayName");
    return child;
  }
};

TEST_F(CloudChildren, OfHostedMailLoseTheirDisplayNameAndOthersKeepIt) {
  const Dictionary nimbra = account("Nimbra", "NimbraAccount", "1", {{"DisplayName", "N"}, {"X", 1}});
  const Dictionary wexmo = account("Nimbra", "WexmoAccount", "2", {{"DisplayName", ""}});
  const Dictionary calendar = account("CalDAV", "MobileCalDAVAccount", "3", {{"DisplayName", "C"}});
  const Dictionary nameless = account("Nimbra", "NimbraAccount", "4");
  loadCloudAccountWith(Array{calendar, nimbra, nameless, wexmo});
  migrate();
  EXPECT_EQ(value(0, "ChildAccounts"),
            (PropertyValue{Array{calendar, withoutName(nimbra), nameless, withoutName(wexmo)}}));
  EXPECT_EQ(savedAccounts(), (Array{at(0).properties()}));
}

TEST_F(CloudChildren, ThatAreEqualAreCleanedAtTheFirstPlaceOnly) {
  const Dictionary twin = account("Nimbra", "NimbraAccount", "1", {{"DisplayName", "N"}});
  loadCloudAccountWith(Array{twin, twin});
  migrate();
  EXPECT_EQ(value(0, "ChildAccounts"), (PropertyValue{Array{withoutName(twin), twin}}));
}

TEST_F(CloudChildren, WithoutAnIdentifierGainFreshOnesWhenCleaned) {
  loadCloudAccountWith(Array{Dictionary{{"Type", "Nimbra"}, {"Class", "NimbraAccount"}, {"DisplayName", "N"}}});
  migrate();
  Dictionary child = *value(0, "ChildAccounts").asArray()->front().asDictionary();
  EXPECT_EQ(child.text("Identifier")->size(), 36U);
  EXPECT_EQ(child.remove("Identifier"), child.remove("Sync Identifier"));
  EXPECT_EQ(child, (Dictionary{{"Type", "Nimbra"}, {"Class", "NimbraAccount"}}));
}

TEST_F(CloudChildren, ThatAreNoAccountsStayAsTheyAre) {
  const Array odd{"text", 7, Dictionary{},
                  Dictionary{{"Type", "Unknown"}, {"Class", "NimbraAccount"}, {"DisplayName", "N"}},
                  account("Nimbra", "NimbraAccount", "1", {{"DisplayName", 7}})};
  loadCloudAccountWith(odd);
  migrate();
  EXPECT_EQ(value(0, "ChildAccounts"), PropertyValue{odd});
}

TEST_F(CloudChildren, ThatAreNoListStayAsTheyAre) {
  for (const PropertyValue& odd :
       {PropertyValue{"none"}, PropertyValue{Dictionary{{"A", 1}}}, PropertyValue{Array{}}}) {
    loadCloudAccountWith(odd);
    migrate();
    EXPECT_EQ(value(0, "ChildAccounts"), odd);
  }
  load({account("VorlixAccount", "KQAccount", "K")});
  migrate();
  EXPECT_EQ(value(0, "ChildAccounts"), kAbsent);
}

TEST_F(CloudChildren, OfOtherClassesKeepTheirNames) {
  const Dictionary parent =
      account("VorlixAccount", "NimbraAccount", "P",
              {{"ChildAccounts", Array{account("Nimbra", "NimbraAccount", "1", {{"DisplayName", "N"}})}}});
  load({parent});
  migrate();
  EXPECT_EQ(at(0).properties(), parent);
}

class MailAfterTheCloud : public CloudChildren {};

TEST_F(MailAfterTheCloud, IsSwitchedOnForFiveClasses) {
  for (const std::string_view mailClass : {"IMAPAccount", "GmailAccount", "YahooAccount", "AOLAccount", "POPAccount"}) {
    load({account("Mail", mailClass, "M")});
    migrate();
    EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail")) << mailClass;
  }
}

TEST_F(MailAfterTheCloud, IsNotSwitchedForHostedAndOtherAccounts) {
  for (const std::string_view other : {"NimbraAccount", "WexmoAccount", "LocalAccount"}) {
    load({account("Mail", other, "M")});
    migrate();
    EXPECT_EQ(value(0, "Enabled Dataclasses"), kAbsent) << other;
  }
}

TEST_F(MailAfterTheCloud, StaysAsItWasForAnAccountThatIsSaidToBeInactive) {
  const std::vector<std::pair<PropertyValue, bool>> cases{
      {true, true}, {false, false}, {0, false}, {Dictionary{}, true}};
  for (const auto& [isActive, isSwitchedOn] : cases) {
    load({account("Mail", "POPAccount", "M", {{"IsActive", isActive}})});
    migrate();
    EXPECT_EQ(isEnabled(0, "Mail"), isSwitchedOn);
  }
}

TEST_F(MailAfterTheCloud, IsSaved) {
  load({account("Mail", "POPAccount", "M")});
  migrate();
  EXPECT_EQ(savedAccounts(),
            (Array{account("Mail", "POPAccount", "M", {{"Enabled Dataclasses", dataclasses({"Mail"})}})}));
}

TEST_F(MailAfterTheCloud, IsSavedOnceMoreByTheStepThatOnlyStamps) {
  load({account("Mail", "POPAccount", "M")});
  at(0).setAccountProperty_forKey("kept", "Note");
  EXPECT_TRUE(migrator._migrateAccountsFrom8F191(*store));
  EXPECT_EQ(savedAccounts(), (Array{account("Mail", "POPAccount", "M", {{"Note", "kept"}})}));
}

}  // namespace
}  // namespace migrator
