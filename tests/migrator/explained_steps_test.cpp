// What a run's observer is told of the version steps and of the legacy conversions.

#include <gmock/gmock.h>

#include "migrator/legacy_conversion.h"
#include "migrator/version_chain.h"
#include "tests/support/fact_recorder.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using testing::AllOf;
using testing::Contains;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using tests::account;
using tests::FactRecorder;

class ExplainedSteps : public tests::StepTest {
 protected:
  ExplainedSteps() { device.setObserver(recorder); }

  // The facts of one stage.
  [[nodiscard]] std::vector<std::string> told(std::string_view stage) const {
    std::vector<std::string> lines;
    for (std::size_t place = 0; place < recorder->facts.size(); ++place) {
      if (recorder->stages[place] == stage) lines.push_back(tests::lineOf(recorder->facts[place]));
    }
    return lines;
  }

  std::shared_ptr<FactRecorder> recorder = std::make_shared<FactRecorder>();
};

TEST_F(ExplainedSteps, TellWhatTheyChangedUnderTheirOwnNames) {
  load({account("Nimbra", "NimbraAccount", "N")}, 3);
  store->allBasicAccounts()[0]->setAccountProperty_forKey(tests::dataclasses({"Mail", "Notes"}), "Enabled Dataclasses");
  store->tellChanges();
  ASSERT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_THAT(
      told("_migrateAccountsFrom7A241:"),
      ElementsAre("changed N: Enabled Dataclasses (\"com.vorlix.Dataclass.Mail\", \"com.vorlix.Dataclass.Notes\") "
                  "-> (\"com.vorlix.Dataclass.Mail\")"));
  EXPECT_THAT(told("_migrateAccountsFrom7A242:"), Not(Contains(StartsWith("added"))));
}

TEST_F(ExplainedSteps, TellThatMailWentUnderANewParent) {
  load({account("Nimbra", "NimbraAccount", "N")}, 6);
  ASSERT_TRUE(migrator._migrateNewAccountsInfo(*store));
  const std::string parent = store->allBasicAccounts()[0]->identifier()->string();
  EXPECT_THAT(told("_migrateAccountsFrom8B117:"),
              ElementsAre("added " + parent, "moved N in " + parent + " into " + parent));
}

TEST_F(ExplainedSteps, TellIntoWhichMailAccountACalendarWasFolded) {
  const Dictionary principal{{"Login_Key", "jane"}, {"CalDAV_Server_Key", "www.google.com"}};
  const Dictionary configuration{{"CalDAV_PrincipalPath_Key", "/calendar/dav/jane/user"}};
  load({account("Mail", "GmailAccount", "G", {{"Username", "jane"}}),
        account("CalDAV", "MobileCalDAVAccount", "C",
                {{"CalDAVPrincipalConfiguration", principal}, {"CalDAVAccountConfiguration", configuration}})},
       4);
  ASSERT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_THAT(told("_migrateAccountsFrom7A242:"),
              Contains("folded C into G (the same user's calendars at the same service)"));
}

struct FailingMigrator {
  bool fail(AccountsManager&) { return false; }
};

TEST_F(ExplainedSteps, TellWhichOfThemFailed) {
  load({account("LDAP", "LDAPAccount", "L")}, 4);
  FailingMigrator failing;
  const VersionStep<FailingMigrator, AccountsManager> step{4, "_step:", "what it does", &FailingMigrator::fail};
  EXPECT_FALSE(runAsStage(failing, step, *store));
  EXPECT_THAT(told("_step:"), ElementsAre("lost (failed-step: _step: version 4 to 5: what it does)"));
}

class ExplainedConversions : public ExplainedSteps {
 protected:
  // What is told of a legacy mail file with this content.
  std::vector<std::string> toldOf(const Dictionary& file) {
    load({});
    device.put(accountsettings::mailAccountsPath(), file);
    static_cast<void>(migrator._migrateMailAccounts(*store));
    return recorder->lines();
  }
};

TEST_F(ExplainedConversions, TellOfEachAccountOfAFileOfWhichOneIsRefused) {
  const Dictionary good{{"AccountType", "IMAPAccount"}, {"uniqueId", "G"}};
  const std::string of = " of " + accountsettings::mailAccountsPath();
  EXPECT_THAT(toldOf({{"DeliveryAccounts", Array{good}}, {"MailAccounts", Array{good, Dictionary{{"uniqueId", "B"}}}}}),
              ElementsAre("lost G (refused-file: MailAccounts[0]" + of + ")",
                          "lost B (refused-description: MailAccounts[1]" + of + ")",
                          "lost G (refused-file: DeliveryAccounts[0]" + of + ")"));
}

TEST_F(ExplainedConversions, TellOfEachIncomingAccountBesideARefusedDeliveryAccount) {
  const std::string of = " of " + accountsettings::mailAccountsPath();
  EXPECT_THAT(toldOf({{"DeliveryAccounts", Array{Dictionary{{"AccountType", ""}, {"uniqueId", "D"}}}},
                      {"MailAccounts", Array{Dictionary{{"AccountType", "IMAPAccount"}, {"uniqueId", "G"}}}}}),
              ElementsAre("lost D (refused-description: DeliveryAccounts[0]" + of + ")",
                          "lost G (refused-file: MailAccounts[0]" + of + ")"));
}

TEST_F(ExplainedConversions, TellWhatBecameOfADeliveryAccountAndOfOneThatIsNoDictionary) {
  toldOf({{"DeliveryAccounts", Array{Dictionary{{"AccountType", "DeliveryAccount"}, {"uniqueId", "D"}}, "odd"}}});
  store->tellChanges();
  const std::string of = " of " + accountsettings::mailAccountsPath() + ")";
  EXPECT_THAT(recorder->lines(),
              ElementsAre(AllOf(StartsWith("converted D: AccountType now Class \"DeliveryAccount\", uniqueId now "),
                                EndsWith("(DeliveryAccounts[0]" + of)),
                          AllOf(HasSubstr(": +Type \"SMTP\", +Class \"SMTPAccount\", "),
                                EndsWith("(DeliveryAccounts[1]" + of))));
}

TEST_F(ExplainedConversions, TellOfARefusedElementThatIsNoDictionaryWhereItStood) {
  EXPECT_THAT(toldOf({{"MailAccounts", Array{"odd"}}}), ElementsAre("lost (refused-description: MailAccounts[0] of " +
                                                                    accountsettings::mailAccountsPath() + ")"));
}

TEST_F(ExplainedConversions, TellOfAFileThatCannotBeRead) {
  load({});
  device.files->put(accountsettings::mailAccountsPath(), "no property list");
  static_cast<void>(migrator._migrateMailAccounts(*store));
  EXPECT_THAT(recorder->lines(), ElementsAre(StartsWith("lost (unreadable-legacy-file: ")));
}

TEST_F(ExplainedConversions, TellFromWhatEachAccountWasMade) {
  const Dictionary one{{"AccountType", "IMAPAccount"}, {"uniqueId", "1"}};
  const Dictionary two{{"AccountType", "IMAPAccount"}, {"uniqueId", "2"}};
  toldOf({{"MailAccounts", Array{one, two}}});
  store->tellChanges();
  const std::string of = " of " + accountsettings::mailAccountsPath() + ")";
  EXPECT_THAT(recorder->lines(), ElementsAre(AllOf(StartsWith("converted 1: "), EndsWith("(MailAccounts[0]" + of)),
                                             AllOf(StartsWith("converted 2: "), EndsWith("(MailAccounts[1]" + of))));
}

TEST_F(ExplainedConversions, TellFromWhatEachExchangeAccountWasMade) {
  load({});
  device.put(accountsettings::daAccountPath(),
             {{"DAAccountsKey", Array{Dictionary{{"DAAccountConfigurationClass", "ASAccount"},
                                                 {"DAAccountConfigurationAccountID", "E"}}}}});
  ASSERT_TRUE(migrator._migrateDAAccounts(*store));
  store->tellChanges();
  EXPECT_THAT(recorder->lines(),
              ElementsAre(AllOf(StartsWith("converted E: "),
                                EndsWith("(DAAccountsKey[0] of " + accountsettings::daAccountPath() + ")"))));
}

// What is told of legacy files whose removal was interrupted: they go without being converted again.
class ExplainedRemovals : public ExplainedSteps {
 protected:
  static Dictionary synced(std::string_view identifier) {
    return account("Mail", "IMAPAccount", "of " + std::string{identifier}, {{"Sync Identifier", identifier}});
  }
  static Array described(std::string_view key, std::initializer_list<std::string_view> identifiers) {
    Array descriptions;
    for (const std::string_view identifier : identifiers) descriptions.emplace_back(Dictionary{{key, identifier}});
    return descriptions;
  }
  std::vector<std::string> told() {
    tellUnsavedExchange();
    tellUnsavedMail();
    return recorder->lines();
  }
};

TEST_F(ExplainedRemovals, TellOfEachLegacyAccountThatTheSettingsDoNotHold) {
  const Dictionary parent = account("VorlixAccount", "KQAccount", "P", {{"ChildAccounts", Array{synced("CHILD")}}});
  putSettings({{"Accounts", Array{"no record", synced("SAVED"), parent}}});
  device.put(accountsettings::daAccountPath(),
             {{"DAAccountsKey", described("DAAccountConfigurationAccountID", {"CHILD", "E"})}});
  device.put(accountsettings::mailAccountsPath(), {{"DeliveryAccounts", described("uniqueId", {"D"})},
                                                   {"MailAccounts", described("uniqueId", {"SAVED", "M", "SAVED"})}});
  const std::string of = " of " + accountsettings::mailAccountsPath() + ")";
  EXPECT_THAT(told(),
              ElementsAre("lost E (not-saved: DAAccountsKey[1] of " + accountsettings::daAccountPath() + ")",
                          "lost D (not-saved: DeliveryAccounts[0]" + of, "lost M (not-saved: MailAccounts[1]" + of,
                          "lost SAVED (not-saved: MailAccounts[2]" + of));
}

TEST_F(ExplainedRemovals, TellOfLegacyFilesAsTheSourcesThatTheyAre) {
  device.put(accountsettings::daAccountPath(), {});
  device.put(accountsettings::mailAccountsPath(), {});
  migrator._removeOldAccountsInfo();
  EXPECT_THAT(recorder->lines(), Contains("source-removed").Times(2));
}

TEST_F(ExplainedRemovals, TellOfALegacyFileThatIsStillThere) {
  device.put(accountsettings::daAccountPath(), {});
  device.files->failing.insert("remove " + accountsettings::daAccountPath());
  migrator._foundOldDAAccountsToMigrate = true;
  migrator._removeOldAccountsInfo();
  EXPECT_THAT(recorder->lines(), Contains("file-not-removed (Could not remove " + accountsettings::daAccountPath() +
                                          ": Input/output error (errno 5))"));
}

TEST_F(ExplainedRemovals, TellNothingOfFilesThatAreNotThere) { EXPECT_THAT(told(), ElementsAre()); }

TEST_F(ExplainedRemovals, ReadNothingWhereNobodyWantsToKnow) {
  device.put(accountsettings::daAccountPath(), {});
  device.put(accountsettings::mailAccountsPath(), {});
  device.setObserver(nullptr);
  device.propertyLists->reads.clear();
  EXPECT_THAT(told(), ElementsAre());
  EXPECT_THAT(device.propertyLists->reads, ElementsAre());
}

}  // namespace
}  // namespace migrator
