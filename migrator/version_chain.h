#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "migrator/stage.h"

namespace migrator {

// The step that upgrades what files of one stored version hold. A step answers whether it succeeded; what it stamps on
// the store and whether it saves it is the step's own business.
template <typename Migrator, typename Store>
struct VersionStep {
  std::uint64_t storedVersion;
  std::string_view name;  // as which the run's observer is told of it
  bool (Migrator::*run)(Store& store);
};

// Enters the chain at the step of the stored version and runs that step and every following one, until one answers
// false; answers what the last step run answered. A version without a step runs nothing and answers false.
template <typename Migrator, typename Store, std::size_t Count>
[[nodiscard]] bool runVersionSteps(std::span<const VersionStep<Migrator, Store>, Count> chain,
                                   std::uint64_t storedVersion, Migrator& migrator, Store& store) {
  using Step = VersionStep<Migrator, Store>;
  const auto entry = std::ranges::find(chain, storedVersion, &Step::storedVersion);
  return entry != chain.end() && std::all_of(entry, chain.end(), [&](const Step& step) {
           const Stage stage{step.name};
           return (migrator.*step.run)(store);
         });
}

}  // namespace migrator
