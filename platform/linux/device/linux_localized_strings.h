#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/localized_strings.h"
#include "platform/property_list_store.h"

namespace platform {

// String tables lie in the resources as property lists, one dictionary from key to text each:
//
//   RESOURCES/strings/LANGUAGE/TABLE.strings
//
// LANGUAGE is a locale's name without encoding ("pt_BR", "pt", "en"). The user's language is that of the environment
// (LC_ALL, LC_MESSAGES, LANG); a key is looked up in its table, then in those of the ever more general languages
// ("pt_BR", "pt"), then in English. A table is read once.
[[nodiscard]] std::shared_ptr<LocalizedStrings> makeLocalizedStrings(std::shared_ptr<BaseDirectories> directories,
                                                                     std::shared_ptr<PropertyListStore> propertyLists);

}  // namespace platform
