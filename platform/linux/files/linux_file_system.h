#pragma once

#include <memory>

#include "platform/export.h"
#include "platform/file_system.h"
#include "platform/linux/files/file_trees.h"

namespace platform {

// The files of the device whose file tree begins at the root; account names are those of that device.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileSystem> makeFileSystem(const FileTrees& trees);

}  // namespace platform
