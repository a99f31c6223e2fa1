#pragma once

#include <filesystem>

#include "platform/export.h"

namespace platform {

struct Platform;

// The directories in which the system's files lie. All are absolute; none needs to exist.
class BaseDirectories {
 public:
  virtual ~BaseDirectories() = default;

  // The root of the device's file tree: "/" on the device itself, elsewhere for an image that is mounted somewhere.
  [[nodiscard]] virtual std::filesystem::path systemRoot() const = 0;
  [[nodiscard]] virtual std::filesystem::path home() const = 0;
  [[nodiscard]] virtual std::filesystem::path sharedResources() const = 0;
  // Where the mail application keeps its data.
  [[nodiscard]] virtual std::filesystem::path mailData() const = 0;
  // The product's own resources: configuration files and string tables.
  [[nodiscard]] virtual std::filesystem::path resources() const = 0;
};

// Keeps the process's default temporary directory on the volume of the device's settings, so that a finished temporary
// file can be moved onto a settings file in one step: where TMPDIR is not set, it becomes ROOT/var/mobile/tmp, made
// when missing (mode 0700, owned by `mobile`). Every program that saves calls this at its start, before it starts
// threads. A directory that cannot be made is no error here; the save then says what went wrong.
ACCOUNT_EXPORT void keepTemporaryDirectoryOnDeviceVolume(const Platform& platform);

}  // namespace platform
