#pragma once

#include "platform/linux/device/icu/icu_functions.h"

namespace platform {

// ICU's functions, opened by the first who asks. Null where the library that has them does not stand where it was
// installed or cannot be opened: dates are then not written and texts are in English, but no account waits for that.
[[nodiscard]] const IcuFunctions* icuFunctions();

}  // namespace platform
