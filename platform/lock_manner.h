#pragma once

#include <chrono>
#include <optional>

namespace platform {

// How locks are taken.
struct LockManner {
  // Held together with all who share it, and only where its file stands; where there is none, nobody holds the lock.
  // Nothing is made and nothing replaced: for who only looks.
  bool isShared = false;
  // Lock() fails with ETIMEDOUT when it is over; 0 waits for nobody. Default: it waits as long as it takes.
  std::optional<std::chrono::milliseconds> timeLimit = std::nullopt;
};

}  // namespace platform
