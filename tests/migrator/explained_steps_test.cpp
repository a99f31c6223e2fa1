// What a run's observer is told of the version steps and of the legacy conversions.

#include <gmock/gmock.h>

#include "migrator/version_chain.h"
#include "tests/support/fact_recorder.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using testing::Contains;
using testing::ElementsAre;
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

TEST_F(ExplainedConversions, TellOfAFileThatCannotBeRead) {
  load({});
  device.files->put(accountsettings::mailAccountsPath(), "no property list");
  static_cast<void>(migrator._migrateMailAccounts(*store));
  EXPECT_THAT(recorder->lines(), ElementsAre(StartsWith("lost (unreadable-legacy-file: ")));
}

}  // namespace
}  // namespace migrator
