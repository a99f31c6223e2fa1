#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/export.h"
#include "platform/file_keeper.h"

namespace platform {

// For the files of the device that has these directories, and others.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileKeeper> makeFileKeeper(const BaseDirectories& directories);

}  // namespace platform
