#pragma once

#include <memory>
#include <vector>

#include "platform/export.h"
#include "platform/file_system.h"

namespace platform {

// Where a device's files lie. Paths outside of them are taken from the file system's root on.
struct FileTrees {
  Path systemRoot = "/";
  std::vector<Path> ofDevice = {};   // directories of the device that may lie outside of its root
  std::vector<Path> ofMachine = {};  // directories of the system that the program runs on
};

// The files of the device whose file tree begins at the root; account names are those of that device.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileSystem> makeFileSystem(const FileTrees& trees);

}  // namespace platform
