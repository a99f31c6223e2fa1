#include "platform/linux/linux_localized_strings.h"

#include <unicode/locid.h>
#include <unicode/uloc.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <map>
#include <mutex>
#include <vector>

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

// The user's language and the more general ones, then English.
std::vector<std::string> languages() {
  const std::string environment = localeOfEnvironment();
  std::string name = icu::Locale::createCanonical(environment.c_str()).getBaseName();
  std::vector<std::string> names;
  while (!environment.empty() && isLanguageName(name)) {
    names.push_back(name);
    std::array<char, ULOC_FULLNAME_CAPACITY> parent{};
    UErrorCode error = U_ZERO_ERROR;
    ::uloc_getParent(name.c_str(), parent.data(), static_cast<std::int32_t>(parent.size()), &error);
    name = U_SUCCESS(error) != 0 ? parent.data() : "";
  }
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
    auto entries = _propertyLists->readDictionary(_directories->resources() / "strings" / name);
    return _tables.emplace(name, std::move(entries).value_or(Dictionary{})).first->second;
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
