#pragma once

#include <functional>
#include <vector>

#include "bench/account_generator.h"

namespace bench {

// One piece of the program's work on the accounts of a settings file. `prepare` makes everything that the piece needs;
// the action that it answers is the piece itself and may be run once. All pieces of a process share one device in
// memory (see memory_device.h), so one is done before the next is prepared.
struct Piece {
  const char* name;
  std::function<std::function<void()>(const Population& population)> prepare;
};

// Values, property lists, the store, the log, and each version step.
[[nodiscard]] const std::vector<Piece>& pieces();

}  // namespace bench
