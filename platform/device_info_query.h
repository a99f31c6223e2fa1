#pragma once

#include <optional>
#include <string_view>

#include "platform/property_value.h"

namespace platform {

// What the device says of itself.
class DeviceInfoQuery {
 public:
  virtual ~DeviceInfoQuery() = default;
  // The answer to "CPUArchitecture" (text), "DeviceClass" (text) or "RegionalBehaviorGoogleMail" (boolean); nothing
  // where the device has no answer.
  [[nodiscard]] virtual std::optional<PropertyValue> answer(std::string_view key) const = 0;
};

}  // namespace platform
