#pragma once

#include <cstddef>
#include <memory>
#include <string>

#include "platform/property_list_store.h"
#include "platform/property_value.h"
#include "platform/status.h"

namespace platform {

constexpr std::size_t kMaxPropertyListSize = std::size_t{256} << 20U;
constexpr std::size_t kMaxXmlPropertyListSize = std::size_t{16} << 20U;

struct ParsedPropertyList {
  Dictionary values;
  // Whether the bytes are a binary property list that holds these values in their order and nothing else, so that they
  // are as good as what would be written for the values.
  bool isFaithful = false;
};

// The root dictionary of a property list in either form; where it is refused, it is excessive, malformed or unsuitable
// (see property_list_store.h), and `attempt` is what was tried. The bytes are this function's own: values that are
// merely malformed are repaired in them.
Result<ParsedPropertyList> parsePropertyList(Bytes bytes, std::string attempt);

// The dictionary as a binary property list, read back and compared before it is answered: bytes, or
// why there are none, never both.
[[nodiscard]] SerializedPropertyList writePropertyList(const Dictionary& dictionary);

}  // namespace platform
