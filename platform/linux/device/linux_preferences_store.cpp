#include "platform/linux/device/linux_preferences_store.h"

#include <map>
#include <string>

namespace platform {
namespace {

class LinuxPreferencesStore final : public PreferencesStore {
 public:
  LinuxPreferencesStore(std::shared_ptr<BaseDirectories> directories, std::shared_ptr<PropertyListStore> propertyLists)
      : _directories{std::move(directories)}, _propertyLists{std::move(propertyLists)} {}

  void synchronize(std::string_view domain) override {
    const bool isFileName = domain.find('/') == std::string_view::npos;
    const Path file = _directories->home() / "Library/Preferences" / (std::string{domain} + ".plist");
    Dictionary contents = isFileName ? _propertyLists->readDictionary(file).valueOr({}) : Dictionary{};
    _domains.insert_or_assign(std::string{domain}, std::move(contents));
  }

  [[nodiscard]] std::optional<bool> boolean(std::string_view domain, std::string_view key) const override {
    const auto contents = _domains.find(domain);
    const PropertyValue* const value = contents == _domains.end() ? nullptr : contents->second.find(key);
    return value == nullptr ? std::nullopt : value->booleanValue();
  }

 private:
  std::shared_ptr<BaseDirectories> _directories;
  std::shared_ptr<PropertyListStore> _propertyLists;
  std::map<std::string, Dictionary, std::less<>> _domains;
};

}  // namespace

std::shared_ptr<PreferencesStore> makePreferencesStore(std::shared_ptr<BaseDirectories> directories,
                                                       std::shared_ptr<PropertyListStore> propertyLists) {
  return std::make_shared<LinuxPreferencesStore>(std::move(directories), std::move(propertyLists));
}

}  // namespace platform
