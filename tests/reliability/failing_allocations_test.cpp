// A run in which one allocation fails. Nothing crosses the plug-in's boundary, the lock is given back, the settings
// file is a whole one, no temporary file stays, no account is gone, and the next run finishes. Memory of libplist
// itself is out of reach.
#include <gtest/gtest.h>

#include <iostream>

#include "tests/reliability/device_forms.h"

using tests::DeviceForm;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

class ShortOfMemory : public testing::TestWithParam<DeviceForm> {};

TEST_P(ShortOfMemory, RunsLoseNoAccountAndAreFinishedByTheNextRun) {
  ScratchDevice untouched;
  prepare(untouched, GetParam());
  const RunOutcome whole = untouched.run();
  ASSERT_TRUE(whole.succeeded);
  const std::size_t stride = tests::strideOver(whole.allocations, whole.allocations);
  int runs = 0;
  int succeeded = 0;
  for (std::size_t failing = 1; failing <= whole.allocations; failing += stride) {
    const std::string when = "where allocation " + std::to_string(failing) + " failed";
    ScratchDevice device;
    prepare(device, GetParam());
    const RunOutcome outcome = device.run({}, failing);
    ASSERT_FALSE(outcome.crashed) << when;
    ASSERT_FALSE(outcome.heldLock) << when;
    ASSERT_TRUE(device.comparableSettings()) << when;
    EXPECT_EQ(device.temporaryFiles(), std::vector<std::string>{}) << when;
    const auto left = device.markersAnywhere();
    for (const auto& [marker, count] : untouched.markersInSettings()) EXPECT_TRUE(left.contains(marker)) << when;
    EXPECT_TRUE(device.run().succeeded) << when;
    EXPECT_EQ(device.markersInSettings(), untouched.markersInSettings()) << when;
    succeeded += outcome.succeeded ? 1 : 0;
    ++runs;
  }
  std::cout << tests::described(GetParam()) << ": " << whole.allocations << " allocations, " << runs
            << " of them failed; " << succeeded << " runs succeeded all the same\n";
}

INSTANTIATE_TEST_SUITE_P(OfSomeVersions, ShortOfMemory,
                         testing::Values(DeviceForm{0, tests::kBothLegacyFiles}, DeviceForm{6, tests::kNoLegacyFiles},
                                         DeviceForm{tests::kCurrentVersion, tests::kNoLegacyFiles}),
                         tests::nameOf);

}  // namespace
