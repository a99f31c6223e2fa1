#include "platform/linux/property_lists/libplist_comparison.h"

#include <plist/plist.h>

#include <algorithm>

#include "platform/linux/property_lists/libplist_node.h"

namespace platform {
namespace {

bool holds(plist_t node, const PropertyValue& value);

bool holdsText(plist_t node, const Text* text) { return text != nullptr && *text == textOfLibplist(node); }

bool holdsData(plist_t node, const Bytes* data) {
  return data != nullptr && std::ranges::equal(*data, dataOfLibplist(node));
}

bool holdsArray(plist_t node, const Array* array) {
  if (array == nullptr || array->size() != plist_array_get_size(node)) return false;
  LibplistArrayItems items{node};
  return std::ranges::all_of(*array, [&items](const PropertyValue& element) { return holds(items.next(), element); });
}

bool holdsDictionary(plist_t node, const Dictionary* dictionary) {
  return dictionary != nullptr && holdsInOrder(node, *dictionary);
}

bool holds(plist_t node, const PropertyValue& value) {
  switch (plist_get_node_type(node)) {
    case PLIST_STRING: return holdsText(node, value.asText());
    case PLIST_DATA: return holdsData(node, value.asData());
    case PLIST_ARRAY: return holdsArray(node, value.asArray());
    case PLIST_DICT: return holdsDictionary(node, value.asDictionary());
    default: return scalarOfLibplist(node) == value;
  }
}

}  // namespace

bool holdsInOrder(void* tree, const Dictionary& values) {
  if (values.size() != plist_dict_get_size(tree)) return false;
  LibplistEntries entries{tree};
  return std::all_of(values.begin(), values.end(), [&entries](const Dictionary::Entry& entry) {
    return entries.advance() && entries.hasKey(entry.key.cString()) && holds(entries.item(), entry.value);
  });
}

}  // namespace platform
