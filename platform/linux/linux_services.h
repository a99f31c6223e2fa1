#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/linux/linux_platform.h"
#include "platform/modules.h"

namespace platform {

[[nodiscard]] std::shared_ptr<BaseDirectories> makeBaseDirectories(const LinuxPlatformOptions& options);

// The dynamic linker's modules.
[[nodiscard]] std::shared_ptr<ModuleLoader> makeModuleLoader();

}  // namespace platform
