#include "accountsettings/device_local_account.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using tests::account;
using tests::dataclasses;
using tests::kAbsent;

class Identifiers : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom7A150(*store)); }
};

TEST_F(Identifiers, OfMailGoOverToTheSyncStoreAndMakeRoomForTheUniqueId) {
  for (const auto& [type, className] :
       {std::pair{"Mail", "IMAPAccount"}, {"Nimbra", "NimbraAccount"}, {"Exchange", "E"}}) {
    load({account(type, className, "A", {{"uniqueId", "B"}, {"Sync Identifier", "S"}})});
    migrate();
    EXPECT_EQ(at(0).properties(), account(type, className, "B", {{"Sync Identifier", "A"}}));
  }
}

TEST_F(Identifiers, OfOutgoingServersHaveNoSyncStore) {
  load({account("SMTP", "SMTPAccount", "A", {{"uniqueId", "B"}})});
  migrate();
  EXPECT_EQ(at(0).properties(), account("SMTP", "SMTPAccount", "B"));
}

TEST_F(Identifiers, StayWhereThereIsNoUniqueId) {
  load({account("Mail", "POPAccount", "A"), account("SMTP", "SMTPAccount", "B")});
  migrate();
  EXPECT_EQ(at(0).properties(), account("Mail", "POPAccount", "A", {{"Sync Identifier", "A"}}));
  EXPECT_EQ(at(1).properties(), account("SMTP", "SMTPAccount", "B"));
}

TEST_F(Identifiers, StayWhereTheUniqueIdIsEmptyOrNoText) {
  for (const PropertyValue& uniqueId : {PropertyValue{""}, PropertyValue{7}}) {
    load({account("Mail", "POPAccount", "A", {{"uniqueId", uniqueId}})});
    migrate();
    EXPECT_EQ(value(0, "Identifier"), PropertyValue{"A"});
    EXPECT_EQ(value(0, "uniqueId"), uniqueId);
  }
}

TEST_F(Identifiers, AreMadeForAnAccountWithNeitherKey) {
  load({account("Exchange", "ExchangeAccount", "A")});
  for (const std::optional<PropertyValue>& missing : {std::optional<PropertyValue>{}, {PropertyValue{""}}}) {
    at(0).setAccountProperty_forKey(missing, "Identifier");
    migrate();
    EXPECT_EQ(at(0).identifier()->size(), 36U);
    EXPECT_EQ(value(0, "Sync Identifier"), kAbsent);
  }
}

TEST_F(Identifiers, ThatCannotBeMadeLeaveTheirAccountAsOne) {
  for (const auto& [type, className] :
       {std::pair{"Mail", "IMAPAccount"}, {"Nimbra", "NimbraAccount"}, {"Exchange", "E"}, {"SMTP", "SMTPAccount"}}) {
    load({account(type, className, "A"), account("LDAP", "LDAPAccount", "L")});
    at(0).setAccountProperty_forKey(std::nullopt, "Identifier");
    device.identifiers->canMake = false;
    migrate();
    EXPECT_EQ(store->count(), 2U) << type;
    device.identifiers->canMake = true;
  }
}

TEST_F(Identifiers, OfOtherTypesAreLeftAlone) {
  Array others;
  for (const std::string_view type : {"CalDAV", "CardDAV", "Subscribed Calendar", "LDAP", "OnMyDevice", "Gmail",
                                      "Yahoo", "IMAPNotes", "VorlixAccount", "KeldorIMAP", "BookmarkDAV"}) {
    others.emplace_back(account(type, "SomeClass", type, {{"uniqueId", "U"}}));
  }
  load(others);
  migrate();
  for (std::size_t place = 0; place < others.size(); ++place)
    EXPECT_EQ(PropertyValue{at(place).properties()}, others[place]);
}

TEST_F(Identifiers, AreFoundAndKeepTheirOrderAfterwards) {
  load({account("SMTP", "SMTPAccount", "1", {{"uniqueId", "A"}}), account("LDAP", "LDAPAccount", "2"),
        account("Mail", "IMAPAccount", "3", {{"uniqueId", "B"}}), account("Exchange", "E", "4"),
        account("Nimbra", "NimbraAccount", "5", {{"uniqueId", "C"}})});
  migrate();
  std::string order;
  for (const auto& record : store->allBasicAccounts()) {
    const std::string identifier = record->identifier().value_or(Text{}).string();
    EXPECT_EQ(store->accountWithIdentifier(identifier), record);
    order += identifier;
  }
  EXPECT_EQ(order, "A2B4C");
  EXPECT_EQ(store->accountWithIdentifier("1"), nullptr);
}

TEST_F(Identifiers, AreSoughtOnceForIncomingAndOnceForOutgoingAccounts) {
  load({account("Mail", "IMAPAccount", "A")});
  migrate();
  EXPECT_EQ(device.logMessages(), (std::vector<std::string>{"Replacing accounts", "Replacing accounts"}));
  EXPECT_TRUE(device.console->lines.empty());
}

class OnDeviceAccount : public tests::StepTest {
 protected:
  OnDeviceAccount() { load({}); }

  void listSources(platform::SyncDataType type, platform::ExternalSources sources) {
    device.externalSources->sources[type] = std::move(sources);
  }
  std::vector<std::string> enabledAfterwards() {
    EXPECT_TRUE(migrator._migrateAccountsFrom7A153(*store));
    return storedDataclasses(store->count() - 1, "Enabled Dataclasses");
  }
};

using platform::SyncDataType;
using testing::ElementsAre;
using testing::UnorderedElementsAre;

TEST_F(OnDeviceAccount, KeepsAllFourDataclassesWhereNothingElseClaimsThem) {
  EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Bookmarks", "Calendars", "Contacts", "Notes"));
}

TEST_F(OnDeviceAccount, IsMadeOfItsBasePropertiesAndTheEnabledDataclasses) {
  std::ignore = enabledAfterwards();
  Dictionary properties = at(0).properties();
  properties.remove("Enabled Dataclasses");
  const std::string name = accountsettings::DeviceLocalAccount::class_typeString();
  EXPECT_EQ(properties, account("OnMyDevice", "DeviceLocalAccount", "DeviceLocalAccount",
                                {{"Type String", name}, {"Short Type String", name}}));
}

TEST_F(OnDeviceAccount, CountsAnEmptyListOfSourcesAsNone) {
  listSources(SyncDataType::bookmarks, {Array{}, std::nullopt});
  listSources(SyncDataType::contacts, {std::nullopt, ""});
  EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Bookmarks", "Calendars", "Contacts", "Notes"));
}

TEST_F(OnDeviceAccount, SharesADataclassThatHasSeveralStores) {
  for (const SyncDataType type : {SyncDataType::calendars, SyncDataType::contacts, SyncDataType::notes}) {
    listSources(type, {Array{"Computer"}, std::nullopt});
  }
  EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Bookmarks", "Calendars", "Contacts", "Notes"));
}

TEST_F(OnDeviceAccount, LeavesASingleStoreToWhoeverClaimsIt) {
  for (const Array& sources : {Array{"Computer"}, Array{"DenyTethered"}, Array{7}}) {
    listSources(SyncDataType::bookmarks, {sources, std::nullopt});
    EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Calendars", "Contacts", "Notes"));
  }
}

TEST_F(OnDeviceAccount, KeepsOffWhatMustNotSyncOverACable) {
  listSources(SyncDataType::calendars, {Array{"Computer", "DenyTethered"}, std::nullopt});
  EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Bookmarks", "Contacts", "Notes"));
}

TEST_F(OnDeviceAccount, HasNoListWhereNothingIsEnabled) {
  for (const SyncDataType type :
       {SyncDataType::bookmarks, SyncDataType::calendars, SyncDataType::contacts, SyncDataType::notes}) {
    listSources(type, {Array{"DenyTethered"}, std::nullopt});
  }
  std::ignore = enabledAfterwards();
  EXPECT_EQ(value(0, "Enabled Dataclasses"), kAbsent);
}

TEST_F(OnDeviceAccount, SaysForWhichDataclassTheSourcesAreUnknownAndGoesOn) {
  listSources(SyncDataType::contacts, {Array{"Computer"}, "no answer"});
  listSources(SyncDataType::notes, {std::nullopt, "asleep"});
  EXPECT_THAT(enabledAfterwards(), UnorderedElementsAre("Bookmarks", "Calendars"));
  const std::string start =
      "[-[AccountsDataMigrator(Internal) _migrateAccountsFrom7A153:]]Error while retreiving external sources for "
      "dataclass com.vorlix.Dataclass.";
  EXPECT_THAT(device.console->lines, UnorderedElementsAre(start + "Contacts [no answer]", start + "Notes [asleep]"));
}

TEST_F(OnDeviceAccount, ReplacesEveryStoredOneAndNothingElse) {
  load({account("OnMyDevice", "Old", "1", {{"Mine", true}}), account("LDAP", "LDAPAccount", "2"),
        account("OnMyDevice", "Old", "3")});
  std::ignore = enabledAfterwards();
  ASSERT_EQ(store->count(), 2U);
  EXPECT_EQ(at(0).properties(), account("LDAP", "LDAPAccount", "2"));
  EXPECT_EQ(value(1, "Identifier"), PropertyValue{"DeviceLocalAccount"});
  EXPECT_EQ(value(1, "Mine"), kAbsent);
}

TEST_F(OnDeviceAccount, TakesThePlaceOfOneWithItsIdentifier) {
  load({account("OnMyDevice", "DeviceLocalAccount", "DeviceLocalAccount", {{"Mine", true}}),
        account("LDAP", "LDAPAccount", "2")});
  std::ignore = enabledAfterwards();
  ASSERT_EQ(store->count(), 2U);
  EXPECT_EQ(value(0, "Identifier"), PropertyValue{"DeviceLocalAccount"});
  EXPECT_EQ(value(0, "Mine"), kAbsent);
}

TEST_F(OnDeviceAccount, TakesBothPlacesOfTwoWithItsIdentifier) {
  const Dictionary stored = account("OnMyDevice", "DeviceLocalAccount", "DeviceLocalAccount");
  load({stored, account("LDAP", "LDAPAccount", "2"), stored});
  std::ignore = enabledAfterwards();
  ASSERT_EQ(store->count(), 3U);
  EXPECT_EQ(store->allBasicAccounts()[0], store->allBasicAccounts()[2]);
}

TEST_F(OnDeviceAccount, IsNotMadeWhereTheDeviceKnowsNoSuchType) {
  tests::removeAccountType(device, "OnMyDevice");
  load({account("OnMyDevice", "D", "1"), account("LDAP", "LDAPAccount", "2")});
  EXPECT_TRUE(migrator._migrateAccountsFrom7A153(*store));
  ASSERT_EQ(store->count(), 1U);
  EXPECT_EQ(at(0).properties(), account("LDAP", "LDAPAccount", "2"));
  EXPECT_EQ(store->dataVersion(), 3U);
}

TEST_F(OnDeviceAccount, KnowsTheWordThatForbidsTheCableExactly) {
  EXPECT_TRUE(AccountsDataMigrator::_tetheredDisabledInSources({"Computer", 1, "DenyTethered"}));
  EXPECT_FALSE(
      AccountsDataMigrator::_tetheredDisabledInSources({"denytethered", "DenyTethered ", Array{"DenyTethered"}}));
  EXPECT_FALSE(AccountsDataMigrator::_tetheredDisabledInSources({}));
}

class HostedNotes : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom7A241(*store)); }
};

TEST_F(HostedNotes, AreSwitchedOff) {
  load({account("Nimbra", "NimbraAccount", "N",
                {{"Enabled Dataclasses", dataclasses({"Notes", "Contacts", "Mail", "Notes"})}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail", "Contacts"));
}

TEST_F(HostedNotes, LeaveAListBehindThatHoldsWhatIsEnabledAtPresent) {
  load({account("Nimbra", "NimbraAccount", "N",
                {{"Enabled Dataclasses", dataclasses({"Contacts", "Tickora", "Quorvel", "Mail"})},
                 {"Provisioned Dataclasses", dataclasses({"Mail", "Contacts"})}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail", "Contacts"));
}

TEST_F(HostedNotes, MayBeAllThereWas) {
  load({account("Nimbra", "NimbraAccount", "N", {{"Enabled Dataclasses", dataclasses({"Notes"})}})});
  migrate();
  EXPECT_EQ(value(0, "Enabled Dataclasses"), PropertyValue{Array{}});
}

TEST_F(HostedNotes, OfAnAccountWithoutAListStayWithoutAList) {
  load({account("Nimbra", "WexmoAccount", "W")});
  migrate();
  EXPECT_EQ(at(0).properties(), account("Nimbra", "WexmoAccount", "W"));
}

TEST_F(HostedNotes, AreAMatterOfTypeAndNotOfClass) {
  const Dictionary mail = account("Mail", "NimbraAccount", "M", {{"Enabled Dataclasses", dataclasses({"Notes"})}});
  load({mail});
  migrate();
  EXPECT_EQ(at(0).properties(), mail);
}

TEST_F(HostedNotes, OfAnAccountWithoutIdentifierLeaveItAsOne) {
  load({account("Nimbra", "NimbraAccount", "N")});
  at(0).setAccountProperty_forKey(std::nullopt, "Identifier");
  device.identifiers->canMake = false;
  migrate();
  EXPECT_EQ(store->count(), 1U);
}

TEST_F(HostedNotes, AreWrittenBackToTheStore) {
  load({account("Nimbra", "NimbraAccount", "N")});
  migrate();
  EXPECT_EQ(device.logMessages(), std::vector<std::string>{"Replacing accounts"});
}

}  // namespace
}  // namespace migrator
