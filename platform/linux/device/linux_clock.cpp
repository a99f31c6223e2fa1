#include "platform/linux/device/linux_clock.h"

#include "platform/linux/device/icu_library.h"

namespace platform {
namespace {

Instant systemInstant() { return std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now()); }

class LinuxClock final : public Clock {
 public:
  explicit LinuxClock(std::function<Instant()> now) : _now{std::move(now)} {}

  [[nodiscard]] std::string currentLocalTime(std::string_view pattern) const override {
    const IcuFunctions* const icu = icuFunctions();
    return icu == nullptr ? std::string{} : icu->localTime(_now().time_since_epoch().count(), pattern);
  }

 private:
  std::function<Instant()> _now;
};

}  // namespace

std::shared_ptr<Clock> makeClock(std::function<Instant()> now) {
  return std::make_shared<LinuxClock>(now ? std::move(now) : &systemInstant);
}

}  // namespace platform
