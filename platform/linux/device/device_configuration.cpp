#include "platform/linux/device/device_configuration.h"

namespace platform {

Result<Dictionary> DeviceConfiguration::ofSystem(std::string_view name) const {
  return propertyLists->readDictionary(directories->systemRoot() / "etc/vorlix" / name);
}

Result<Dictionary> DeviceConfiguration::ofUser(std::string_view name) const {
  return propertyLists->readDictionary(directories->home() / "Library/Preferences" / name);
}

}  // namespace platform
