#pragma once

#include <string_view>

namespace platform {

// Plain messages for whoever runs the migration, one line each.
class ConsoleLog {
 public:
  virtual ~ConsoleLog() = default;
  // A message that cannot be written is lost; that is never an error.
  virtual void write(std::string_view message) = 0;
};

}  // namespace platform
