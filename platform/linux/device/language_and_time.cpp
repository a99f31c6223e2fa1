#include <dlfcn.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <ctime>
#include <map>
#include <mutex>
#include <vector>

#include "platform/linux/device/device_services.h"
#include "platform/linux/device/icu/icu_functions.h"
#include "platform/linux/files/file_services.h"

namespace platform {
namespace {

// ICU's functions, opened by the first who asks. Null where the library that has them does not stand where it was
// installed or cannot be opened: dates are then not written and texts are in English, but no account waits for that.
const IcuFunctions* icuFunctions() {
  static const IcuFunctions* const kFunctions = []() -> const IcuFunctions* {
    const std::string file = ownDirectory() / "account-settings/platform-icu.so";
    void* const library = ::dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
    if (library == nullptr) return nullptr;
    const auto getter = reinterpret_cast<IcuFunctionsGetter>(::dlsym(library, kIcuFunctionsSymbol));
    return getter == nullptr ? nullptr : getter();
  }();
  return kFunctions;
}

// --- Texts in the user's language ---

constexpr const char* kBaseLanguage = "en";

// The user's locale as the environment names it. None where it is that without user and language, in which a device
// starts: no ICU is needed to know that.
std::string localeOfEnvironment() {
  for (const char* const variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    const char* const value = std::getenv(variable);
    if (value == nullptr || *value == '\0') continue;
    const std::string locale = value;
    const std::string name = locale.substr(0, locale.find('.'));
    return name.empty() || name == "C" || name == "POSIX" ? std::string{} : locale;
  }
  return {};
}

// Whatever the environment says becomes part of a path only as a plain name.
bool isLanguageName(std::string_view name) {
  return !name.empty() && std::all_of(name.begin(), name.end(), [](char letter) {
    return (letter >= 'a' && letter <= 'z') || (letter >= 'A' && letter <= 'Z') || (letter >= '0' && letter <= '9') ||
           letter == '_';
  });
}

class LinuxLocalizedStrings final : public LocalizedStrings {
 public:
  explicit LinuxLocalizedStrings(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] std::optional<std::string> text(std::string_view table, std::string_view key) const override {
    if (table.find('/') != std::string_view::npos) return std::nullopt;
    const std::string file = std::string{table} + ".strings";
    const std::string locale = localeOfEnvironment();
    const IcuFunctions* const icu = locale.empty() ? nullptr : icuFunctions();
    std::vector<std::string> languages = icu == nullptr ? std::vector<std::string>{} : icu->localeNames(locale);
    languages.erase(std::ranges::find_if_not(languages, isLanguageName), languages.end());
    languages.emplace_back(kBaseLanguage);
    for (const std::string& language : languages) {
      const Dictionary entries = tableAt(Path{language} / file);
      if (const Text* const found = entries.text(key)) return found->string();
    }
    return std::nullopt;
  }

 private:
  [[nodiscard]] Dictionary tableAt(const Path& name) const {
    const std::scoped_lock lock{_guard};
    const auto known = _tables.find(name);
    if (known != _tables.end()) return known->second;
    Dictionary entries = _configuration.ofProduct(Path{"strings"} / name).valueOr({});
    return _tables.emplace(name, std::move(entries)).first->second;
  }

  DeviceConfiguration _configuration;
  mutable std::mutex _guard;
  mutable std::map<Path, Dictionary> _tables;
};

// --- The time of day ---

constexpr int kFirstYearOfTm = 1900;
constexpr int kDecember = 11;
constexpr int kDaysOfDecember = 31;
constexpr int kSaturday = 6;
constexpr std::chrono::milliseconds kTenth{100};

// Weeks end on Saturdays, and are of the year in which they end.
int yearOfWeek(const std::tm& day) {
  const bool endsInNextYear = day.tm_mon == kDecember && day.tm_mday + kSaturday - day.tm_wday > kDaysOfDecember;
  return day.tm_year + kFirstYearOfTm + (endsInNextYear ? 1 : 0);
}

// The time by a pattern whose letters stand alone, each for a plain number, with hyphens between them, as in the name
// of the migration's report. None for any other pattern, and before the first year: those need ICU.
std::optional<std::string> inPlainNumbers(Instant instant, std::string_view pattern) {
  const std::time_t seconds = std::chrono::floor<std::chrono::seconds>(instant).time_since_epoch().count();
  std::tm local{};
  ::tzset();
  if (::localtime_r(&seconds, &local) == nullptr || local.tm_year + kFirstYearOfTm < 1) return std::nullopt;
  const auto numberOf = [&](char letter) -> std::optional<int> {
    switch (letter) {
      case 'Y': return yearOfWeek(local);
      case 'M': return local.tm_mon + 1;
      case 'd': return local.tm_mday;
      case 'H': return local.tm_hour;
      case 'S': return static_cast<int>((instant - std::chrono::floor<std::chrono::seconds>(instant)) / kTenth);
      default: return std::nullopt;
    }
  };
  std::string text;
  for (std::size_t place = 0; place < pattern.size(); ++place) {
    const bool isHyphen = place % 2 == 1;
    const std::optional<int> number = numberOf(pattern[place]);
    if (isHyphen ? pattern[place] != '-' : !number) return std::nullopt;
    text += isHyphen ? "-" : std::to_string(*number);
  }
  return text;
}

class LinuxClock final : public Clock {
 public:
  explicit LinuxClock(std::function<Instant()> now) : _now{std::move(now)} {}

  Result<std::string> currentLocalTime(std::string_view pattern) const override {
    const Instant now = _now();
    if (std::optional<std::string> numbers = inPlainNumbers(now, pattern)) return *std::move(numbers);
    const IcuFunctions* const icu = icuFunctions();
    if (icu == nullptr) return Status::failure(Cause::missing, "tell the time", "there is no date library");
    std::optional<std::string> time = icu->localTime(now.time_since_epoch().count(), pattern);
    if (time) return *std::move(time);
    return Status::failure(Cause::unsuitable, "tell the time",
                           "there is no such date pattern: " + std::string{pattern});
  }

 private:
  std::function<Instant()> _now;
};

}  // namespace

std::shared_ptr<LocalizedStrings> makeLocalizedStrings(DeviceConfiguration configuration) {
  return std::make_shared<LinuxLocalizedStrings>(std::move(configuration));
}

std::shared_ptr<Clock> makeClock(std::function<Instant()> now) {
  const auto systemInstant = [] {
    return std::chrono::floor<std::chrono::milliseconds>(std::chrono::system_clock::now());
  };
  return std::make_shared<LinuxClock>(now ? std::move(now) : systemInstant);
}

}  // namespace platform
