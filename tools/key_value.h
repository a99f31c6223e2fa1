#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/property_value.h"

namespace tools {

// A property as it is written on the command line: `KEY=VALUE` for a text, `KEY:=JSON` for any other value, and
// `KEY:=null` for none at all.
struct KeyValue {
  std::string key;
  std::optional<platform::PropertyValue> value;
};

// `position` is the argument's, counted from 1, for the message: the argument itself may hold a credential and is never
// repeated. Throws Failure (wrong use).
[[nodiscard]] KeyValue parseKeyValue(std::string_view argument, std::size_t position);

}  // namespace tools
