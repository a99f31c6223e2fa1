#pragma once

#include <chrono>
#include <functional>
#include <memory>

#include "platform/base_directories.h"
#include "platform/device_answers.h"
#include "platform/export.h"
#include "platform/language_and_time.h"
#include "platform/property_list_store.h"

namespace platform {

// What a device is asked about itself is answered from its own configuration: property lists that are read anew at each
// question. Every file and every key is optional, and a value of the wrong kind is no answer.
struct DeviceConfiguration {
  std::shared_ptr<BaseDirectories> directories;
  std::shared_ptr<PropertyListStore> propertyLists;

  // The dictionary in ROOT/etc/vorlix/NAME, HOME/Library/Preferences/NAME or RESOURCES/NAME.
  [[nodiscard]] Result<Dictionary> ofSystem(std::string_view name) const;
  [[nodiscard]] Result<Dictionary> ofUser(std::string_view name) const;
  [[nodiscard]] Result<Dictionary> ofProduct(const Path& name) const;
};

// ROOT/etc/vorlix/device-info.plist: the keys of the questions. Without an answer there, "CPUArchitecture" is the
// machine's, as the kernel names it.
[[nodiscard]] std::shared_ptr<DeviceInfoQuery> makeDeviceInfoQuery(DeviceConfiguration configuration);

// ROOT/etc/vorlix/profile-restrictions.plist: CloudDocumentSync, MediaStream, SharedStreams, CloudBackup and
// CardsWhileLocked, true for allowed and false for not allowed.
[[nodiscard]] std::shared_ptr<ProfileRestrictions> makeProfileRestrictions(DeviceConfiguration configuration);

// HOME/Library/Preferences/com.vorlix.mobile.tethered_sync.plist: one value per key of the domain of that name. Without
// that file the service cannot be reached.
[[nodiscard]] std::shared_ptr<TetheredSyncQuery> makeTetheredSyncQuery(DeviceConfiguration configuration);

// HOME/Library/Preferences/com.vorlix.external-sources.plist: Bookmarks, Calendars, Contacts and Notes, each an array
// of sources or a dictionary with "Sources" (array) and "Error" (text).
[[nodiscard]] std::shared_ptr<ExternalSourcesQuery> makeExternalSourcesQuery(DeviceConfiguration configuration);

// Fixed for every device.
[[nodiscard]] std::shared_ptr<SystemAccountQuery> makeSystemAccountQuery();

// The preferences that the user's home directory holds: the domain's switches are the keys of the property list
// HOME/Library/Preferences/DOMAIN.plist.
[[nodiscard]] std::shared_ptr<PreferencesStore> makePreferencesStore(DeviceConfiguration configuration);

// String tables lie in the resources as property lists, one dictionary from key to text each:
//
//   RESOURCES/strings/LANGUAGE/TABLE.strings
//
// LANGUAGE is a locale's name without encoding ("pt_BR", "pt", "en"). The user's language is that of the environment
// (LC_ALL, LC_MESSAGES, LANG); a key is looked up in its table, then in those of the ever more general languages
// ("pt_BR", "pt"), then in English. A table is read once.
[[nodiscard]] std::shared_ptr<LocalizedStrings> makeLocalizedStrings(DeviceConfiguration configuration);

[[nodiscard]] std::shared_ptr<UniqueIdentifiers> makeUniqueIdentifiers();

using Instant = std::chrono::sys_time<std::chrono::milliseconds>;

// The clock that shows the instant which `now` answers; without one, the system's.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<Clock> makeClock(std::function<Instant()> now = nullptr);

}  // namespace platform
