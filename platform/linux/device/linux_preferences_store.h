#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/preferences_store.h"
#include "platform/property_list_store.h"

namespace platform {

// The preferences that the user's home directory holds: the domain's switches are the keys of the property list
// HOME/Library/Preferences/DOMAIN.plist.
[[nodiscard]] std::shared_ptr<PreferencesStore> makePreferencesStore(std::shared_ptr<BaseDirectories> directories,
                                                                     std::shared_ptr<PropertyListStore> propertyLists);

}  // namespace platform
