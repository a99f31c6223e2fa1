#pragma once

#include <memory>

#include "platform/logs_and_notices.h"
#include "platform/platform.h"

namespace bench {

// Lets the platform tell nobody of anything: there is no console, and no bus to wait for.
inline void silence(platform::Platform& services) {
  services.console = std::make_shared<platform::SilentConsoleLog>();
  services.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  services.cloudTabs = std::make_shared<platform::SilentCloudTabsNotice>();
}

}  // namespace bench
