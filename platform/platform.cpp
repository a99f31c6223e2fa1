#include "platform/platform.h"

#include <mutex>
#include <optional>

#include "platform/default_platform.h"

namespace platform {
namespace {

std::mutex& guard() {
  static std::mutex mutex;
  return mutex;
}

std::optional<Platform>& held() {
  static std::optional<Platform> platform;
  return platform;
}

}  // namespace

const Platform& current() {
  const std::scoped_lock lock{guard()};
  if (!held()) held() = makeDefaultPlatform();
  return *held();
}

void setCurrent(Platform platform) {
  const std::scoped_lock lock{guard()};
  held() = std::move(platform);
}

}  // namespace platform
