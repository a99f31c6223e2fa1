#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string_view>

#include "platform/status.h"

namespace platform {

// A lock that at most one holder on the device has at a time, whatever process it is in. The kernel gives it back when
// the holder dies, so a killed process leaves nothing behind.
class ExclusiveFileLock {
 public:
  virtual ~ExclusiveFileLock() = default;  // gives the lock back where it is held

  // Waits until nobody else holds the lock, then holds it.
  virtual Status lock() = 0;
  virtual void unlock() = 0;
};

// Makes locks by name.
class ExclusiveFileLocks {
 public:
  virtual ~ExclusiveFileLocks() = default;
  // A lock object, not yet held; never null.
  virtual Result<std::unique_ptr<ExclusiveFileLock>> lockNamed(std::string_view name) = 0;
};

// How locks are taken.
struct LockManner {
  // Held together with all who share it, and only where its file stands; where there is none, nobody holds the lock.
  // Nothing is made and nothing replaced: for who only looks.
  bool isShared = false;
  // `lock` fails with ETIMEDOUT when it is over; 0 waits for nobody. Default: it waits as long as it takes.
  std::optional<std::chrono::milliseconds> timeLimit = std::nullopt;
};

}  // namespace platform
