#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <ostream>
#include <string>
#include <tuple>

#include "accountsettings/accounts_manager.h"
#include "tests/reliability/scratch_device.h"

namespace tests {

inline constexpr int kCurrentVersion{accountsettings::kCurrentVersion};

// The legacy files that a device has.
struct LegacyForm {
  const char* name;
  bool mail;
  bool exchange;
  friend void PrintTo(const LegacyForm& form, std::ostream* stream) { *stream << "legacy files " << form.name; }
};

inline constexpr LegacyForm kNoLegacyFiles{"none", false, false};
inline constexpr LegacyForm kLegacyMailOnly{"mail", true, false};
inline constexpr LegacyForm kLegacyExchangeOnly{"exchange", false, true};
inline constexpr LegacyForm kBothLegacyFiles{"both", true, true};
inline constexpr LegacyForm kLegacyForms[] = {kNoLegacyFiles, kLegacyMailOnly, kLegacyExchangeOnly, kBothLegacyFiles};

// A device as the first run finds it: the version of its settings, and its legacy files.
using DeviceForm = std::tuple<int, LegacyForm>;

inline void prepare(ScratchDevice& device, const DeviceForm& form) {
  const auto& [version, legacy] = form;
  device.putSettings(static_cast<std::uint64_t>(version));
  if (legacy.mail) device.putLegacyMail();
  if (legacy.exchange) device.putLegacyExchange();
}

[[nodiscard]] inline std::string described(const DeviceForm& form) {
  return "version " + std::to_string(std::get<0>(form)) + ", legacy files " + std::get<1>(form).name;
}

[[nodiscard]] inline std::string nameOf(const testing::TestParamInfo<DeviceForm>& info) {
  return "FromVersion" + std::to_string(std::get<0>(info.param)) + "WithLegacy_" + std::get<1>(info.param).name;
}

// How far apart those are, of so many, that are tried: as many samples, evenly spread, as the environment asks for with
// FAILURE_SAMPLES, else as are given here.
[[nodiscard]] inline std::size_t strideOver(std::size_t all, std::size_t samples) {
  const char* const asked = std::getenv("FAILURE_SAMPLES");
  if (asked != nullptr) samples = std::strtoul(asked, nullptr, 10);
  return std::max<std::size_t>(1, all / std::max<std::size_t>(1, samples));
}

}  // namespace tests
