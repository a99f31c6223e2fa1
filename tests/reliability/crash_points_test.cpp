// A run that dies before, within or after any of its file operations. Whatever it left, the settings file is the old
// one or a complete new one, no account is gone, and the next run finishes.
#include <gtest/gtest.h>

#include <iostream>
#include <string>
#include <vector>

#include "tests/reliability/device_forms.h"

using tests::DeviceForm;
using tests::Mishap;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

const std::pair<Mishap::Kind, std::string> kDeaths[] = {
    {Mishap::Kind::diesBefore, "before "}, {Mishap::Kind::diesWithin, "within "}, {Mishap::Kind::diesAfter, "after "}};

struct Numbers {
  int runs = 0;
  int points = 0;
  int differentEnds = 0;
};

// The accounts that an uninterrupted run leaves. Accounts that a conversion replaces are gone after any run.
using Survivors = std::vector<std::string>;

Survivors survivorsOf(const ScratchDevice& migrated) {
  Survivors survivors;
  for (const auto& [marker, count] : migrated.markersInSettings()) {
    EXPECT_EQ(count, 1) << marker;
    survivors.push_back(marker);
  }
  return survivors;
}

void expectNoAccountLost(const ScratchDevice& device, const Survivors& survivors, const std::string& when) {
  const std::map<std::string, int> counts = device.markersAnywhere();
  for (const std::string& marker : survivors) EXPECT_TRUE(counts.contains(marker)) << marker << " lost " << when;
}

void expectEachAccountOnce(const ScratchDevice& device, const Survivors& survivors, const std::string& when) {
  const std::map<std::string, int> counts = device.markersInSettings();
  for (const std::string& marker : survivors) {
    EXPECT_EQ(counts.contains(marker) ? counts.at(marker) : 0, 1) << marker << " " << when;
  }
}

class DyingRuns : public testing::TestWithParam<DeviceForm> {};

TEST_P(DyingRuns, LoseNoAccountAndAreFinishedByTheNextRun) {
  ScratchDevice untouched;
  prepare(untouched, GetParam());
  const RunOutcome whole = untouched.run();
  ASSERT_TRUE(whole.succeeded);
  const Survivors survivors = survivorsOf(untouched);
  Numbers numbers;
  for (const auto& [kind, place] : kDeaths) {
    for (int operation = 1; operation <= whole.operations; ++operation) {
      const std::string when =
          place + std::to_string(operation) + " of " + std::to_string(whole.operations) + " operations";
      ScratchDevice device;
      prepare(device, GetParam());
      ASSERT_TRUE(device.run({kind, operation}).died) << when;
      ASSERT_TRUE(device.comparableSettings()) << "no readable settings file " << when;
      expectNoAccountLost(device, survivors, when);
      ASSERT_TRUE(device.run().succeeded) << when;
      expectEachAccountOnce(device, survivors, "in the end, having died " + when);
      if (device.comparableSettings() != untouched.comparableSettings()) ++numbers.differentEnds;
      ++numbers.points;
      numbers.runs += 2;
    }
  }
  std::cout << tests::described(GetParam()) << ": " << whole.operations << " operations, " << numbers.points
            << " crash points, " << numbers.runs << " runs; " << numbers.differentEnds
            << " end unlike an uninterrupted run\n";
  // Only a chain that had already saved when the run died is not taken up again: its file says that it is current.
  if (std::get<0>(GetParam()) == tests::kCurrentVersion) {
    EXPECT_EQ(numbers.differentEnds, 0);
  }
}

std::int64_t storedVersion(const ScratchDevice& device) {
  const platform::Dictionary settings = device.comparableSettings().value_or(platform::Dictionary{});
  const platform::PropertyValue* const version = settings.find("Version");
  return version == nullptr ? 0 : version->integerValue().value_or(0);
}

// Each save of a chain says that the file is current, so nobody misses what the steps after it would have done.
TEST(DyingChain, IsNotTakenUpAgainAfterItsFirstSave) {
  ScratchDevice untouched;
  untouched.putSettings(6);
  const int operations = untouched.run().operations;
  for (int operation = 1; operation <= operations; ++operation) {
    ScratchDevice device;
    device.putSettings(6);
    ASSERT_TRUE(device.run({Mishap::Kind::diesAfter, operation}).died);
    if (storedVersion(device) != tests::kCurrentVersion) continue;
    EXPECT_TRUE(device.run().succeeded);
    EXPECT_NE(device.comparableSettings(), untouched.comparableSettings());
    EXPECT_EQ(device.markersInSettings(), untouched.markersInSettings());
    return;
  }
  FAIL() << "no save at all";
}

INSTANTIATE_TEST_SUITE_P(OfEveryVersionAndLegacyForm, DyingRuns,
                         testing::Combine(testing::Range(0, tests::kCurrentVersion + 1),
                                          testing::ValuesIn(tests::kLegacyForms)),
                         tests::nameOf);

}  // namespace
