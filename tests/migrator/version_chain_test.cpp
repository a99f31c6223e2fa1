#include "migrator/version_chain.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <vector>

#include "tests/support/fake_platform.h"

namespace migrator {
namespace {

struct Record {
  std::vector<std::string> runs;
};

class ThreeReleases {
 public:
  bool first(Record& record) { return note(record, "first"); }
  bool second(Record& record) { return note(record, "second"); }
  bool third(Record& record) { return note(record, "third"); }

  std::string failing;

 private:
  bool note(Record& record, const std::string& step) const {
    record.runs.push_back(step);
    return step != failing;
  }
};

using Step = VersionStep<ThreeReleases, Record>;
constexpr std::array<Step, 3> kChain{{{4, "first", "", &ThreeReleases::first},
                                      {5, "second", "", &ThreeReleases::second},
                                      {6, "third", "", &ThreeReleases::third}}};

class VersionChain : public testing::Test {
 protected:
  bool run(std::uint64_t version) {
    return runVersionSteps(std::span{kChain}, version,
                           [this](const Step& step) { return (releases.*step.run)(record); });
  }

  tests::FakeDevice device;
  ThreeReleases releases;
  Record record;
};

TEST_F(VersionChain, RunsTheStepOfTheStoredVersionAndEveryLaterOneInOrder) {
  EXPECT_TRUE(run(4));
  EXPECT_EQ(record.runs, (std::vector<std::string>{"first", "second", "third"}));
}

TEST_F(VersionChain, IsEnteredInTheMiddle) {
  EXPECT_TRUE(run(6));
  EXPECT_EQ(record.runs, std::vector<std::string>{"third"});
}

TEST_F(VersionChain, EndsWithTheFirstStepThatAnswersFalse) {
  releases.failing = "second";
  EXPECT_FALSE(run(4));
  EXPECT_EQ(record.runs, (std::vector<std::string>{"first", "second"}));
}

TEST_F(VersionChain, AnswersWhatTheLastStepAnswers) {
  releases.failing = "third";
  EXPECT_FALSE(run(6));
}

TEST(LeadingTo, AVersionTakesAStepForEachBeforeItInOrder) {
  const Step none{0, "", "", nullptr};
  const Step first{1, "", "", nullptr};
  const Step second{2, "", "", nullptr};
  EXPECT_TRUE(leadsTo(3, std::array{none, first, second}));
  EXPECT_FALSE(leadsTo(2, std::array{none, first, second}));
  EXPECT_FALSE(leadsTo(4, std::array{none, first, second}));
  EXPECT_FALSE(leadsTo(3, std::array{none, second, first}));
  EXPECT_FALSE(leadsTo(2, std::array{first, second}));
}

TEST_F(VersionChain, RefusesAVersionWithoutAStep) {
  EXPECT_FALSE(run(3));
  EXPECT_FALSE(run(7));
  EXPECT_TRUE(record.runs.empty());
}

}  // namespace
}  // namespace migrator
