#pragma once

#include <cstdint>
#include <span>
#include <vector>

namespace platform {

enum class ManagedFeature : std::uint8_t {
  cloudDocumentSync,
  mediaStream,
  sharedStreams,
  cloudBackup,
  cardsWhileLocked
};

enum class Restriction : std::uint8_t { notSet = 0, allowed = 1, notAllowed = 2 };

// What the device's management profiles say at this moment.
class ProfileRestrictions {
 public:
  virtual ~ProfileRestrictions() = default;
  // Of each of the features, in their order. One question for them all: to ask costs a device a look at its files.
  [[nodiscard]] virtual std::vector<Restriction> restrictions(std::span<const ManagedFeature> features) const = 0;
};

}  // namespace platform
