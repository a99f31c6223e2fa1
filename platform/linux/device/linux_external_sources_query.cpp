#include "platform/linux/device/device_configuration.h"

namespace platform {
namespace {

std::string_view keyOf(SyncDataType type) {
  switch (type) {
    case SyncDataType::bookmarks: return "Bookmarks";
    case SyncDataType::calendars: return "Calendars";
    case SyncDataType::contacts: return "Contacts";
    case SyncDataType::notes: return "Notes";
  }
  return {};
}

ExternalSources sourcesWithin(const Dictionary& entry) {
  ExternalSources answer;
  if (const Array* const sources = entry.array("Sources")) answer.sources = *sources;
  if (const Text* const error = entry.text("Error")) answer.error = error->string();
  return answer;
}

class LinuxExternalSourcesQuery final : public ExternalSourcesQuery {
 public:
  explicit LinuxExternalSourcesQuery(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

  [[nodiscard]] ExternalSources enabledSources(SyncDataType type) const override {
    const Dictionary entries = _configuration.ofUser("com.vorlix.external-sources.plist").valueOr({});
    if (const Array* const sources = entries.array(keyOf(type))) return {*sources, std::nullopt};
    if (const Dictionary* const entry = entries.dictionary(keyOf(type))) return sourcesWithin(*entry);
    return {};
  }

 private:
  DeviceConfiguration _configuration;
};

}  // namespace

std::shared_ptr<ExternalSourcesQuery> makeExternalSourcesQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxExternalSourcesQuery>(std::move(configuration));
}

}  // namespace platform
