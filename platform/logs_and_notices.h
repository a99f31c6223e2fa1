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

// Plain messages for whoever runs the migration, one line each.
class ConsoleLog {
 public:
  virtual ~ConsoleLog() = default;
  // A message that cannot be written is lost; that is never an error.
  virtual void write(std::string_view message) = 0;
};

// Tells running applications that a key of a preferences domain changed. Nobody may be listening; nothing comes back.
class PreferencesChangedNotice {
 public:
  virtual ~PreferencesChangedNotice() = default;
  virtual void post(std::string_view domain, std::string_view key) = 0;
};

// Tells the browser that the syncing of its tabs was switched on or off. Nobody may be listening; nothing comes back.
class CloudTabsNotice {
 public:
  virtual ~CloudTabsNotice() = default;
  virtual void post(bool enabled) = 0;
};

// For a process that is to tell nobody of what it does, such as a rehearsal: services that take every message and drop
// it, without waiting for anybody.

// Nobody reads it, so no message is made for it in the first place.
class SilentSystemLog final : public SystemLog {
 public:
  [[nodiscard]] bool hasReaders() const override { return false; }
  void write(const LogRecord& /*record*/) override {}
};

class SilentConsoleLog final : public ConsoleLog {
 public:
  void write(std::string_view /*message*/) override {}
};

class SilentPreferencesChangedNotice final : public PreferencesChangedNotice {
 public:
  void post(std::string_view /*domain*/, std::string_view /*key*/) override {}
};

class SilentCloudTabsNotice final : public CloudTabsNotice {
 public:
  void post(bool /*enabled*/) override {}
};

}  // namespace platform
