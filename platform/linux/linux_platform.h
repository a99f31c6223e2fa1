#pragma once

#include <filesystem>
#include <optional>

#include "platform/exclusive_file_lock.h"
#include "platform/export.h"
#include "platform/platform.h"

namespace platform {

// Where the device's files lie; what is not set is as on the device itself.
struct LinuxPlatformOptions {
  std::optional<std::filesystem::path> systemRoot = std::nullopt;  // default "/"
  // Default: ROOT/var/mobile where a root is set, be it "/"; else the process's home directory.
  std::optional<std::filesystem::path> home = std::nullopt;
  std::optional<std::filesystem::path> sharedResources = std::nullopt;  // default ROOT/var/mobile
  std::optional<std::filesystem::path> resources = std::nullopt;        // default: those installed beside this library
  std::optional<std::filesystem::path> lockDirectory = std::nullopt;    // default ROOT/tmp; only tests set another
  LockManner locks = {};
};

// The services of a Linux device. Nothing is opened or connected before its first use.
[[nodiscard]] ACCOUNT_EXPORT Platform makeLinuxPlatform(const LinuxPlatformOptions& options = {});

}  // namespace platform
