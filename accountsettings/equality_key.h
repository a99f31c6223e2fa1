#pragma once

#include <string>

#include "platform/export.h"
#include "platform/property_value.h"

namespace accountsettings {

// Bytes that equal values share, and only they: with them, equal values of a long list are found in one walk, however
// many of them differ in their last part only.
[[nodiscard]] ACCOUNT_EXPORT std::string equalityKey(const platform::PropertyValue& value);

}  // namespace accountsettings
