#pragma once

#include <memory>

#include "platform/cloud_tabs_notice.h"
#include "platform/preferences_changed_notice.h"

namespace platform {

// The connection to the system bus that the notices share. It is made at the first notice and again where it broke.
class SystemBus;
[[nodiscard]] std::shared_ptr<SystemBus> makeSystemBus();

// Notices as signals on the system bus: path /com/vorlix/Notices, interface com.vorlix.Notices1, members
// PreferencesChanged (domain, key) and CloudTabs (whether enabled). Without a bus, or with one that does not answer
// within a second, a notice is lost; that is never an error.
[[nodiscard]] std::shared_ptr<PreferencesChangedNotice> makePreferencesChangedNotice(std::shared_ptr<SystemBus> bus);
[[nodiscard]] std::shared_ptr<CloudTabsNotice> makeCloudTabsNotice(std::shared_ptr<SystemBus> bus);

}  // namespace platform
