#pragma once

#include <memory>

#include "platform/module_loader.h"

namespace platform {

// The dynamic linker's modules.
[[nodiscard]] std::shared_ptr<ModuleLoader> makeModuleLoader();

}  // namespace platform
