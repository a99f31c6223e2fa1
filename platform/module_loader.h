#pragma once

#include <optional>
#include <string>

namespace platform {

// Opens loadable modules. A module stays open for the life of the process; opening it again is cheap and does nothing.
class ModuleLoader {
 public:
  virtual ~ModuleLoader() = default;
  // Opens the module at the path with all its symbols resolved at once. Nothing on success; else the text of the error.
  [[nodiscard]] virtual std::optional<std::string> open(const std::string& path) = 0;
};

}  // namespace platform
