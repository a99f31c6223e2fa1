#pragma once

#include <cstddef>
#include <optional>

#include "platform/property_value.h"

namespace platform {

constexpr std::size_t kLargestPropertyList = std::size_t{256} << 20U;
constexpr std::size_t kLargestXmlPropertyList = std::size_t{16} << 20U;

// The root dictionary of a property list in either form; nothing where it is refused. The bytes are this function's
// own: values that are merely malformed are repaired in them.
[[nodiscard]] std::optional<Dictionary> parsePropertyList(Bytes bytes);

}  // namespace platform
