#include "platform/linux/linux_platform.h"

#include "platform/default_platform.h"
#include "platform/linux/device/device_configuration.h"
#include "platform/linux/device/linux_clock.h"
#include "platform/linux/device/linux_localized_strings.h"
#include "platform/linux/device/linux_preferences_store.h"
#include "platform/linux/device/linux_unique_identifiers.h"
#include "platform/linux/files/linux_file_system.h"
#include "platform/linux/linux_base_directories.h"
#include "platform/linux/linux_module_loader.h"
#include "platform/linux/logs/bus_notices.h"
#include "platform/linux/logs/linux_console_log.h"
#include "platform/linux/logs/linux_system_log.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"

namespace platform {
namespace {

// What is said of them goes to the console that the process has by then.
std::shared_ptr<ExclusiveFileLocks> makeLocks(const LinuxPlatformOptions& options, const BaseDirectories& directories) {
  return makeFileLocks({.directory = options.lockDirectory.value_or(directories.systemRoot() / "tmp"),
                        .trees = treesOf(directories),
                        .manner = options.locks,
                        .say = [](std::string_view line) { current().console->write(line); }});
}

}  // namespace

Platform makeLinuxPlatform(const LinuxPlatformOptions& options) {
  Platform services;
  services.directories = makeBaseDirectories(options);
  services.files = makeFileSystem(*services.directories);
  services.propertyLists = makeLibplistPropertyListStore(services.files);
  const DeviceConfiguration configuration{services.directories, services.propertyLists};
  services.preferences = makePreferencesStore(services.directories, services.propertyLists);
  const std::shared_ptr<SystemBus> bus = makeSystemBus();
  services.preferencesChanged = makePreferencesChangedNotice(bus);
  services.cloudTabs = makeCloudTabsNotice(bus);
  services.locks = makeLocks(options, *services.directories);
  services.systemLog = makeSystemLog(systemLogSinks());
  services.console = makeConsoleLog();
  services.deviceInfo = makeDeviceInfoQuery(configuration);
  services.restrictions = makeProfileRestrictions(configuration);
  services.tetheredSync = makeTetheredSyncQuery(configuration);
  services.externalSources = makeExternalSourcesQuery(configuration);
  services.systemAccount = makeSystemAccountQuery();
  services.modules = makeModuleLoader();
  services.classes = makeProcessClassRegistry();
  services.strings = makeLocalizedStrings(services.directories, services.propertyLists);
  services.identifiers = makeUniqueIdentifiers();
  services.clock = makeClock();
  return services;
}

Platform makeDefaultPlatform() { return makeLinuxPlatform(); }

}  // namespace platform
