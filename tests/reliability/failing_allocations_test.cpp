// A run in which one allocation fails. Nothing crosses the plug-in's boundary, the lock is given back, the settings
// file is a whole one, no temporary file stays, no account is gone, and the next run finishes. Memory of libplist
// itself is out of reach.
#include <gtest/gtest.h>

#include <cstdlib>
#include <iostream>

#include "tests/reliability/scratch_device.h"

using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

struct Case {
  const char* name;
  int version;
  bool hasLegacy;
  friend void PrintTo(const Case& given, std::ostream* stream) { *stream << given.name; }
};

void prepare(ScratchDevice& device, const Case& given) {
  device.putSettings(static_cast<std::uint64_t>(given.version));
  if (given.hasLegacy) device.putLegacyMail();
  if (given.hasLegacy) device.putLegacyExchange();
}

// Every allocation, or as many of them, evenly spread, as the environment asks for.
std::size_t strideOver(std::size_t allocations) {
  const char* const asked = std::getenv("FAILURE_SAMPLES");
  const std::size_t samples = asked == nullptr ? allocations : std::strtoul(asked, nullptr, 10);
  return std::max<std::size_t>(1, allocations / std::max<std::size_t>(1, samples));
}

class ShortOfMemory : public testing::TestWithParam<Case> {};

TEST_P(ShortOfMemory, RunsLoseNoAccountAndAreFinishedByTheNextRun) {
  ScratchDevice untouched;
  prepare(untouched, GetParam());
  const RunOutcome whole = untouched.run();
  ASSERT_TRUE(whole.succeeded);
  const std::size_t stride = strideOver(whole.allocations);
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
  std::cout << GetParam().name << ": " << whole.allocations << " allocations, " << runs << " of them failed; "
            << succeeded << " runs succeeded all the same\n";
}

std::string nameOf(const testing::TestParamInfo<Case>& tested) { return tested.param.name; }

INSTANTIATE_TEST_SUITE_P(From, ShortOfMemory,
                         testing::Values(Case{"Version0WithLegacyFiles", 0, true}, Case{"Version6", 6, false},
                                         Case{"Version12", 12, false}),
                         nameOf);

}  // namespace
