#pragma once

#include <cstdint>

namespace platform {

enum class ManagedFeature : std::uint8_t {
  cloudDocumentSync,
  mediaStream,
  sharedStreams,
  cloudBackup,
  cardsWhileLocked
};

enum class Restriction : std::uint8_t { notSet = 0, allowed = 1, notAllowed = 2 };

// What the device's management profiles say of a feature at this moment.
class ProfileRestrictions {
 public:
  virtual ~ProfileRestrictions() = default;
  [[nodiscard]] virtual Restriction restriction(ManagedFeature feature) const = 0;
};

}  // namespace platform
