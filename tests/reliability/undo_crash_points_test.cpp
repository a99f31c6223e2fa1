// Runs with snapshots, and restores, that die before or after any file operation, the snapshots' own included. Whatever
// died, and however often, the next run ends like one that nothing disturbed. Every point is tried where EVERY_POINT is
// set, else a sample.
#include <gtest/gtest.h>

#include <cstdlib>
#include <iostream>

#include "tests/reliability/device_forms.h"
#include "tests/reliability/undoable_runs.h"

using tests::DeviceForm;
using tests::EndState;
using tests::Mishap;
using tests::ScratchDevice;
using tests::UndoOutcome;

namespace {

constexpr Mishap::Kind kDeaths[] = {Mishap::Kind::diesBefore, Mishap::Kind::diesAfter};

bool isEveryPointTried() { return std::getenv("EVERY_POINT") != nullptr; }

class Undo : public testing::TestWithParam<DeviceForm> {
 protected:
  void SetUp() override {
    prepare(undisturbed, GetParam());
    whole = runUndoable(undisturbed);
    ASSERT_TRUE(whole.succeeded);
    end = endStateOf(undisturbed);
    ASSERT_TRUE(runUndoable(undisturbed).succeeded);
    endOfTwo = endStateOf(undisturbed);
  }
  // Runs on the device until one succeeds, and looks at what it left.
  void finish(const ScratchDevice& device, const std::string& when) {
    ASSERT_TRUE(runUndoable(device).succeeded) << when;
    ++points;
    if (isAsAfterUndisturbedRuns(endStateOf(device)) && leftoversIn(device).empty()) return;
    ++different;
    ADD_FAILURE() << "ends unlike an undisturbed run, " << when;
  }
  // Who dies when the run has ended is followed by another run, which copies the migrated settings aside.
  [[nodiscard]] bool isAsAfterUndisturbedRuns(const EndState& state) const { return state == end || state == endOfTwo; }

  void print(const std::string& what, int operations, int runs) const {
    std::cout << tests::described(GetParam()) << ", " << what << ": " << operations << " operations, " << points
              << " points, " << runs << " runs; " << different << " end unlike an undisturbed run\n";
  }

  ScratchDevice undisturbed;
  UndoOutcome whole;
  EndState end;
  EndState endOfTwo;
  const int stride = isEveryPointTried() ? 1 : 5;
  int points = 0;
  int different = 0;
};

class DyingUndoableRuns : public Undo {};

TEST_P(DyingUndoableRuns, AreFinishedByTheNextLikeUndisturbedOnes) {
  for (const Mishap::Kind death : kDeaths) {
    for (int operation = 1; operation <= whole.operations; operation += stride) {
      ScratchDevice device;
      prepare(device, GetParam());
      const std::string when = "having died at operation " + std::to_string(operation);
      ASSERT_TRUE(runUndoable(device, {death, operation}).died) << when;
      ASSERT_TRUE(device.comparableSettings()) << when;
      finish(device, when);
    }
  }
  print("dying once", whole.operations, 2 * points);
}

class RunsDyingAgain : public Undo {};

// The second run dies, too, at every operation of what it does before the plug-in is called.
TEST_P(RunsDyingAgain, AreFinishedByTheNextLikeUndisturbedOnes) {
  const auto [version, legacy] = GetParam();
  const bool isEveryFirst = version == 0 && legacy.mail && legacy.exchange;
  const int firstStride = !isEveryPointTried() ? 31 : isEveryFirst ? 1 : 7;
  for (int first = whole.operationsAhead; first <= whole.operations; first += firstStride) {
    for (int second = 1;; second += stride) {
      ScratchDevice device;
      prepare(device, GetParam());
      const std::string when = "having died at operations " + std::to_string(first) + " and " + std::to_string(second);
      ASSERT_TRUE(runUndoable(device, {Mishap::Kind::diesAfter, first}).died) << when;
      const UndoOutcome again = runUndoable(device, {Mishap::Kind::diesAfter, second});
      finish(device, when);
      if (!again.died || second > 2 * whole.operationsAhead) break;
    }
  }
  print("dying again while recovering", whole.operations, 3 * points);
}

class DyingRestores : public Undo {
 protected:
  // The operations of a restore after one run.
  [[nodiscard]] int operationsOfARestore() const {
    ScratchDevice counted;
    prepare(counted, GetParam());
    EXPECT_TRUE(runUndoable(counted).succeeded);
    return restoreFirst(counted).operations;
  }
};

TEST_P(DyingRestores, AreFinishedByTheNextExactly) {
  const int operations = operationsOfARestore();
  for (const Mishap::Kind death : kDeaths) {
    for (int operation = 1; operation <= operations; operation += stride) {
      ScratchDevice device;
      prepare(device, GetParam());
      const auto before = exactStateOf(device);
      ASSERT_TRUE(runUndoable(device).succeeded);
      ASSERT_TRUE(restoreFirst(device, {death, operation}).died) << operation;
      ASSERT_TRUE(restoreFirst(device).succeeded) << operation;
      ++points;
      auto after = exactStateOf(device);
      std::erase_if(after, [](const auto& file) { return file.first.find("CrashReporter") != std::string::npos; });
      if (after == before) continue;
      ++different;
      ADD_FAILURE() << "not restored, having died at operation " << operation;
    }
  }
  print("restoring", operations, 3 * points);
}

// What a restore that died left, a run takes up: the device is migrated from where the restore, or nothing, brought it.
TEST_P(DyingRestores, AreFinishedByTheNextRun) {
  const int operations = operationsOfARestore();
  for (int operation = 1; operation <= operations; operation += stride) {
    ScratchDevice device;
    prepare(device, GetParam());
    ASSERT_TRUE(runUndoable(device).succeeded);
    ASSERT_TRUE(restoreFirst(device, {Mishap::Kind::diesAfter, operation}).died) << operation;
    ASSERT_TRUE(runUndoable(device).succeeded) << operation;
    ++points;
    EXPECT_EQ(device.comparableSettings(), end.settings) << operation;
    EXPECT_EQ(leftoversIn(device), std::vector<std::string>{}) << operation;
  }
  print("running after a restore", operations, 3 * points);
}

const auto kEveryDevice =
    testing::Combine(testing::Range(0, tests::kCurrentVersion + 1), testing::ValuesIn(tests::kLegacyForms));
const auto kSomeDevices = testing::Combine(testing::Values(0, 6, tests::kCurrentVersion - 1, tests::kCurrentVersion),
                                           testing::ValuesIn(tests::kLegacyForms));

INSTANTIATE_TEST_SUITE_P(OfEveryVersionAndLegacyForm, DyingUndoableRuns, kEveryDevice, tests::nameOf);
INSTANTIATE_TEST_SUITE_P(OfSomeVersions, RunsDyingAgain, kSomeDevices, tests::nameOf);
INSTANTIATE_TEST_SUITE_P(OfSomeVersions, DyingRestores, kSomeDevices, tests::nameOf);

}  // namespace
