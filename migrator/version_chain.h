#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "migrator/telling.h"

namespace migrator {

// The step that upgrades what files of one stored version hold. A step answers whether it succeeded; what it stamps on
// the store and whether it saves it is the step's own business.
template <typename Migrator, typename Store>
struct VersionStep {
  std::uint64_t storedVersion;
  std::string_view name;   // as which the run's observer is told of it
  std::string_view words;  // what it does, for people
  bool (Migrator::*run)(Store& store);
};

// Runs one step as a stage, told to people as "version 4 to 5: …". The settings are stamped as current also after one
// that fails, so that is told as a loss.
template <typename Migrator, typename Store>
[[nodiscard]] bool runAsStage(Migrator& migrator, const VersionStep<Migrator, Store>& step, Store& store) {
  const std::string words = "version " + std::to_string(step.storedVersion) + " to " +
                            std::to_string(step.storedVersion + 1) + ": " + std::string{step.words};
  const AccountStage stage{step.name, store, words};
  const bool hasSucceeded = (migrator.*step.run)(store);
  if (!hasSucceeded) tellFailedStep(step.name, words);
  return hasSucceeded;
}

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
