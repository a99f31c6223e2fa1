// A run that dies, and a second one that dies while it takes up what the first one left. Whatever they left, the
// settings file is a whole one, no account is gone, and the third run finishes.
#include <gtest/gtest.h>

#include <cstdlib>
#include <iostream>

#include "tests/reliability/scratch_device.h"

using tests::Mishap;
using tests::RunOutcome;
using tests::ScratchDevice;

namespace {

constexpr Mishap::Kind kDeaths[] = {Mishap::Kind::diesBefore, Mishap::Kind::diesWithin, Mishap::Kind::diesAfter};

struct Case {
  const char* name;
  int version;
  bool hasMail;
  bool hasExchange;
  friend void PrintTo(const Case& given, std::ostream* stream) { *stream << given.name; }
};

void prepare(ScratchDevice& device, const Case& given) {
  device.putSettings(static_cast<std::uint64_t>(given.version));
  if (given.hasMail) device.putLegacyMail();
  if (given.hasExchange) device.putLegacyExchange();
}

// Some thousand pairs of deaths, or as many of them, evenly spread, as the environment asks for.
std::size_t strideOver(std::size_t pairs) {
  const char* const asked = std::getenv("FAILURE_SAMPLES");
  const std::size_t samples = asked == nullptr ? 3000 : std::strtoul(asked, nullptr, 10);
  return std::max<std::size_t>(1, pairs / std::max<std::size_t>(1, samples));
}

class DyingAgain : public testing::TestWithParam<Case> {
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
  const std::size_t stride = strideOver(pairs) | 1U;  // odd, so that a sample meets every kind of death
  int tried = 0;
  for (std::size_t pair = 0; pair < pairs; pair += stride, ++tried) {
    dieTwice(_deaths[pair / _deaths.size()], _deaths[pair % _deaths.size()]);
    if (HasFatalFailure()) return;
  }
  std::cout << GetParam().name << ": " << tried << " of " << pairs << " pairs of deaths, " << tried * 3 << " runs; in "
            << _finishedBeforehand << " the second run ended before its death\n";
}

std::string nameOf(const testing::TestParamInfo<Case>& tested) { return tested.param.name; }

INSTANTIATE_TEST_SUITE_P(From, DyingAgain,
                         testing::Values(Case{"Version0WithLegacyFiles", 0, true, true},
                                         Case{"Version6WithLegacyMail", 6, true, false},
                                         Case{"Version12", 12, false, false}),
                         nameOf);

}  // namespace
