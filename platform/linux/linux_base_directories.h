#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/linux/linux_platform.h"

namespace platform {

[[nodiscard]] std::shared_ptr<BaseDirectories> makeBaseDirectories(const LinuxPlatformOptions& options);

}  // namespace platform
