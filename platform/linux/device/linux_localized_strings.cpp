#include "platform/linux/device/linux_localized_strings.h"

#include <algorithm>
#include <cstdlib>
#include <map>
#include <mutex>
#include <vector>

#include "platform/linux/device/icu_library.h"

namespace platform {
namespace {

constexpr const char* baseLanguage = "en";

std::string localeOfEnvironment() {
  for (const char* const variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) {
    const char* const value = std::getenv(variable);
    if (value != nullptr && *value != '\0') return value;
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

// The locale in which there is no user and no language. A device starts in it, and ICU is not needed to know that.
bool isOfNobody(std::string_view locale) {
  const std::string_view name = locale.substr(0, locale.find('.'));
  return name.empty() || name == "C" || name == "POSIX";
}

// The user's language and the more general ones, then English.
std::vector<std::string> languages() {
  const std::string environment = localeOfEnvironment();
  const IcuFunctions* const icu = isOfNobody(environment) ? nullptr : icuFunctions();
  std::vector<std::string> names = icu == nullptr ? std::vector<std::string>{} : icu->localeNames(environment);
  names.erase(std::ranges::find_if_not(names, isLanguageName), names.end());
  names.emplace_back(baseLanguage);
  return names;
}

class LinuxLocalizedStrings final : public LocalizedStrings {
 public:
  LinuxLocalizedStrings(std::shared_ptr<BaseDirectories> directories, std::shared_ptr<PropertyListStore> propertyLists)
      : _directories{std::move(directories)}, _propertyLists{std::move(propertyLists)} {}

  [[nodiscard]] std::optional<std::string> text(std::string_view table, std::string_view key) const override {
    if (table.find('/') != std::string_view::npos) return std::nullopt;
    const std::string file = std::string{table} + ".strings";
    for (const std::string& language : languages()) {
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
    Dictionary entries = _propertyLists->readDictionary(_directories->resources() / "strings" / name).valueOr({});
    return _tables.emplace(name, std::move(entries)).first->second;
  }

  std::shared_ptr<BaseDirectories> _directories;
  std::shared_ptr<PropertyListStore> _propertyLists;
  mutable std::mutex _guard;
  mutable std::map<Path, Dictionary> _tables;
};

}  // namespace

std::shared_ptr<LocalizedStrings> makeLocalizedStrings(std::shared_ptr<BaseDirectories> directories,
                                                       std::shared_ptr<PropertyListStore> propertyLists) {
  return std::make_shared<LinuxLocalizedStrings>(std::move(directories), std::move(propertyLists));
}

}  // namespace platform
