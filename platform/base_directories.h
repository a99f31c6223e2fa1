#pragma once

#include <filesystem>

namespace platform {

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

}  // namespace platform
