#pragma once

#include <filesystem>
#include <vector>

#include "platform/base_directories.h"

namespace platform {

// Where a device's files lie. Paths outside of them are taken from the file system's root on.
struct FileTrees {
  std::filesystem::path systemRoot = "/";
  std::vector<std::filesystem::path> ofDevice = {};   // directories of the device that may lie outside of its root
  std::vector<std::filesystem::path> ofMachine = {};  // directories of the system that the program runs on
};

[[nodiscard]] inline FileTrees treesOf(const BaseDirectories& directories) {
  return {.systemRoot = directories.systemRoot(),
          .ofDevice = {directories.home(), directories.sharedResources()},
          .ofMachine = {directories.resources()}};
}

}  // namespace platform
