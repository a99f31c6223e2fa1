#pragma once

#include <string>
#include <string_view>

#include "platform/property_value.h"

namespace tools {

// A property as it is written on the command line: `KEY=VALUE` for a text, `KEY:=JSON` for any other value.
struct KeyValue {
  std::string key;
  platform::PropertyValue value;
};

// `position` is the argument's, counted from 1, for the message: the argument itself may hold a credential and is never
// repeated. Throws Failure (wrong use).
[[nodiscard]] KeyValue parseKeyValue(std::string_view argument, std::size_t position);

}  // namespace tools
