// A run that dies, and a second one that dies while it takes up what the first one left. Whatever they left, the
// settings file is a whole one, no account is gone, and the third run finishes.
#include <gtest/gtest.h>

#include <iostream>

#include "tests/reliability/device_forms.h"

using tests::DeviceForm;
using tests::Mishap;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

constexpr std::size_t kPairsTried = 3000;
constexpr Mishap::Kind kDeaths[] = {Mishap::Kind::diesBefore, Mishap::Kind::diesWithin, Mishap::Kind::diesAfter};

class DyingAgain : public testing::TestWithParam<DeviceForm> {
 protected:
  DyingAgain() {
    prepare(_untouched, GetParam());
    const RunOutcome whole = _untouched.run();
    EXPECT_TRUE(whole.succeeded);
    for (int operation = 1; operation <= whole.operations; ++operation) {
      for (const Mishap::Kind kind : kDeaths) _deaths.push_back({kind, operation});
    }
  }
  static std::string described(const Mishap& first, const Mishap& second) {
    return std::to_string(static_cast<int>(first.kind)) + " at operation " + std::to_string(first.operation) +
           ", then " + std::to_string(static_cast<int>(second.kind)) + " at " + std::to_string(second.operation);
  }
  void expectWhole(const ScratchDevice& device, const std::string& when) const {
    ASSERT_TRUE(device.comparableSettings()) << when;
    const auto left = device.markersAnywhere();
    for (const auto& [marker, count] : _untouched.markersInSettings()) EXPECT_TRUE(left.contains(marker)) << when;
  }
  void dieTwice(const Mishap& first, const Mishap& second) {
    const std::string when = described(first, second);
    ScratchDevice device;
    prepare(device, GetParam());
    ASSERT_TRUE(device.run(first).died) << when;
    // What is left may need fewer operations than the second death asks for.
    if (!device.run(second).died) ++_finishedBeforehand;
    expectWhole(device, when);
    ASSERT_TRUE(device.run().succeeded) << when;
    EXPECT_EQ(device.markersInSettings(), _untouched.markersInSettings()) << when;
  }

  ScratchDevice _untouched;
  std::vector<Mishap> _deaths;
  int _finishedBeforehand = 0;
};

TEST_P(DyingAgain, WhileRecoveringLosesNoAccountAndIsFinishedByTheNextRun) {
  const std::size_t pairs = _deaths.size() * _deaths.size();
  // Odd, so that a sample meets every kind of death.
  const std::size_t stride = tests::strideOver(pairs, kPairsTried) | 1U;
  int tried = 0;
  for (std::size_t pair = 0; pair < pairs; pair += stride, ++tried) {
    dieTwice(_deaths[pair / _deaths.size()], _deaths[pair % _deaths.size()]);
    if (HasFatalFailure()) return;
  }
  std::cout << tests::described(GetParam()) << ": " << tried << " of " << pairs << " pairs of deaths, " << tried * 3
            << " runs; in " << _finishedBeforehand << " the second run ended before its death\n";
}

INSTANTIATE_TEST_SUITE_P(OfSomeVersions, DyingAgain,
                         testing::Values(DeviceForm{0, tests::kBothLegacyFiles}, DeviceForm{6, tests::kLegacyMailOnly},
                                         DeviceForm{tests::kCurrentVersion, tests::kNoLegacyFiles}),
                         tests::nameOf);

}  // namespace
