// Runs with snapshots, and restores, in which a file operation fails, once or from then on. What could not be kept is
// not risked: a run without a snapshot does not begin, and a restore that fails leaves the device as it was.
#include <gtest/gtest.h>

#include <cerrno>
#include <iostream>

#include "tests/reliability/device_forms.h"
#include "tests/reliability/undoable_runs.h"

using tests::Mishap;
using tests::ScratchDevice;
using tests::UndoOutcome;

namespace {

const tests::DeviceForm kDevice{6, tests::kBothLegacyFiles};

// All but the records that a run adds.
std::map<std::string, std::string> stateOfUndoable(const ScratchDevice& device) {
  auto state = exactStateOf(device);
  std::erase_if(state, [](const auto& file) { return file.first.find("CrashReporter") != std::string::npos; });
  return state;
}

class Faults : public testing::TestWithParam<Mishap::Kind> {};

TEST_P(Faults, WhileTakingASnapshotLeaveTheDeviceAsItWasOrDoNotMatter) {
  ScratchDevice counted;
  prepare(counted, kDevice);
  const int ahead = runUndoable(counted).operationsAhead;
  int refused = 0;
  for (int operation = 1; operation <= ahead; ++operation) {
    ScratchDevice device;
    prepare(device, kDevice);
    const auto before = exactStateOf(device);
    const UndoOutcome outcome = runUndoable(device, {GetParam(), operation, ENOSPC});
    EXPECT_FALSE(outcome.crashed) << operation;
    if (outcome.refused) {
      ++refused;
      EXPECT_TRUE(exactStateOf(device) == before) << operation;
      if (GetParam() == Mishap::Kind::failsOnce) {
        EXPECT_EQ(leftoversIn(device), std::vector<std::string>{}) << operation;
      }
    }
    EXPECT_TRUE(runUndoable(device).succeeded) << operation;
    EXPECT_EQ(leftoversIn(device), std::vector<std::string>{}) << operation;
  }
  std::cout << ahead << " operations ahead of the plug-in, " << refused << " faults that no run begins after\n";
}

TEST_P(Faults, DuringARunCostNoAccount) {
  ScratchDevice whole;
  prepare(whole, kDevice);
  const UndoOutcome counted = runUndoable(whole);
  const auto markers = whole.markersInSettings();
  int rolledBack = 0;
  for (int operation = counted.operationsAhead + 1; operation <= counted.operations; ++operation) {
    ScratchDevice device;
    prepare(device, kDevice);
    const auto before = stateOfUndoable(device);
    const UndoOutcome outcome = runUndoable(device, {GetParam(), operation, ENOSPC});
    EXPECT_FALSE(outcome.crashed) << operation;
    if (outcome.rolledBack) {
      ++rolledBack;
      EXPECT_TRUE(stateOfUndoable(device) == before) << operation;
    } else {
      ASSERT_TRUE(restoreFirst(device).succeeded) << operation;
    }
    ASSERT_TRUE(runUndoable(device).succeeded) << operation;
    EXPECT_EQ(device.markersInSettings(), markers) << operation;
  }
  std::cout << counted.operations - counted.operationsAhead << " operations of a run, " << rolledBack
            << " rolled back, each other followed by a restore\n";
}

TEST_P(Faults, DuringARestoreLeaveTheDeviceAsItWasOrAreMadeGoodByTheNext) {
  ScratchDevice counted;
  prepare(counted, kDevice);
  ASSERT_TRUE(runUndoable(counted).succeeded);
  const int operations = restoreFirst(counted).operations;
  int refused = 0;
  for (int operation = 1; operation <= operations; ++operation) {
    ScratchDevice device;
    prepare(device, kDevice);
    ASSERT_TRUE(runUndoable(device).succeeded);
    const auto migrated = exactStateOf(device);
    const UndoOutcome outcome = restoreFirst(device, {GetParam(), operation, EIO});
    EXPECT_FALSE(outcome.crashed) << operation;
    if (outcome.refused) ++refused;
    if (outcome.refused && GetParam() == Mishap::Kind::failsOnce) {
      EXPECT_TRUE(exactStateOf(device) == migrated) << operation;
    }
    ASSERT_TRUE(restoreFirst(device).succeeded) << operation;
    EXPECT_TRUE(exactStateOf(device) != migrated) << operation;
  }
  std::cout << operations << " operations of a restore, " << refused << " faults that it fails of\n";
}

std::string nameOf(const testing::TestParamInfo<Mishap::Kind>& info) {
  return info.param == Mishap::Kind::failsOnce ? "Once" : "FromThenOn";
}

INSTANTIATE_TEST_SUITE_P(OfOneOperation, Faults,
                         testing::Values(Mishap::Kind::failsOnce, Mishap::Kind::failsFromThenOn), nameOf);

}  // namespace
