#include "commandline/progress_estimate.h"

#include <gtest/gtest.h>

namespace tests {
namespace {

using commandline::Progress;
using commandline::ProgressEstimate;
using std::chrono::seconds;

constexpr ProgressEstimate::Time kBegin{};

ProgressEstimate::Time after(int count) { return kBegin + seconds{count}; }

class ProgressEstimates : public ::testing::Test {
 protected:
  ProgressEstimate estimate{kBegin};
};

TEST_F(ProgressEstimates, TellTheShareAndWhatIsLeftAtThePaceSoFar) {
  estimate.reached({"loading", 0.25, 0.25}, after(10));
  EXPECT_EQ(estimate.textAt(after(10)), "25 %, 30 s left: loading");
  estimate.reached({"saving", 0.75, 0.75}, after(300));
  EXPECT_EQ(estimate.textAt(after(900)), "75 %, 5 min left: saving");
}

TEST_F(ProgressEstimates, GoOnBetweenReportsButNeverPastThePart) {
  estimate.reached({"saving", 0.2, 0.4}, after(10));
  const double soon = estimate.shareAt(after(15));
  EXPECT_GT(soon, 0.2);
  EXPECT_GT(estimate.shareAt(after(30)), soon);
  EXPECT_LE(estimate.shareAt(after(3600)), 0.4);
}

TEST_F(ProgressEstimates, NeverGoBack) {
  estimate.reached({"one", 0.2, 0.8}, after(10));
  const double before = estimate.shareAt(after(60));
  estimate.reached({"two", 0.3, 0.5}, after(60));
  EXPECT_GE(estimate.shareAt(after(60)), before);
  EXPECT_GE(estimate.shareAt(after(61)), before);
}

TEST_F(ProgressEstimates, PromiseNothingWhereNobodyKnows) {
  estimate.reached({"looking", 0, 0}, after(1));
  EXPECT_EQ(estimate.textAt(after(5)), "looking");
}

TEST_F(ProgressEstimates, AreNotDoneBeforeTheWorkIs) {
  estimate.reached({"saving", 1, 1}, after(10));
  EXPECT_EQ(estimate.textAt(after(10)).substr(0, 4), "99 %");
}

}  // namespace
}  // namespace tests
