#pragma once

#include <memory>

#include "platform/platform.h"

namespace bench {

class SilentConsole final : public platform::ConsoleLog {
 public:
  void write(std::string_view /*message*/) override {}
};
class SilentPreferencesNotice final : public platform::PreferencesChangedNotice {
 public:
  void post(std::string_view /*domain*/, std::string_view /*key*/) override {}
};
class SilentCloudTabsNotice final : public platform::CloudTabsNotice {
 public:
  void post(bool /*enabled*/) override {}
};

// Lets the platform tell nobody of anything: there is no console, and no bus to wait for.
inline void silence(platform::Platform& services) {
  services.console = std::make_shared<SilentConsole>();
  services.preferencesChanged = std::make_shared<SilentPreferencesNotice>();
  services.cloudTabs = std::make_shared<SilentCloudTabsNotice>();
}

}  // namespace bench
