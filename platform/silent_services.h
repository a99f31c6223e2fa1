#pragma once

#include "platform/cloud_tabs_notice.h"
#include "platform/console_log.h"
#include "platform/preferences_changed_notice.h"
#include "platform/system_log.h"

namespace platform {

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
