#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/device_answers.h"
#include "platform/exclusive_file_lock.h"
#include "platform/export.h"
#include "platform/file_system.h"
#include "platform/language_and_time.h"
#include "platform/logs_and_notices.h"
#include "platform/modules.h"
#include "platform/property_list_store.h"

namespace platform {

class RunObserver;

// The services of the operating system, as one process uses them. Every member but the observer is set.
struct Platform {
  std::shared_ptr<BaseDirectories> directories;
  std::shared_ptr<FileSystem> files;
  std::shared_ptr<PropertyListStore> propertyLists;
  std::shared_ptr<PreferencesStore> preferences;
  std::shared_ptr<PreferencesChangedNotice> preferencesChanged;
  std::shared_ptr<CloudTabsNotice> cloudTabs;
  std::shared_ptr<ExclusiveFileLocks> locks;
  std::shared_ptr<SystemLog> systemLog;
  std::shared_ptr<ConsoleLog> console;
  std::shared_ptr<DeviceInfoQuery> deviceInfo;
  std::shared_ptr<ProfileRestrictions> restrictions;
  std::shared_ptr<TetheredSyncQuery> tetheredSync;
  std::shared_ptr<ExternalSourcesQuery> externalSources;
  std::shared_ptr<SystemAccountQuery> systemAccount;
  std::shared_ptr<ModuleLoader> modules;
  std::shared_ptr<ClassRegistry> classes;
  std::shared_ptr<LocalizedStrings> strings;
  std::shared_ptr<UniqueIdentifiers> identifiers;
  std::shared_ptr<Clock> clock;
  std::shared_ptr<RunObserver> observer;  // null where nobody watches
};

// The device's own platform, with no option set. An embedding program may replace what it wants to and set that.
[[nodiscard]] ACCOUNT_EXPORT Platform makeDefaultPlatform();

// The process's platform, kept for the life of the process: destructors of globals may use it. Until somebody sets one
// it is the device's own, made at the first call.
[[nodiscard]] ACCOUNT_EXPORT const Platform& current();

// Sets the process's platform. To be called before the first use of anything that is built on it, from one thread; what
// earlier calls of `current` answered is void afterwards.
ACCOUNT_EXPORT void setCurrent(Platform platform);

}  // namespace platform
