#pragma once

#include <string>

#include "platform/status.h"

namespace platform {

// Opens loadable modules. A module stays open for the life of the process; opening it again is cheap and does nothing.
class ModuleLoader {
 public:
  virtual ~ModuleLoader() = default;
  // Opens the module at the path with all its symbols resolved at once. The reason of a failure names the path.
  virtual Status open(const std::string& path) = 0;
};

}  // namespace platform
