#pragma once

#include <chrono>
#include <functional>
#include <memory>

#include "platform/clock.h"
#include "platform/export.h"

namespace platform {

using Instant = std::chrono::sys_time<std::chrono::milliseconds>;

// The clock that shows the instant which `now` answers; without one, the system's.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<Clock> makeClock(std::function<Instant()> now = nullptr);

}  // namespace platform
