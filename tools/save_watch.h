#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/system_log.h"

namespace tools {

// A system log that hears what a save says of itself, and passes everything on. The library tells of a failed save
// nowhere but in its log.
class SaveWatch final : public platform::SystemLog {
 public:
  explicit SaveWatch(std::shared_ptr<platform::SystemLog> log) : _log{std::move(log)} {}

  [[nodiscard]] bool hasReaders() const override { return _passesOn; }
  void write(const platform::LogRecord& record) override;

  // Hears and passes on nothing any more.
  void keepToYourself() { _passesOn = false; }

  // Whether a save has failed.
  [[nodiscard]] bool hasFailed() const { return _hasFailed; }
  // Why, where the log said so: such as "Could not set attributes on the temporary account settings plist. …"; else
  // empty.
  [[nodiscard]] const std::string& cause() const { return _cause; }

 private:
  void hear(const std::string& message);

  std::shared_ptr<platform::SystemLog> _log;
  bool _passesOn = true;
  bool _hasFailed = false;
  std::string _cause;
};

}  // namespace tools
