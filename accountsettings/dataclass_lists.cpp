#include "accountsettings/dataclass_lists.h"

#include <algorithm>

namespace accountsettings {

std::vector<platform::Text> textsIn(const platform::Array& array) {
  std::vector<platform::Text> texts;
  texts.reserve(array.size());
  for (const platform::PropertyValue& element : array) {
    if (const platform::Text* const text = element.asText()) texts.push_back(*text);
  }
  return texts;
}

bool containsText(const std::vector<platform::Text>& list, std::string_view text) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

}  // namespace accountsettings
