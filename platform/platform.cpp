#include "platform/platform.h"

#include <mutex>
#include <optional>

#include "platform/kept_for_life.h"

namespace platform {
namespace {

struct Held {
  std::mutex guard;
  std::optional<Platform> platform;
};

Held& held() {
  static Held& held = keptForLife<Held>();
  return held;
}

}  // namespace

const Platform& current() {
  const std::scoped_lock lock{held().guard};
  std::optional<Platform>& platform = held().platform;
  if (!platform) platform = makeDefaultPlatform();
  return *platform;
}

void setCurrent(Platform platform) {
  const std::scoped_lock lock{held().guard};
  held().platform = std::move(platform);
}

}  // namespace platform
