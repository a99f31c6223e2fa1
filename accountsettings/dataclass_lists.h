#pragma once

#include <string_view>
#include <vector>

#include "platform/property_value.h"

// Lists of data classes and of actions as files hold them: arrays of texts, and whatever else somebody put there.
namespace accountsettings {

// The texts of an array, in their order; what is no text is left out.
[[nodiscard]] std::vector<platform::Text> textsIn(const platform::Array& array);

[[nodiscard]] bool containsText(const std::vector<platform::Text>& list, std::string_view text);

}  // namespace accountsettings
