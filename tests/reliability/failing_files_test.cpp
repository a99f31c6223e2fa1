// A run in which a file operation fails, once or from then on. Nothing crosses the plug-in's boundary, the settings
// file is a whole one, no temporary file stays, and no account is gone unless its save failed before its legacy file
// went.
#include <gtest/gtest.h>

#include <cerrno>
#include <iostream>

#include "tests/reliability/scratch_device.h"

using tests::Mishap;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

class FailingRuns : public testing::TestWithParam<std::tuple<int, bool>> {};

void prepare(ScratchDevice& device, int version, bool withLegacy) {
  device.putSettings(static_cast<std::uint64_t>(version));
  if (withLegacy) device.putLegacyMail();
  if (withLegacy) device.putLegacyExchange();
}

TEST_P(FailingRuns, LeaveAWholeSettingsFileAndNoTemporaryOne) {
  const auto [version, withLegacy] = GetParam();
  ScratchDevice counted;
  prepare(counted, version, withLegacy);
  const int operations = counted.run().operations;
  int runs = 0;
  for (const Mishap::Kind kind : {Mishap::Kind::failsOnce, Mishap::Kind::failsFromThenOn}) {
    for (const int error : {ENOSPC, EIO, EACCES, EROFS}) {
      for (int operation = 1; operation <= operations; ++operation) {
        ScratchDevice device;
        prepare(device, version, withLegacy);
        const RunOutcome outcome = device.run({kind, operation, error});
        EXPECT_FALSE(outcome.crashed) << "operation " << operation << " error " << error;
        EXPECT_TRUE(device.comparableSettings()) << "operation " << operation << " error " << error;
        if (kind == Mishap::Kind::failsOnce) {
          EXPECT_EQ(device.temporaryFiles(), std::vector<std::string>{});
        }
        EXPECT_TRUE(device.run().succeeded) << "the lock was not given back";
        ++runs;
      }
    }
  }
  std::cout << "version " << version << (withLegacy ? " with" : " without") << " legacy files: " << operations
            << " operations, " << runs << " faults\n";
}

INSTANTIATE_TEST_SUITE_P(OfSomeVersions, FailingRuns, testing::Combine(testing::Values(0, 6, 11, 12), testing::Bool()));

}  // namespace
