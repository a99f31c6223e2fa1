#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace platform {

// What ICU does for the platform. To load it would take an eighth of the time of a run on a device that is up to date,
// which has no use for it; so it stands in a library of its own, which exports one symbol.
struct IcuFunctions {
  // The instant in the local time zone, by a Unicode date pattern (UTS #35) in the locale en_US_POSIX and the proleptic
  // Gregorian calendar. Nothing where the pattern is invalid.
  std::optional<std::string> (*localTime)(std::int64_t millisecondsSince1970, std::string_view pattern);

  // The canonical name of a locale as the environment names it ("pt_BR.UTF-8"), without encoding, and those of the more
  // general ones: "pt_BR", "pt".
  std::vector<std::string> (*localeNames)(const std::string& environmentLocale);
};

// The symbol, and the function behind it.
constexpr const char* kIcuFunctionsSymbol = "accountPlatformIcuFunctions";
using IcuFunctionsGetter = const IcuFunctions* (*)();

}  // namespace platform
