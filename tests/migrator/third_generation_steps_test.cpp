#include "tests/support/step_test.h"

namespace migrator {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using tests::account;
using tests::dataclasses;
using tests::kAbsent;

constexpr std::string_view kStatus = "hostedServiceStatus";

Dictionary cloud(std::string_view identifier, std::initializer_list<Dictionary::Entry> more) {
  return account("VorlixAccount", "KQAccount", identifier, more);
}

class PrimaryAccount : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom9A182(*store)); }
};

TEST_F(PrimaryAccount, StepLetsRemindersFollowCalendars) {
  load({account("CalDAV", "MobileCalDAVAccount", "C", {{"Enabled Dataclasses", dataclasses({"Calendars"})}}),
        account("CalDAV", "MobileCalDAVAccount", "D", {{"Enabled Dataclasses", dataclasses({})}}),
        account("Gmail", "GmailAccount", "G", {{"Enabled Dataclasses", dataclasses({"Calendars"})}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Calendars", "Reminders"));
  EXPECT_THAT(storedDataclasses(1, "Enabled Dataclasses"), IsEmpty());
  EXPECT_THAT(storedDataclasses(2, "Enabled Dataclasses"), ElementsAre("Calendars"));
}

TEST_F(PrimaryAccount, StepTakesRemindersFromCloudAccountsOfAnyOtherStatus) {
  for (const PropertyValue& status : {PropertyValue{1}, PropertyValue{0}, PropertyValue{3}, PropertyValue{"1"},
                                      PropertyValue{true}, PropertyValue{Array{2}}}) {
    load({cloud("K", {{kStatus, status}, {"Enabled Dataclasses", dataclasses({"Calendars", "Reminders"})}})});
    migrate();
    EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Calendars"));
    EXPECT_EQ(value(0, kStatus), status);
    EXPECT_TRUE(device.console->lines.empty());
  }
}

TEST_F(PrimaryAccount, StepTakesRemindersFromCloudAccountsWithoutAStatus) {
  load({cloud("K", {{"Enabled Dataclasses", dataclasses({"Calendars"})}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Calendars"));
}

TEST_F(PrimaryAccount, IsMarkedUnderTheKeyThatThePlatformNames) {
  device.systemAccount->primaryKey = "isPrimary";
  load({account("VorlixAccount", "VorlixAccount", "V", {{kStatus, 2}})});
  migrate();
  EXPECT_EQ(value(0, "isPrimary"), PropertyValue{true});
  EXPECT_EQ(value(0, "primaryAccount"), kAbsent);
}

TEST_F(PrimaryAccount, IsMarkedUnderTheKeyOfTheLaterStepsWhereThePlatformNamesNone) {
  device.systemAccount->primaryKey = std::nullopt;
  load({account("VorlixAccount", "VorlixAccount", "V", {{kStatus, 2}})});
  migrate();
  EXPECT_EQ(value(0, "primaryAccount"), PropertyValue{true});
}

TEST_F(PrimaryAccount, HasNoChildren) {
  const Array children{account("Nimbra", "NimbraAccount", "1"), account("CalDAV", "MobileCalDAVAccount", "2")};
  const Dictionary parent = cloud("K", {{kStatus, 2},
                                        {"DisplayName", "Nimbra"},
                                        {"Type String", "Nimbra"},
                                        {"Short Type String", "Nimbra"},
                                        {"Enabled Dataclasses", dataclasses({"DeviceLocator"})},
                                        {"ChildAccounts", children}});
  load({parent});
  migrate();
  Dictionary expected = parent;
  expected.set(kStatus, 1);
  EXPECT_EQ(at(0).properties(), expected);
  EXPECT_THAT(device.console->lines, ElementsAre("Found Nimbra account with status 2",
                                                 "Standard Nimbra account with status 2, reverting to status 1"));
}

TEST_F(PrimaryAccount, IsTheSeparateCloudAccountThatLocatesTheDevice) {
  const Dictionary earlier = account("VorlixAccount", "Other", "O", {{kStatus, 2}});
  load(
      {earlier,
       cloud("K", {{kStatus, 2}, {"DisplayName", "Nimbra"}, {"Enabled Dataclasses", dataclasses({"DeviceLocator"})}})});
  migrate();
  EXPECT_EQ(at(0).properties(), earlier);
  EXPECT_EQ(at(1).properties(),
            cloud("K", {{kStatus, 2},
                        {"DisplayName", "Cirrant"},
                        {"Type String", "Cirrant"},
                        {"Short Type String", "Cirrant"},
                        {"primaryAccount", true},
                        {"Enabled Dataclasses", dataclasses({"DeviceLocator", "Quorvel", "KeyValue"})}}));
  EXPECT_THAT(device.console->lines, ElementsAre("Found Nimbra account with status 2"));
}

TEST_F(PrimaryAccount, MayBeSeveralThatLocateTheDevice) {
  const Dictionary located = cloud("K", {{kStatus, "2"}, {"Enabled Dataclasses", dataclasses({"DeviceLocator"})}});
  Dictionary another = located;
  another.set("Identifier", "L");
  load({located, another});
  migrate();
  EXPECT_EQ(value(0, "primaryAccount"), PropertyValue{true});
  EXPECT_EQ(value(1, "primaryAccount"), PropertyValue{true});
}

TEST_F(PrimaryAccount, KeepsADisplayNameOfItsOwn) {
  load({cloud("K", {{kStatus, 2}, {"DisplayName", "Nimbra "}, {"ChildAccounts", Array{}}})});
  migrate();
  EXPECT_EQ(value(0, "DisplayName"), PropertyValue{"Nimbra "});
  EXPECT_EQ(value(0, "Type String"), PropertyValue{"Cirrant"});
}

TEST_F(PrimaryAccount, IsElseTheFirstCloudAccountWithItsStatus) {
  load({account("Nimbra", "NimbraAccount", "1", {{kStatus, 2}}), account("VorlixAccount", "Any", "2", {{kStatus, 1}}),
        account("VorlixAccount", "Any", "3", {{kStatus, 2}}), account("VorlixAccount", "Any", "4", {{kStatus, 2}})});
  migrate();
  for (const std::size_t other : {0U, 1U, 3U}) EXPECT_EQ(value(other, "primaryAccount"), kAbsent);
  EXPECT_EQ(value(2, "primaryAccount"), PropertyValue{true});
  EXPECT_THAT(storedDataclasses(2, "Enabled Dataclasses"), ElementsAre("Quorvel", "KeyValue"));
  EXPECT_EQ(value(2, "Type String"), kAbsent);
}

TEST_F(PrimaryAccount, IsElseTheFirstWithItsStatusWhateverOtherCloudAccountsStandBefore) {
  const Dictionary separate = account("VorlixAccount", "Any", "V", {{kStatus, 2}});
  const Array children{account("Nimbra", "NimbraAccount", "1")};
  for (const Dictionary& before :
       {cloud("K", {{kStatus, 1}}), cloud("K", {{kStatus, 2}, {"ChildAccounts", children}})}) {
    load({before, separate});
    migrate();
    EXPECT_EQ(value(0, "primaryAccount"), kAbsent);
    EXPECT_EQ(value(1, "primaryAccount"), PropertyValue{true});
  }
}

TEST_F(PrimaryAccount, MayBeASeparateCloudAccountThatDoesNotLocateTheDevice) {
  load({cloud("K", {{kStatus, 2}})});
  migrate();
  EXPECT_EQ(value(0, "primaryAccount"), PropertyValue{true});
  EXPECT_EQ(value(0, "Type String"), PropertyValue{"Cirrant"});
}

TEST_F(PrimaryAccount, IsNotOneThatWasSetBackBefore) {
  load({cloud("K", {{kStatus, 2}, {"ChildAccounts", Array{account("Nimbra", "NimbraAccount", "1")}}})});
  migrate();
  EXPECT_EQ(value(0, "primaryAccount"), kAbsent);
}

TEST_F(PrimaryAccount, StepVisitsChildrenWithoutTheirEditsReachingTheFile) {
  const Dictionary child = account("VorlixAccount", "KQAccount", "Child", {{kStatus, 2}});
  load({account("VorlixAccount", "Any", "P", {{"ChildAccounts", Array{child}}})});
  migrate();
  EXPECT_THAT(device.console->lines, testing::Contains("Found Nimbra account with status 2"));
  EXPECT_EQ(value(0, "ChildAccounts"), (PropertyValue{Array{child}}));
  EXPECT_EQ(savedAccounts(), (Array{account("VorlixAccount", "Any", "P", {{"ChildAccounts", Array{child}}})}));
}

TEST_F(PrimaryAccount, StepMarksNothingOfOtherClasses) {
  const Dictionary hosted =
      account("Nimbra", "NimbraAccount", "N",
              {{kStatus, 2}, {"DisplayName", "Nimbra"}, {"Enabled Dataclasses", dataclasses({"DeviceLocator"})}});
  load({hosted});
  migrate();
  EXPECT_EQ(at(0).properties(), hosted);
}

class SecondaryAccounts : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom9A334(*store)); }
};

constexpr const char* kFixingSecondary =
    "AccountsDataMigrator: Fixing secondary account with quorvel and keyvalue enabled";

TEST_F(SecondaryAccounts, LoseDocumentsAndKeyValueTogether) {
  for (const auto& enabled : {dataclasses({"Mail", "KeyValue"}), dataclasses({"Quorvel", "Mail"}),
                              dataclasses({"Quorvel", "KeyValue", "Mail"})}) {
    load({account("Nimbra", "NimbraAccount", "N", {{"Enabled Dataclasses", enabled}})});
    migrate();
    EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail"));
    EXPECT_THAT(device.console->lines, ElementsAre(kFixingSecondary));
  }
}

TEST_F(SecondaryAccounts, AreAllThatAreNotSaidToBePrimary) {
  const std::vector<std::pair<PropertyValue, bool>> cases{
      {true, true}, {1, true}, {"yes", true}, {false, false}, {0, false}, {"no", false}, {Array{true}, false}};
  for (const auto& [primary, keepsDocuments] : cases) {
    load({account("VorlixAccount", "Any", "V",
                  {{"primaryAccount", primary}, {"Enabled Dataclasses", dataclasses({"Quorvel"})}})});
    migrate();
    EXPECT_EQ(isEnabled(0, "Quorvel"), keepsDocuments);
  }
}

TEST_F(SecondaryAccounts, WithoutDocumentsAreNotTouched) {
  const Array untouched{
      account("VorlixAccount", "Any", "V", {{"Enabled Dataclasses", dataclasses({"Mail"})}}),
      account("Nimbra", "NimbraAccount", "N"),
      account("CalDAV", "KQAccount", "C", {{"Enabled Dataclasses", dataclasses({"Quorvel"})}, {kStatus, 2}})};
  load(untouched);
  migrate();
  EXPECT_TRUE(device.console->lines.empty());
  EXPECT_EQ(savedAccounts(), untouched);
}

TEST_F(SecondaryAccounts, WithDocumentsThatAreNotProvisionedKeepThemStored) {
  const Dictionary stored =
      account("VorlixAccount", "Any", "V",
              {{"Enabled Dataclasses", dataclasses({"Quorvel"})}, {"Provisioned Dataclasses", dataclasses({"Mail"})}});
  load({stored});
  migrate();
  EXPECT_EQ(at(0).properties(), stored);
}

TEST_F(SecondaryAccounts, StepSetsBackTheStatusOfCloudAccountsWithHostedMail) {
  load({cloud("K", {{kStatus, 2}, {"ChildAccounts", Array{"odd", account("Nimbra", "NimbraAccount", "1")}}}),
        cloud("L", {{kStatus, 2}, {"ChildAccounts", Array{account("CalDAV", "C", "2")}}}),
        account("VorlixAccount", "Any", "V", {{kStatus, 2}, {"ChildAccounts", Array{account("Nimbra", "N", "3")}}})});
  migrate();
  EXPECT_EQ(value(0, kStatus), PropertyValue{1});
  EXPECT_EQ(value(1, kStatus), PropertyValue{2});
  EXPECT_EQ(value(2, kStatus), PropertyValue{2});
  EXPECT_THAT(device.console->lines,
              ElementsAre("AccountsDataMigrator: Found Nimbra mail as Cirrant child account, setting status to 1"));
}

class Provisioning : public SecondaryAccounts {};

TEST_F(Provisioning, FollowsTheChildrenOfCloudAccounts) {
  load({cloud("K", {{"Provisioned Dataclasses", dataclasses({"Contacts"})},
                    {"ChildAccounts", Array{account("CalDAV", "C", "1"), account("Nimbra", "N", "2")}}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Provisioned Dataclasses"), ElementsAre("Mail", "Contacts", "Calendars"));
  EXPECT_THAT(device.console->lines,
              ElementsAre("AccountsDataMigrator: Enabling provisioning for dataclass com.vorlix.Dataclass.Mail",
                          "AccountsDataMigrator: Enabling provisioning for dataclass com.vorlix.Dataclass.Calendars"));
}

TEST_F(Provisioning, AddsNothingTheSecondTime) {
  load({cloud("K", {{"Provisioned Dataclasses", dataclasses({"Contacts"})},
                    {"ChildAccounts", Array{account("CalDAV", "C", "1")}}})});
  migrate();
  const Dictionary once = at(0).properties();
  device.console->lines.clear();
  migrate();
  EXPECT_EQ(at(0).properties(), once);
  EXPECT_TRUE(device.console->lines.empty());
}

TEST_F(Provisioning, IsCompleteWhereNoListIsStored) {
  const Dictionary whole =
      cloud("K", {{"ChildAccounts", Array{account("CalDAV", "C", "1"), account("Nimbra", "N", "2")}}});
  load({whole});
  migrate();
  EXPECT_EQ(at(0).properties(), whole);
}

TEST_F(Provisioning, FollowsNoChildOfAnotherKind) {
  const Dictionary odd =
      cloud("K", {{"Provisioned Dataclasses", dataclasses({"Contacts"})},
                  {"ChildAccounts", Array{"CalDAV", account("caldav", "C", "1"), Dictionary{{"Type", 1}}}}});
  load({odd});
  migrate();
  EXPECT_EQ(at(0).properties(), odd);
}

TEST_F(Provisioning, AsksForChildrenByTheirExactType) {
  load({cloud("K", {{"ChildAccounts", Array{account("CalDAV", "C", "1")}}}), cloud("L", {{"ChildAccounts", "CalDAV"}}),
        cloud("M", {{"ChildAccounts", Array{}}}), cloud("N", {})});
  EXPECT_TRUE(AccountsDataMigrator::_account_hasChildAccountOfType(at(0), "CalDAV"));
  EXPECT_FALSE(AccountsDataMigrator::_account_hasChildAccountOfType(at(0), "CardDAV"));
  for (const std::size_t place : {1U, 2U, 3U}) {
    EXPECT_FALSE(AccountsDataMigrator::_account_hasChildAccountOfType(at(place), "CalDAV"));
  }
}

class Passes : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom9B176(*store)); }
  void loadPrimary(const Array& provisioned, const Array& enabled) {
    load({account(
        "VorlixAccount", "Any", "V",
        {{"primaryAccount", true}, {"Provisioned Dataclasses", provisioned}, {"Enabled Dataclasses", enabled}})});
  }
};

constexpr const char* kProvisioningPasses = "AccountsDataMigrator: Provisioning Tickora data class in primary account";
constexpr const char* kEnablingPasses = "AccountsDataMigrator: Enabling Tickora data class in primary account";

TEST_F(Passes, AreProvisionedAndEnabledWithDocuments) {
  loadPrimary(dataclasses({"Quorvel", "Mail"}), dataclasses({"Quorvel"}));
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Provisioned Dataclasses"), ElementsAre("Mail", "Quorvel", "Tickora"));
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Quorvel", "Tickora"));
  EXPECT_THAT(device.console->lines, ElementsAre(kProvisioningPasses, kEnablingPasses));
}

TEST_F(Passes, AreOnlyProvisionedWhereDocumentsAreOff) {
  loadPrimary(dataclasses({"Quorvel"}), dataclasses({"Mail"}));
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Provisioned Dataclasses"), ElementsAre("Quorvel", "Tickora"));
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail"));
  EXPECT_THAT(device.console->lines, ElementsAre(kProvisioningPasses));
}

TEST_F(Passes, AreOnlyEnabledWhereTheyAreProvisioned) {
  loadPrimary(dataclasses({"Quorvel", "Tickora"}), dataclasses({"Quorvel"}));
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Provisioned Dataclasses"), ElementsAre("Quorvel", "Tickora"));
  EXPECT_TRUE(isEnabled(0, "Tickora"));
  EXPECT_THAT(device.console->lines, ElementsAre(kEnablingPasses));
}

TEST_F(Passes, AreNotForAccountsWithoutDocuments) {
  loadPrimary(dataclasses({"Mail"}), dataclasses({"Quorvel", "Mail"}));
  const Dictionary before = at(0).properties();
  migrate();
  EXPECT_EQ(at(0).properties(), before);
  EXPECT_TRUE(device.console->lines.empty());
}

TEST_F(Passes, AreNotForSecondaryAccounts) {
  const Dictionary secondary = account("VorlixAccount", "Any", "V",
                                       {{"Enabled Dataclasses", dataclasses({"Quorvel"})}, {"primaryAccount", false}});
  load({secondary});
  migrate();
  EXPECT_EQ(at(0).properties(), secondary);
}

TEST_F(Passes, ArePreparedForATypeThatDoesNotYetSupportThem) {
  load({account("Nimbra", "NimbraAccount", "N",
                {{"primaryAccount", true}, {"Enabled Dataclasses", dataclasses({"Quorvel"})}})});
  migrate();
  EXPECT_THAT(storedDataclasses(0, "Provisioned Dataclasses"), testing::Contains("Tickora"));
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Quorvel"));
}

TEST_F(Passes, ReachTheFile) {
  loadPrimary(dataclasses({"Quorvel"}), dataclasses({"Quorvel"}));
  migrate();
  EXPECT_EQ(savedAccounts(), (Array{at(0).properties()}));
}

TEST_F(Passes, StepTellsTheBrowserOncePerAccountWithBookmarks) {
  const Array bookmarks = dataclasses({"Bookmarks"});
  load({account("VorlixAccount", "Any", "1", {{"Enabled Dataclasses", bookmarks}}),
        account("Nimbra", "NimbraAccount", "2", {{"Enabled Dataclasses", bookmarks}, {"primaryAccount", true}}),
        account("VorlixAccount", "Any", "3"), account("BookmarkDAV", "B", "4", {{"Enabled Dataclasses", bookmarks}})});
  migrate();
  EXPECT_EQ(std::ranges::count(device.outputs, "tabs on"), 2);
}

}  // namespace
}  // namespace migrator
