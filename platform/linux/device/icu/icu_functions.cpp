#include "platform/linux/device/icu/icu_functions.h"

#include <unicode/gregocal.h>
#include <unicode/locid.h>
#include <unicode/smpdtfmt.h>
#include <unicode/uloc.h>

#include <array>
#include <memory>

namespace platform {
namespace {

icu::UnicodeString unicode(std::string_view text) {
  return icu::UnicodeString::fromUTF8({text.data(), static_cast<std::int32_t>(text.size())});
}

std::optional<std::string> localTime(std::int64_t millisecondsSince1970, std::string_view pattern) {
  const icu::Locale locale{"en", "US", "POSIX"};
  UErrorCode error = U_ZERO_ERROR;
  auto calendar = std::make_unique<icu::GregorianCalendar>(icu::TimeZone::detectHostTimeZone(), locale, error);
  if (U_SUCCESS(error) != 0) calendar->setGregorianChange(U_DATE_MIN, error);  // also before it was introduced
  icu::SimpleDateFormat format{unicode(pattern), locale, error};
  if (U_FAILURE(error) != 0) return std::nullopt;
  format.adoptCalendar(calendar.release());
  icu::UnicodeString text;
  // A letter that stands for nothing shows only now.
  format.format(static_cast<UDate>(millisecondsSince1970), text, nullptr, error);
  if (U_FAILURE(error) != 0) return std::nullopt;
  std::string utf8;
  return text.toUTF8String(utf8);
}

std::vector<std::string> localeNames(const std::string& environmentLocale) {
  std::vector<std::string> names;
  std::string name = icu::Locale::createCanonical(environmentLocale.c_str()).getBaseName();
  while (!name.empty()) {
    names.push_back(name);
    std::array<char, ULOC_FULLNAME_CAPACITY> parent{};
    UErrorCode error = U_ZERO_ERROR;
    ::uloc_getParent(name.c_str(), parent.data(), static_cast<std::int32_t>(parent.size()), &error);
    name = U_SUCCESS(error) != 0 ? parent.data() : "";
  }
  return names;
}

constexpr IcuFunctions kFunctions{.localTime = &localTime, .localeNames = &localeNames};

}  // namespace
}  // namespace platform

extern "C" __attribute__((visibility("default"))) const platform::IcuFunctions* accountPlatformIcuFunctions() {
  return &platform::kFunctions;
}
