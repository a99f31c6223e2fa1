#include "platform/linux/linux_platform.h"

#include "platform/linux/device/device_services.h"
#include "platform/linux/files/file_services.h"
#include "platform/linux/linux_services.h"
#include "platform/linux/logs/logs_and_notices.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"

namespace platform {
Platform makeLinuxPlatform(const LinuxPlatformOptions& options) {
  Platform services;
  services.directories = makeBaseDirectories(options);
  services.files = makeFileSystem(*services.directories);
  services.propertyLists = makeLibplistPropertyListStore(services.files);
  const DeviceConfiguration configuration{services.directories, services.propertyLists};
  services.preferences = makePreferencesStore(configuration);
  const std::shared_ptr<SystemBus> bus = makeSystemBus();
  services.preferencesChanged = makePreferencesChangedNotice(bus);
  services.cloudTabs = makeCloudTabsNotice(bus);
  // What is said of locks goes to the console that the process has by then.
  services.locks =
      makeFileLocks({.directory = options.lockDirectory.value_or(services.directories->systemRoot() / "tmp"),
                     .trees = treesOf(*services.directories),
                     .manner = options.locks,
                     .say = [](std::string_view line) { current().console->write(line); }});
  services.systemLog = makeSystemLog(systemLogSinks());
  services.console = makeConsoleLog();
  services.deviceInfo = makeDeviceInfoQuery(configuration);
  services.restrictions = makeProfileRestrictions(configuration);
  services.tetheredSync = makeTetheredSyncQuery(configuration);
  services.externalSources = makeExternalSourcesQuery(configuration);
  services.systemAccount = makeSystemAccountQuery();
  services.modules = makeModuleLoader();
  services.classes = makeProcessClassRegistry();
  services.strings = makeLocalizedStrings(configuration);
  services.identifiers = makeUniqueIdentifiers();
  services.clock = makeClock();
  return services;
}

Platform makeDefaultPlatform() { return makeLinuxPlatform(); }

}  // namespace platform
