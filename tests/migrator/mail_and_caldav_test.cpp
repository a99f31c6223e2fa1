#include <stdexcept>

#include "tests/support/step_test.h"

namespace migrator {
namespace {

using testing::ElementsAre;
using tests::account;
using tests::kAbsent;

class MailAndCalDAV : public tests::StepTest {
 protected:
  void migrate() { EXPECT_TRUE(migrator._migrateAccountsFrom7A242(*store)); }

  static Dictionary googlePartner(std::string_view identifier, std::string_view user) {
    const std::string path = "/calendar/dav/" + std::string{user} + "/user";
    return account(
        "CalDAV", "MobileCalDAVAccount", identifier,
        {{"CalDAVPrincipalConfiguration", Dictionary{{"Login_Key", user}, {"CalDAV_Server_Key", "www.google.com"}}},
         {"CalDAVAccountConfiguration", Dictionary{{"CalDAV_PrincipalPath_Key", path}}}});
  }
  static Dictionary gmail(std::string_view identifier, std::string_view user) {
    return account("Mail", "GmailAccount", identifier, {{"Username", user}});
  }
};

TEST_F(MailAndCalDAV, SwitchesMailAndNotesOnForFiveClassesOfMail) {
  for (const std::string_view mailClass :
       {"IMAPAccount", "GmailAccount", "YahooAccount", "AOLAccount", "NimbraAccount"}) {
    load({account("Mail", mailClass, "M")});
    migrate();
    EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail", "Notes")) << mailClass;
  }
}

TEST_F(MailAndCalDAV, LeavesOtherClassesAsTheyAre) {
  for (const std::string_view other : {"POPAccount", "WexmoAccount", "LocalAccount", "imapaccount", "IMAPAccountX"}) {
    load({account("Exchange", other, "M")});
    migrate();
    EXPECT_EQ(at(0).properties(), account("Exchange", other, "M"));
  }
}

TEST_F(MailAndCalDAV, LeavesAnAccountThatHasLostItsClassAsItIs) {
  load({gmail("G", "jane")});
  at(0)._forcedSetAccountProperty_forKey(5, "Class");
  migrate();
  EXPECT_EQ(at(0).type(), Text{"Mail"});
  EXPECT_EQ(value(0, "Enabled Dataclasses"), kAbsent);
}

TEST_F(MailAndCalDAV, TakesAnAccountForActiveThatDoesNotSayOtherwise) {
  const std::vector<std::pair<PropertyValue, bool>> cases{{true, true},  {false, false}, {1, true},      {0, false},
                                                          {"YES", true}, {"no", false},  {Array{}, true}};
  for (const auto& [isActive, isSwitchedOn] : cases) {
    load({account("Mail", "IMAPAccount", "M", {{"IsActive", isActive}})});
    migrate();
    EXPECT_EQ(value(0, "Enabled Dataclasses") != kAbsent, isSwitchedOn);
    EXPECT_EQ(value(0, "IsActive"), isActive);
  }
}

TEST_F(MailAndCalDAV, GivesGmailAndYahooTypesOfTheirOwn) {
  load({account("Mail", "GmailAccount", "G"), account("Mail", "YahooAccount", "Y", {{"IsActive", false}}),
        account("Mail", "AOLAccount", "A")});
  migrate();
  EXPECT_EQ(at(0).type(), Text{"Gmail"});
  EXPECT_EQ(at(1).type(), Text{"Yahoo"});
  EXPECT_EQ(at(2).type(), Text{"Mail"});
  EXPECT_EQ(value(1, "Enabled Dataclasses"), kAbsent);
}

TEST_F(MailAndCalDAV, FoldsAPartnerIntoItsUmbrella) {
  load({googlePartner("C", "jane"), gmail("G", "jane@example")});
  migrate();
  ASSERT_EQ(store->count(), 1U);
  EXPECT_EQ(value(0, "Identifier"), PropertyValue{"G"});
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Mail", "Notes", "Calendars"));
}

TEST_F(MailAndCalDAV, FoldsAPartnerIntoAYahooAccountToo) {
  const Dictionary principal{{"Login_Key", "joe"}, {"CalDAV_Server_Key", "caldav.calendar.yahoo.com"}};
  const Dictionary configuration{{"CalDAV_PrincipalPath_Key", "/principals/users/joe"}};
  load({account("CalDAV", "MobileCalDAVAccount", "C",
                {{"CalDAVPrincipalConfiguration", principal}, {"CalDAVAccountConfiguration", configuration}}),
        account("Mail", "YahooAccount", "Y", {{"Username", "joe"}})});
  migrate();
  ASSERT_EQ(store->count(), 1U);
  EXPECT_EQ(value(0, "Identifier"), PropertyValue{"Y"});
}

TEST_F(MailAndCalDAV, FoldsAPartnerIntoAnInactiveUmbrella) {
  Dictionary inactive = gmail("G", "jane@example");
  inactive.set("IsActive", false);
  load({inactive, googlePartner("C", "jane")});
  migrate();
  ASSERT_EQ(store->count(), 1U);
  EXPECT_EQ(at(0).type(), Text{"Gmail"});
  EXPECT_THAT(storedDataclasses(0, "Enabled Dataclasses"), ElementsAre("Calendars"));
}

TEST_F(MailAndCalDAV, FoldsEveryPartnerOfAnUmbrella) {
  load({gmail("G", "jane@example"), googlePartner("C", "jane"), googlePartner("D", "jane")});
  migrate();
  EXPECT_EQ(store->count(), 1U);
}

TEST_F(MailAndCalDAV, DeletesPartnersInTheOrderOfTheStoreWhateverTheirLogins) {
  Dictionary ofWholeName = googlePartner("D", "jane");
  ofWholeName.set("CalDAVPrincipalConfiguration",
                  Dictionary{{"Login_Key", "jane@example"}, {"CalDAV_Server_Key", "www.google.com"}});
  load({gmail("G", "jane@example"), googlePartner("C", "jane"), ofWholeName});
  migrate();
  const std::vector<std::string> messages = device.logMessages();
  ASSERT_EQ(messages.size(), 2U);
  EXPECT_THAT(messages[0], testing::HasSubstr("Identifier = \"C\""));
  EXPECT_THAT(messages[1], testing::HasSubstr("Identifier = \"D\""));
}

TEST_F(MailAndCalDAV, DeletesAPartnerOfTwoUmbrellasTwice) {
  load({gmail("G", "jane@example"), gmail("H", "jane@elsewhere"), googlePartner("C", "jane")});
  migrate();
  ASSERT_EQ(store->count(), 2U);
  EXPECT_TRUE(isEnabled(0, "Calendars"));
  EXPECT_TRUE(isEnabled(1, "Calendars"));
  const std::vector<std::string> messages = device.logMessages();
  EXPECT_EQ(std::ranges::count_if(messages, [](const auto& text) { return text.starts_with("Deleting account: "); }),
            2);
}

TEST_F(MailAndCalDAV, DeletesManyPartnersOnceForEachOfManyUmbrellas) {
  constexpr std::size_t kEach = 60;
  Array accounts;
  for (std::size_t number = 0; number < kEach; ++number) {
    accounts.emplace_back(gmail("G" + std::to_string(number), "jane"));
    accounts.emplace_back(googlePartner("C" + std::to_string(number), "jane"));
  }
  load(accounts);
  migrate();
  EXPECT_EQ(store->count(), kEach);
  EXPECT_EQ(device.logMessages().size(), kEach * kEach);
}

TEST_F(MailAndCalDAV, RefusesMorePairsThanAnyDeviceHas) {
  Array accounts;
  for (int number = 0; number < 101; ++number) {
    accounts.emplace_back(gmail("G" + std::to_string(number), "jane"));
    accounts.emplace_back(googlePartner("C" + std::to_string(number), "jane"));
  }
  load(accounts);
  try {
    migrator._migrateAccountsFrom7A242(*store);
    FAIL();
  } catch (const std::runtime_error& refusal) {
    EXPECT_STREQ(
        refusal.what(),
        "It is refused as hostile: it has 10100 pairs of a mail account and its calendar account, and no device "
        "has more than 10000");
  }
  EXPECT_EQ(store->count(), 202U);
}

TEST_F(MailAndCalDAV, KeepsACalDAVAccountThatLacksWhatWouldTellWhoseItIs) {
  const auto calendars = [](const Dictionary& principal, const Dictionary& configuration) {
    return account("CalDAV", "MobileCalDAVAccount", "C",
                   {{"CalDAVPrincipalConfiguration", principal}, {"CalDAVAccountConfiguration", configuration}});
  };
  const Dictionary path{{"CalDAV_PrincipalPath_Key", "/calendar/dav/jane/user"}};
  load({gmail("G", "jane"), calendars({{"Login_Key", "jane"}}, path),
        calendars({{"CalDAV_Server_Key", "www.google.com"}}, path),
        calendars({{"Login_Key", "jane"}, {"CalDAV_Server_Key", "www.google.com"}}, {})});
  migrate();
  EXPECT_EQ(store->count(), 4U);
}

TEST_F(MailAndCalDAV, KeepsACalDAVAccountThatBelongsToNobody) {
  const Dictionary stranger = googlePartner("C", "john");
  Dictionary ofAnotherClass = googlePartner("D", "jane");
  ofAnotherClass.set("Class", "OtherCalDAVAccount");
  load({stranger, gmail("G", "jane@example"), ofAnotherClass,
        account("Mail", "AOLAccount", "A", {{"Username", "john"}})});
  migrate();
  ASSERT_EQ(store->count(), 4U);
  EXPECT_EQ(at(0).properties(), stranger);
  EXPECT_EQ(at(2).properties(), ofAnotherClass);
  EXPECT_FALSE(isEnabled(1, "Calendars"));
}

TEST_F(MailAndCalDAV, EditsInPlaceAndWritesNoListBack) {
  load({gmail("G", "jane")});
  migrate();
  EXPECT_TRUE(device.logMessages().empty());
}

}  // namespace
}  // namespace migrator
