#include "platform/linux/linux_platform.h"

#include "platform/default_platform.h"

namespace platform {

Platform makeLinuxPlatform(const LinuxPlatformOptions&) { return {}; }

Platform makeDefaultPlatform() { return makeLinuxPlatform(); }

}  // namespace platform
