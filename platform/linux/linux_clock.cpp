#include "platform/linux/linux_clock.h"

#include <unicode/gregocal.h>
#include <unicode/smpdtfmt.h>

namespace platform {
namespace {

icu::UnicodeString unicode(std::string_view text) {
  return icu::UnicodeString::fromUTF8({text.data(), static_cast<std::int32_t>(text.size())});
}

// The Gregorian calendar at all times, also before it was introduced.
std::unique_ptr<icu::Calendar> prolepticCalendar(const icu::Locale& locale, UErrorCode& error) {
  auto calendar = std::make_unique<icu::GregorianCalendar>(icu::TimeZone::detectHostTimeZone(), locale, error);
  if (U_SUCCESS(error) != 0) calendar->setGregorianChange(U_DATE_MIN, error);
  return calendar;
}

Instant systemInstant() { return std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now()); }

class LinuxClock final : public Clock {
 public:
  explicit LinuxClock(std::function<Instant()> now) : _now{std::move(now)} {}

  [[nodiscard]] std::string currentLocalTime(std::string_view pattern) const override {
    const icu::Locale locale{"en", "US", "POSIX"};
    UErrorCode error = U_ZERO_ERROR;
    auto calendar = prolepticCalendar(locale, error);
    icu::SimpleDateFormat format{unicode(pattern), locale, error};
    if (U_FAILURE(error) != 0) return {};
    format.adoptCalendar(calendar.release());
    const auto sinceEpoch = static_cast<UDate>(_now().time_since_epoch().count());
    icu::UnicodeString text;
    // A letter that stands for nothing shows only now.
    format.format(sinceEpoch, text, nullptr, error);
    std::string utf8;
    return U_SUCCESS(error) != 0 ? text.toUTF8String(utf8) : std::string{};
  }

 private:
  std::function<Instant()> _now;
};

}  // namespace

std::shared_ptr<Clock> makeClock(std::function<Instant()> now) {
  return std::make_shared<LinuxClock>(now ? std::move(now) : &systemInstant);
}

}  // namespace platform
