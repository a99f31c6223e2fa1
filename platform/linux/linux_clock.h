#pragma once

#include <chrono>
#include <functional>
#include <memory>

#include "platform/clock.h"
#include "platform/export.h"

namespace platform {

using Instant = std::chrono::system_clock::time_point;

// The clock that shows the instant which `now` answers, the system's as a rule.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<Clock> makeClock(
    std::function<Instant()> now = &std::chrono::system_clock::now);

}  // namespace platform
