#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/export.h"
#include "platform/file_system.h"

namespace platform {

// The files of the device that has these directories, and others; account names are those of that device.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileSystem> makeFileSystem(const BaseDirectories& directories);

// The process's temporary directory, chosen as the C library does: a program with more rights than its user has does
// not follow the environment.
[[nodiscard]] Path temporaryDirectory(FileSystem& files);

}  // namespace platform
