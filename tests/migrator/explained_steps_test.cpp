// What a run's observer is told of the version steps and of the legacy conversions.

#include <gmock/gmock.h>

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
  store->_tellChanges();
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

}  // namespace
}  // namespace migrator
