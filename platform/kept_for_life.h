#pragma once

#include <utility>

namespace platform {

// Makes an object that is kept for the life of the process and never destroyed, on purpose: destructors of globals run
// at the very end, in an order that nobody knows, and may still log or ask the platform. To be called once for each
// object, to initialise a static reference:
//
//   static Table& table = keptForLife<Table>();
template <typename Value, typename... Arguments>
[[nodiscard]] Value& keptForLife(Arguments&&... arguments) {
  return *new Value(std::forward<Arguments>(arguments)...);
}

}  // namespace platform
