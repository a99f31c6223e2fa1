#pragma once

#include "platform/platform.h"

namespace platform {

// The device's own platform, with no option set. Each operating system's folder defines it.
[[nodiscard]] Platform makeDefaultPlatform();

}  // namespace platform
