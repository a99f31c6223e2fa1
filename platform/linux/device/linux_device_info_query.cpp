#include <sys/utsname.h>

#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

constexpr std::string_view kArchitectureKey = "CPUArchitecture";

std::optional<PropertyValue> machineArchitecture() {
  utsname names{};
  if (::uname(&names) != 0) return std::nullopt;
  const std::string_view machine = static_cast<const char*>(names.machine);
  // The kernel adds the byte order, which accounts do not know of.
  return machine == "armv6l" ? "armv6" : machine;
}

std::optional<PropertyValue> textIn(const PropertyValue& value) {
  return value.asText() == nullptr ? std::nullopt : std::optional{value};
}

std::optional<PropertyValue> booleanIn(const PropertyValue& value) {
  const std::optional<bool> boolean = value.booleanValue();
  return boolean ? std::optional<PropertyValue>{*boolean} : std::nullopt;
}

std::optional<PropertyValue> answerIn(const Dictionary& info, std::string_view key) {
  const PropertyValue* const value = info.find(key);
  if (value == nullptr) return std::nullopt;
  if (key == "RegionalBehaviorGoogleMail") return booleanIn(*value);
  return key == kArchitectureKey || key == "DeviceClass" ? textIn(*value) : std::nullopt;
}

class LinuxDeviceInfoQuery final : public DeviceInfoQuery {
 public:
  explicit LinuxDeviceInfoQuery(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] std::optional<PropertyValue> answer(std::string_view key) const override {
    const Dictionary info = _configuration.ofSystem("device-info.plist").valueOr({});
    std::optional<PropertyValue> answer = answerIn(info, key);
    return !answer && key == kArchitectureKey ? machineArchitecture() : answer;
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<DeviceInfoQuery> makeDeviceInfoQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxDeviceInfoQuery>(std::move(configuration));
}

}  // namespace platform
