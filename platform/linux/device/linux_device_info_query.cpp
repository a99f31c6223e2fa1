#include <sys/utsname.h>

#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

constexpr std::string_view architectureKey = "CPUArchitecture";

std::optional<PropertyValue> machineArchitecture() {
  utsname names{};
  if (::uname(&names) != 0) return std::nullopt;
  const std::string_view machine = static_cast<const char*>(names.machine);
  // The kernel adds the byte order, which accounts do not know of.
  return machine == "armv6l" ? "armv6" : machine;
}

bool isOfTheKeysKind(std::string_view key, const PropertyValue& value) {
  if (key == architectureKey || key == "DeviceClass") return value.asText() != nullptr;
  return key == "RegionalBehaviorGoogleMail" && value.asBoolean() != nullptr;
}

class LinuxDeviceInfoQuery final : public DeviceInfoQuery {
 public:
  explicit LinuxDeviceInfoQuery(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] std::optional<PropertyValue> answer(std::string_view key) const override {
    const Dictionary info = _configuration.ofSystem("device-info.plist").valueOr({});
    const PropertyValue* const value = info.find(key);
    if (value != nullptr && isOfTheKeysKind(key, *value)) return *value;
    return key == architectureKey ? machineArchitecture() : std::nullopt;
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<DeviceInfoQuery> makeDeviceInfoQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxDeviceInfoQuery>(std::move(configuration));
}

}  // namespace platform
