#pragma once

#include <string>
#include <string_view>

#include "platform/status.h"

namespace platform {

// The time of day, as text.
class Clock {
 public:
  virtual ~Clock() = default;

  // The current time in the local time zone, formatted by a Unicode date pattern (UTS #35) in the locale en_US_POSIX
  // and the proleptic Gregorian calendar. Unsuitable is a pattern that is invalid; other causes are those of the
  // device.
  virtual Result<std::string> currentLocalTime(std::string_view pattern) const = 0;
};

}  // namespace platform
