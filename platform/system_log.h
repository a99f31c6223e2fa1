#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace platform {

// One structured message, at the default level. The text is made only when a reader asks for it.
struct LogRecord {
  std::string_view subsystem;
  std::string_view category;
  std::string_view method;  // full name of the logging method, such as "-[AccountsManager saveAllAccounts]"
  std::uint32_t line;       // its source line
  const std::function<std::string()>& text;
};

// The system's log.
class SystemLog {
 public:
  virtual ~SystemLog() = default;
  // Whether anybody reads what is written; while not, nothing needs to be.
  [[nodiscard]] virtual bool hasReaders() const = 0;
  // A record that cannot be written is lost; that is never an error.
  virtual void write(const LogRecord& record) = 0;
};

}  // namespace platform
