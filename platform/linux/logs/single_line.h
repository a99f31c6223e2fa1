#pragma once

#include <string>
#include <string_view>

#include "platform/export.h"

namespace platform {

// The text with every character that begins a new line or controls a terminal made visible ("\n", "\x1b", "\u2028"), so
// that a message is one line and does nothing but be read. Tabs stay.
[[nodiscard]] ACCOUNT_EXPORT std::string singleLine(std::string_view text);

}  // namespace platform
