#pragma once

#include <algorithm>
#include <string_view>
#include <vector>

#include "platform/property_value.h"

// Lists of data classes and of actions as files hold them: arrays of texts, and whatever else somebody put there.
namespace accountsettings {

// The texts of an array, in their order; what is no text is left out.
[[nodiscard]] inline std::vector<platform::Text> textsIn(const platform::Array& array) {
  std::vector<platform::Text> texts;
  texts.reserve(array.size());
  for (const platform::PropertyValue& element : array) {
    if (const platform::Text* const text = element.asText()) texts.push_back(*text);
  }
  return texts;
}

[[nodiscard]] inline bool containsText(const std::vector<platform::Text>& list, std::string_view text) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

}  // namespace accountsettings
