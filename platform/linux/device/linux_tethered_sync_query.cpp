#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

constexpr std::string_view tetheredSyncDomain = "com.vorlix.mobile.tethered_sync";

// What the service held at the moment of connecting.
class LinuxTetheredSyncConnection final : public TetheredSyncConnection {
 public:
  explicit LinuxTetheredSyncConnection(Dictionary contents) : _contents{std::move(contents)} {}

  [[nodiscard]] std::optional<PropertyValue> value(std::string_view domain,
                                                   std::optional<std::string_view> key) override {
    if (domain != tetheredSyncDomain) return std::nullopt;
    if (!key) return _contents;
    const PropertyValue* const found = _contents.find(*key);
    return found == nullptr ? std::nullopt : std::optional{*found};
  }

 private:
  Dictionary _contents;
};

class LinuxTetheredSyncQuery final : public TetheredSyncQuery {
 public:
  explicit LinuxTetheredSyncQuery(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  Result<std::unique_ptr<TetheredSyncConnection>> connect() override {
    Result<Dictionary> contents = _configuration.ofUser(std::string{tetheredSyncDomain} + ".plist");
    if (!contents.isOk()) return contents.status();
    return std::make_unique<LinuxTetheredSyncConnection>(contents.take());
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<TetheredSyncQuery> makeTetheredSyncQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxTetheredSyncQuery>(std::move(configuration));
}

}  // namespace platform
