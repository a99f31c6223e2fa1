#include <sys/random.h>
#include <sys/utsname.h>

#include <array>
#include <cerrno>
#include <map>
#include <string>

#include "platform/linux/device/device_services.h"

namespace platform {
namespace {

// A service that the device's configuration answers.
template <typename Service>
class Configured : public Service {
 public:
  explicit Configured(DeviceConfiguration configuration) : _configuration{std::move(configuration)} {}

 protected:
  DeviceConfiguration _configuration;
};

// --- What the device is ---

constexpr std::string_view kArchitectureKey = "CPUArchitecture";

std::optional<PropertyValue> machineArchitecture() {
  utsname names{};
  if (::uname(&names) != 0) return std::nullopt;
  const std::string_view machine = static_cast<const char*>(names.machine);
  // The kernel adds the byte order, which accounts do not know of.
  return machine == "armv6l" ? "armv6" : machine;
}

class LinuxDeviceInfoQuery final : public Configured<DeviceInfoQuery> {
 public:
  using Configured::Configured;

  [[nodiscard]] std::optional<PropertyValue> answer(std::string_view key) const override {
    const Dictionary info = _configuration.ofSystem("device-info.plist").valueOr({});
    if (key == "RegionalBehaviorGoogleMail") {
      const PropertyValue* const value = info.find(key);
      const std::optional<bool> isSo = value == nullptr ? std::nullopt : value->booleanValue();
      return isSo ? std::optional<PropertyValue>{*isSo} : std::nullopt;
    }
    if (key != kArchitectureKey && key != "DeviceClass") return std::nullopt;
    if (const Text* const text = info.text(key)) return *text;
    return key == kArchitectureKey ? machineArchitecture() : std::nullopt;
  }
};

// --- What profiles allow ---

std::string_view keyOf(ManagedFeature feature) {
  switch (feature) {
    case ManagedFeature::cloudDocumentSync: return "CloudDocumentSync";
    case ManagedFeature::mediaStream: return "MediaStream";
    case ManagedFeature::sharedStreams: return "SharedStreams";
    case ManagedFeature::cloudBackup: return "CloudBackup";
    case ManagedFeature::cardsWhileLocked: return "CardsWhileLocked";
  }
  return {};
}

class LinuxProfileRestrictions final : public Configured<ProfileRestrictions> {
 public:
  using Configured::Configured;

  [[nodiscard]] std::vector<Restriction> restrictions(std::span<const ManagedFeature> features) const override {
    const Dictionary profiles = _configuration.ofSystem("profile-restrictions.plist").valueOr({});
    std::vector<Restriction> answers;
    for (const ManagedFeature feature : features) {
      const PropertyValue* const value = profiles.find(keyOf(feature));
      const std::optional<bool> isAllowed = value == nullptr ? std::nullopt : value->booleanValue();
      const Restriction ifSet = isAllowed.value_or(false) ? Restriction::allowed : Restriction::notAllowed;
      answers.push_back(isAllowed ? ifSet : Restriction::notSet);
    }
    return answers;
  }
};

// --- Syncing over a cable, and from other sources ---

constexpr std::string_view kTetheredSyncDomain = "com.vorlix.mobile.tethered_sync";

// What the service held at the moment of connecting.
class LinuxTetheredSyncConnection final : public TetheredSyncConnection {
 public:
  explicit LinuxTetheredSyncConnection(Dictionary contents) : _contents{std::move(contents)} {}

  [[nodiscard]] std::optional<PropertyValue> value(std::string_view domain,
                                                   std::optional<std::string_view> key) override {
    if (domain != kTetheredSyncDomain) return std::nullopt;
    if (!key) return _contents;
    const PropertyValue* const found = _contents.find(*key);
    return found == nullptr ? std::nullopt : std::optional{*found};
  }

 private:
  Dictionary _contents;
};

class LinuxTetheredSyncQuery final : public Configured<TetheredSyncQuery> {
 public:
  using Configured::Configured;

  Result<std::unique_ptr<TetheredSyncConnection>> connect() override {
    Result<Dictionary> contents = _configuration.ofUser(std::string{kTetheredSyncDomain} + ".plist");
    if (!contents.isOk()) return contents.status();
    return std::make_unique<LinuxTetheredSyncConnection>(contents.take());
  }
};

std::string_view keyOf(SyncDataType type) {
  switch (type) {
    case SyncDataType::bookmarks: return "Bookmarks";
    case SyncDataType::calendars: return "Calendars";
    case SyncDataType::contacts: return "Contacts";
    case SyncDataType::notes: return "Notes";
  }
  return {};
}

class LinuxExternalSourcesQuery final : public Configured<ExternalSourcesQuery> {
 public:
  using Configured::Configured;

  [[nodiscard]] ExternalSources enabledSources(SyncDataType type) const override {
    const Dictionary entries = _configuration.ofUser("com.vorlix.external-sources.plist").valueOr({});
    if (const Array* const sources = entries.array(keyOf(type))) return {*sources, std::nullopt};
    const Dictionary* const entry = entries.dictionary(keyOf(type));
    if (entry == nullptr) return {};
    ExternalSources answer;
    if (const Array* const sources = entry->array("Sources")) answer.sources = *sources;
    if (const Text* const error = entry->text("Error")) answer.error = error->string();
    return answer;
  }
};

// --- The system's account ---

class LinuxSystemAccountQuery final : public SystemAccountQuery {
 public:
  [[nodiscard]] Text hostedServiceStatusKey() const override { return StringConstant{"hostedServiceStatus"}; }
  [[nodiscard]] std::optional<Text> primaryAccountKey() const override {
    return Text{StringConstant{"primaryAccount"}};
  }
  [[nodiscard]] Text systemAccountTypeString() const override { return StringConstant{"Cirrant"}; }
};

// --- Preferences ---

class LinuxPreferencesStore final : public Configured<PreferencesStore> {
 public:
  using Configured::Configured;

  void synchronize(std::string_view domain) override {
    const bool isFileName = domain.find('/') == std::string_view::npos;
    const std::string file = std::string{domain} + ".plist";
    Dictionary contents = isFileName ? _configuration.ofUser(file).valueOr({}) : Dictionary{};
    _domains.insert_or_assign(std::string{domain}, std::move(contents));
  }

  [[nodiscard]] std::optional<bool> boolean(std::string_view domain, std::string_view key) const override {
    const auto contents = _domains.find(domain);
    const PropertyValue* const value = contents == _domains.end() ? nullptr : contents->second.find(key);
    return value == nullptr ? std::nullopt : value->booleanValue();
  }

 private:
  std::map<std::string, Dictionary, std::less<>> _domains;
};

// --- Identifiers ---

class LinuxUniqueIdentifiers final : public UniqueIdentifiers {
 public:
  Result<std::string> makeUuid() override {
    std::array<unsigned char, 16> bytes{};
    if (::getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
      const int cause = errno;
      return Status::failure(cause, "make an identifier");
    }
    bytes[6] = static_cast<unsigned char>((bytes[6] & 0x0FU) | 0x40U);  // version 4: made of random numbers
    bytes[8] = static_cast<unsigned char>((bytes[8] & 0x3FU) | 0x80U);
    std::string text;
    for (const unsigned char byte : bytes) {
      if (text.size() == 8 || text.size() == 13 || text.size() == 18 || text.size() == 23) text += '-';
      text += "0123456789ABCDEF"[byte >> 4U];
      text += "0123456789ABCDEF"[byte & 15U];
    }
    return text;
  }
};

}  // namespace

Result<Dictionary> DeviceConfiguration::ofSystem(std::string_view name) const {
  return propertyLists->readDictionary(directories->systemRoot() / "etc/vorlix" / name);
}

Result<Dictionary> DeviceConfiguration::ofUser(std::string_view name) const {
  return propertyLists->readDictionary(directories->home() / "Library/Preferences" / name);
}

Result<Dictionary> DeviceConfiguration::ofProduct(const Path& name) const {
  return propertyLists->readDictionary(directories->resources() / name);
}

std::shared_ptr<DeviceInfoQuery> makeDeviceInfoQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxDeviceInfoQuery>(std::move(configuration));
}

std::shared_ptr<ProfileRestrictions> makeProfileRestrictions(DeviceConfiguration configuration) {
  return std::make_shared<LinuxProfileRestrictions>(std::move(configuration));
}

std::shared_ptr<TetheredSyncQuery> makeTetheredSyncQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxTetheredSyncQuery>(std::move(configuration));
}

std::shared_ptr<ExternalSourcesQuery> makeExternalSourcesQuery(DeviceConfiguration configuration) {
  return std::make_shared<LinuxExternalSourcesQuery>(std::move(configuration));
}

std::shared_ptr<SystemAccountQuery> makeSystemAccountQuery() { return std::make_shared<LinuxSystemAccountQuery>(); }

std::shared_ptr<PreferencesStore> makePreferencesStore(DeviceConfiguration configuration) {
  return std::make_shared<LinuxPreferencesStore>(std::move(configuration));
}

std::shared_ptr<UniqueIdentifiers> makeUniqueIdentifiers() { return std::make_shared<LinuxUniqueIdentifiers>(); }

}  // namespace platform
