#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/status.h"

namespace platform {

// The product's texts in the user's language. A table is named by its file; a language that lacks a key falls back to
// English.
class LocalizedStrings {
 public:
  virtual ~LocalizedStrings() = default;
  // Nothing where neither the user's language nor English has the key, or where there is no such table.
  [[nodiscard]] virtual std::optional<std::string> text(std::string_view table, std::string_view key) const = 0;
};

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
