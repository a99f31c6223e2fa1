#include <algorithm>
#include <iterator>

#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

std::string_view keyOf(ManagedFeature feature) {
  switch (feature) {
    case ManagedFeature::cloudDocumentSync: return "CloudDocumentSync";
    case ManagedFeature::mediaStream: return "MediaStream";
    case ManagedFeature::sharedStreams: return "SharedStreams";
    case ManagedFeature::cloudBackup: return "CloudBackup";
    case ManagedFeature::cardsWhileLocked: return "CardsWhileLocked";
  }
  return {};
}

Restriction restrictionIn(const Dictionary& profiles, ManagedFeature feature) {
  const PropertyValue* const value = profiles.find(keyOf(feature));
  const std::optional<bool> isAllowed = value == nullptr ? std::nullopt : value->booleanValue();
  if (!isAllowed) return Restriction::notSet;
  return *isAllowed ? Restriction::allowed : Restriction::notAllowed;
}

class LinuxProfileRestrictions final : public ProfileRestrictions {
 public:
  explicit LinuxProfileRestrictions(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] std::vector<Restriction> restrictions(std::span<const ManagedFeature> features) const override {
    const Dictionary profiles = _configuration.ofSystem("profile-restrictions.plist").valueOr({});
    std::vector<Restriction> answers;
    std::ranges::transform(features, std::back_inserter(answers),
                           [&profiles](ManagedFeature feature) { return restrictionIn(profiles, feature); });
    return answers;
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<ProfileRestrictions> makeProfileRestrictions(DeviceConfiguration configuration) {
  return std::make_shared<LinuxProfileRestrictions>(std::move(configuration));
}

}  // namespace platform
