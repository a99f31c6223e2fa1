#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

namespace migrator {

// The step that upgrades what files of one stored version hold. A step answers whether it succeeded; what it stamps on
// the store and whether it saves it is the step's own business.
template <typename Migrator, typename Store>
struct VersionStep {
  std::uint64_t storedVersion;
  std::string_view name;  // as which the run's observer is told of it
  bool (Migrator::*run)(Store& store);
};

// Whether every version from 0 on has its step, in order, and the last step leaves `version`.
template <typename Step, std::size_t Count>
[[nodiscard]] constexpr bool leadsTo(std::uint64_t version, const std::array<Step, Count>& chain) {
  std::uint64_t next = 0;
  return std::ranges::all_of(chain, [&next](const Step& step) { return step.storedVersion == next++; }) &&
         next == version;
}

// Enters the chain at the step of the stored version and runs that step and every following one with `runStep`, until
// one answers false; answers what the last step run answered. A version without a step runs nothing and answers false.
template <typename Step, std::size_t Count, typename RunStep>
[[nodiscard]] bool runVersionSteps(std::span<const Step, Count> chain, std::uint64_t storedVersion,
                                   const RunStep& runStep) {
  const auto entry = std::ranges::find(chain, storedVersion, &Step::storedVersion);
  return entry != chain.end() && std::all_of(entry, chain.end(), runStep);
}

}  // namespace migrator
