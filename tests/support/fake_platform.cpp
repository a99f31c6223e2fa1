#include "tests/support/fake_platform.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <stdexcept>

namespace tests {
namespace {

template <typename Map, typename Key>
std::optional<typename Map::mapped_type> lookedUp(const Map& map, const Key& key) {
  const auto found = map.find(key);
  if (found == map.end()) return std::nullopt;
  return found->second;
}

class FakeExclusiveFileLock final : public platform::ExclusiveFileLock {
 public:
  FakeExclusiveFileLock(FakeExclusiveFileLocks& locks, std::string name) : _locks{locks}, _name{std::move(name)} {}
  ~FakeExclusiveFileLock() override {
    if (_isHeld) _locks.held.erase(_name);
  }
  platform::Status lock() override {
    _locks.calls.push_back("lock " + _name);
    if (!_locks.canLock) return platform::Status::failure(EIO, "take the lock " + _name);
    if (!_locks.held.insert(_name).second) throw std::logic_error{"would wait for ever"};
    _isHeld = true;
    return {};
  }
  void unlock() override {
    _locks.calls.push_back("unlock " + _name);
    _locks.held.erase(_name);
    _isHeld = false;
  }

 private:
  FakeExclusiveFileLocks& _locks;
  std::string _name;
  bool _isHeld = false;
};

class FakeTetheredSyncConnection final : public platform::TetheredSyncConnection {
 public:
  explicit FakeTetheredSyncConnection(FakeTetheredSyncQuery& query) : _query{query} { ++_query.openConnections; }
  FakeTetheredSyncConnection(const FakeTetheredSyncConnection&) = delete;
  FakeTetheredSyncConnection& operator=(const FakeTetheredSyncConnection&) = delete;
  ~FakeTetheredSyncConnection() override { --_query.openConnections; }

  std::optional<PropertyValue> value(std::string_view domain, std::optional<std::string_view> key) override {
    _query.asked.push_back(std::string{domain} + (key ? " " + std::string{*key} : std::string{}));
    if (!key) return PropertyValue{_query.domain};
    const PropertyValue* const found = _query.domain.find(*key);
    return found == nullptr ? std::nullopt : std::optional{*found};
  }

 private:
  FakeTetheredSyncQuery& _query;
};

}  // namespace

Bytes FakePropertyListStore::bytesFor(const Dictionary& dictionary) {
  const std::string name = "property list " + std::to_string(_dictionaries.size());
  const Bytes bytes{name.begin(), name.end()};
  _dictionaries.emplace(bytes, dictionary);
  return bytes;
}

platform::Result<Dictionary> FakePropertyListStore::readDictionary(const Path& path) {
  reads.push_back(path);
  if (beforeRead) beforeRead(path);
  const auto bytes = _files->read(path, SIZE_MAX);
  if (!bytes.isOk()) return bytes.status();
  if (auto known = lookedUp(_dictionaries, bytes.value())) return *std::move(known);
  return platform::Status::failure(platform::Cause::malformed, "read " + path.string(), "it is no property list");
}

platform::SerializedPropertyList FakePropertyListStore::serialize(const Dictionary& dictionary) {
  platform::SerializedPropertyList list;
  if (serializes) list.data = std::make_shared<const Bytes>(bytesFor(dictionary));
  if (serializeError.empty()) return list;
  list.status = platform::Status::failure(platform::Cause::other, "serialize the property list", serializeError);
  return list;
}

std::optional<bool> FakePreferencesStore::boolean(std::string_view domain, std::string_view key) const {
  ++reads;
  if (std::find(synchronized.begin(), synchronized.end(), domain) == synchronized.end()) return std::nullopt;
  return lookedUp(switches, std::pair{std::string{domain}, std::string{key}});
}

void FakePreferencesChangedNotice::post(std::string_view domain, std::string_view key) {
  _outputs.push_back("preferences " + std::string{domain} + " " + std::string{key});
}

void FakeSystemLog::write(const platform::LogRecord& record) {
  const std::string text = record.text();
  lines.push_back(
      {std::string{record.subsystem}, std::string{record.category}, std::string{record.method}, record.line, text});
  _outputs.push_back("log " + text);
}

void FakeConsoleLog::write(std::string_view message) {
  lines.emplace_back(message);
  _outputs.push_back("console " + std::string{message});
}

platform::Result<std::unique_ptr<platform::ExclusiveFileLock>> FakeExclusiveFileLocks::lockNamed(
    std::string_view name) {
  calls.push_back("make " + std::string{name});
  if (!canMakeLocks) return platform::Status::failure(EIO, "open the lock file " + std::string{name});
  return std::make_unique<FakeExclusiveFileLock>(*this, std::string{name});
}

std::optional<PropertyValue> FakeDeviceInfoQuery::answer(std::string_view key) const {
  asked.emplace_back(key);
  return lookedUp(answers, key);
}

std::vector<platform::Restriction> FakeProfileRestrictions::restrictions(
    std::span<const platform::ManagedFeature> features) const {
  std::vector<platform::Restriction> answers;
  for (const platform::ManagedFeature feature : features) {
    asked.push_back(feature);
    answers.push_back(lookedUp(profiles, feature).value_or(platform::Restriction::notSet));
  }
  return answers;
}

platform::Result<std::unique_ptr<platform::TetheredSyncConnection>> FakeTetheredSyncQuery::connect() {
  if (!isReachable) return platform::Status::failure(ECONNREFUSED, "connect");
  return std::make_unique<FakeTetheredSyncConnection>(*this);
}

platform::ExternalSources FakeExternalSourcesQuery::enabledSources(platform::SyncDataType type) const {
  return lookedUp(sources, type).value_or(platform::ExternalSources{});
}

platform::Status FakeModuleLoader::open(const std::string& path) {
  opened.push_back(path);
  const auto error = errors.find(path);
  if (error == errors.end()) return {};
  return platform::Status::failure(platform::Cause::other, "open a module", error->second);
}

std::optional<std::string> FakeLocalizedStrings::text(std::string_view table, std::string_view key) const {
  return lookedUp(texts, std::pair{std::string{table}, std::string{key}});
}

platform::Result<std::string> FakeUniqueIdentifiers::makeUuid() {
  if (!canMake) return platform::Status::failure(EIO, "make an identifier");
  std::array<char, 37> text{};
  std::snprintf(text.data(), text.size(), "00000000-0000-4000-8000-%012d", ++made);
  return std::string{text.data()};
}

platform::Result<std::string> FakeClock::currentLocalTime(std::string_view pattern) const {
  patterns.emplace_back(pattern);
  return time;
}

FakeDevice::FakeDevice() {
  platform::Platform services;
  services.directories = directories;
  services.files = files;
  services.propertyLists = propertyLists;
  services.preferences = preferences;
  services.preferencesChanged = std::make_shared<FakePreferencesChangedNotice>(outputs);
  services.cloudTabs = std::make_shared<FakeCloudTabsNotice>(outputs);
  services.locks = locks;
  services.systemLog = systemLog;
  services.console = console;
  services.deviceInfo = deviceInfo;
  services.restrictions = restrictions;
  services.tetheredSync = tetheredSync;
  services.externalSources = externalSources;
  services.systemAccount = systemAccount;
  services.modules = modules;
  services.classes = platform::makeProcessClassRegistry();
  services.strings = strings;
  services.identifiers = identifiers;
  services.clock = clock;
  platform::setCurrent(std::move(services));
  files->putDirectory("/var/mobile/Library/Preferences");
  files->putDirectory("/var/mobile/tmp");
}

void FakeDevice::changePlatform(const std::function<void(platform::Platform&)>& change) {
  platform::Platform services = platform::current();
  change(services);
  platform::setCurrent(std::move(services));
}

void FakeDevice::setObserver(std::shared_ptr<platform::RunObserver> observer) {
  changePlatform([&observer](platform::Platform& services) { services.observer = std::move(observer); });
}

void FakeDevice::put(const Path& path, const Dictionary& dictionary) {
  files->put(path, propertyLists->bytesFor(dictionary));
}

Dictionary FakeDevice::dictionaryAt(const Path& path) { return propertyLists->readDictionary(path).valueOr({}); }

std::vector<std::string> FakeDevice::logMessages() const {
  std::vector<std::string> messages;
  for (const FakeSystemLog::Line& line : systemLog->lines) {
    const std::size_t start = line.text.find('"') + 1;
    messages.push_back(line.text.substr(start, line.text.size() - start - 1));
  }
  return messages;
}

}  // namespace tests
