#include "host/run_shares.h"

#include <gtest/gtest.h>

#include <utility>

namespace tests {
namespace {

using host::RunShares;

class SharesOfARun : public ::testing::Test {
 protected:
  SharesOfARun() { shares.expect(2); }
  void stage(std::string_view name, std::string_view words = {}) { shares.stageBegan(name, words); }
  void load() {
    stage("load");
    shares.stageEnded();
  }
  RunShares shares;
};

TEST_F(SharesOfARun, GrowFromStageToStageUpToTheWhole) {
  double before = 0;
  const auto grows = [&] { return std::exchange(before, shares.progress().share) < shares.progress().share; };
  load();
  stage("version steps");
  for (const char* const words : {"version 1 to 2: one", "version 2 to 3: two"}) {
    stage("_step:", words);
    EXPECT_TRUE(grows()) << words;
    shares.stageEnded();
  }
  shares.stageEnded();
  stage("save");
  EXPECT_TRUE(grows());
  EXPECT_DOUBLE_EQ(shares.progress().upTo, 1);
}

TEST_F(SharesOfARun, GrowWithTheAccountsThatAreCountedAndStayWithinTheStage) {
  stage("load");
  const double before = shares.progress().share;
  shares.progressed(512, 1000);
  EXPECT_GT(shares.progress().share, before);
  shares.progressed(1000, 1000);
  EXPECT_LT(shares.progress().share, shares.progress().upTo);
}

TEST_F(SharesOfARun, SayInWordsWhatTheRunIsAt) {
  stage("version steps");
  stage("_step:", "version 2 to 3: two");
  EXPECT_EQ(shares.progress().what, "version 2 to 3: two");
  stage("save");
  shares.progressed(256, 1000);
  EXPECT_EQ(shares.progress().what, "save within version 2 to 3: two, 256 of 1000 accounts");
  shares.stageEnded();
  EXPECT_EQ(shares.progress().what, "version 2 to 3: two");
}

TEST_F(SharesOfARun, TellTheAccountsAloneOnceAllOfThemAreCounted) {
  stage("load");
  shares.progressed(9984, 10000);
  EXPECT_EQ(shares.progress().what, "load, 10000 accounts");
}

TEST_F(SharesOfARun, BearMoreStepsThanWereExpected) {
  for (int step = 0; step < 5; ++step) stage("_step:", "again");
  EXPECT_LT(shares.progress().upTo, 1);
}

}  // namespace
}  // namespace tests
