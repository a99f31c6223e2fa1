#include "platform/linux/device/linux_clock.h"

#include "platform/linux/device/icu_library.h"

namespace platform {
namespace {

Instant systemInstant() { return std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now()); }

class LinuxClock final : public Clock {
 public:
  explicit LinuxClock(std::function<Instant()> now) : _now{std::move(now)} {}

  Result<std::string> currentLocalTime(std::string_view pattern) const override {
    const IcuFunctions* const icu = icuFunctions();
    if (icu == nullptr) return Status::failure(Cause::missing, "tell the time", "there is no date library");
    std::optional<std::string> time = icu->localTime(_now().time_since_epoch().count(), pattern);
    if (time) return *std::move(time);
    return Status::failure(Cause::unsuitable, "tell the time",
                           "there is no such date pattern: " + std::string{pattern});
  }

 private:
  std::function<Instant()> _now;
};

}  // namespace

std::shared_ptr<Clock> makeClock(std::function<Instant()> now) {
  return std::make_shared<LinuxClock>(now ? std::move(now) : &systemInstant);
}

}  // namespace platform
