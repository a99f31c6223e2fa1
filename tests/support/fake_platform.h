#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "platform/platform.h"
#include "tests/support/fake_file_system.h"
#include "tests/support/printing.h"

namespace tests {

using platform::Array;
using platform::Bytes;
using platform::Dictionary;
using platform::Path;
using platform::PropertyValue;
using platform::Text;

inline const Path kSettingsFile = "/var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";

class FakeBaseDirectories final : public platform::BaseDirectories {
 public:
  Path root = "/";
  Path homeDirectory = "/var/mobile";
  Path shared = "/var/mobile";
  Path resourceDirectory = "/resources";

  [[nodiscard]] Path systemRoot() const override { return root; }
  [[nodiscard]] Path home() const override { return homeDirectory; }
  [[nodiscard]] Path sharedResources() const override { return shared; }
  [[nodiscard]] Path mailData() const override { return homeDirectory / "Library/Mail"; }
  [[nodiscard]] Path resources() const override { return resourceDirectory; }
};

// Keeps dictionaries beside the bytes that stand for them: a file is readable exactly when its bytes came from here.
class FakePropertyListStore final : public platform::PropertyListStore {
 public:
  explicit FakePropertyListStore(std::shared_ptr<FakeFileSystem> files) : _files{std::move(files)} {}

  bool serializes = true;      // whether data comes back
  std::string serializeError;  // where set, serialising says so, beside the data or alone
  std::vector<Path> reads;     // every path that was asked for, in order
  // Called before each read, so that a test can change a file at that moment.
  std::function<void(const Path&)> beforeRead;

  [[nodiscard]] Bytes bytesFor(const Dictionary& dictionary);
  platform::Result<Dictionary> readDictionary(const Path& path) override;
  platform::SerializedPropertyList serialize(const Dictionary& dictionary) override;

 private:
  std::shared_ptr<FakeFileSystem> _files;
  std::map<Bytes, Dictionary> _dictionaries;
};

class FakePreferencesStore final : public platform::PreferencesStore {
 public:
  std::map<std::pair<std::string, std::string>, bool> switches;  // domain and key
  std::vector<std::string> synchronized;
  mutable int reads = 0;

  void synchronize(std::string_view domain) override { synchronized.emplace_back(domain); }
  [[nodiscard]] std::optional<bool> boolean(std::string_view domain, std::string_view key) const override;
};

// Everything that leaves the process, in one order: "console TEXT", "log TEXT", "preferences DOMAIN KEY", "tabs on".
using Outputs = std::vector<std::string>;

class FakePreferencesChangedNotice final : public platform::PreferencesChangedNotice {
 public:
  explicit FakePreferencesChangedNotice(Outputs& outputs) : _outputs{outputs} {}
  void post(std::string_view domain, std::string_view key) override;

 private:
  Outputs& _outputs;
};

class FakeCloudTabsNotice final : public platform::CloudTabsNotice {
 public:
  explicit FakeCloudTabsNotice(Outputs& outputs) : _outputs{outputs} {}
  void post(bool enabled) override { _outputs.emplace_back(enabled ? "tabs on" : "tabs off"); }

 private:
  Outputs& _outputs;
};

class FakeSystemLog final : public platform::SystemLog {
 public:
  explicit FakeSystemLog(Outputs& outputs) : _outputs{outputs} {}
  bool readers = true;
  struct Line {
    std::string subsystem;
    std::string category;
    std::string method;
    std::uint32_t line;
    std::string text;  // whole
  };
  std::vector<Line> lines;

  [[nodiscard]] bool hasReaders() const override { return readers; }
  void write(const platform::LogRecord& record) override;

 private:
  Outputs& _outputs;
};

class FakeConsoleLog final : public platform::ConsoleLog {
 public:
  explicit FakeConsoleLog(Outputs& outputs) : _outputs{outputs} {}
  std::vector<std::string> lines;
  void write(std::string_view message) override;

 private:
  Outputs& _outputs;
};

// Locks of this process; taking one that another object holds throws, since nobody here could ever give it back.
class FakeExclusiveFileLocks final : public platform::ExclusiveFileLocks {
 public:
  bool canMakeLocks = true;
  bool canLock = true;
  std::set<std::string> held;
  std::vector<std::string> calls;  // "make NAME", "lock NAME", "unlock NAME"

  platform::Result<std::unique_ptr<platform::ExclusiveFileLock>> lockNamed(std::string_view name) override;
};

class FakeDeviceInfoQuery final : public platform::DeviceInfoQuery {
 public:
  std::map<std::string, PropertyValue, std::less<>> answers;
  mutable std::vector<std::string> asked;
  [[nodiscard]] std::optional<PropertyValue> answer(std::string_view key) const override;
};

class FakeProfileRestrictions final : public platform::ProfileRestrictions {
 public:
  std::map<platform::ManagedFeature, platform::Restriction> profiles;
  mutable std::vector<platform::ManagedFeature> asked;
  [[nodiscard]] std::vector<platform::Restriction> restrictions(
      std::span<const platform::ManagedFeature> features) const override;
};

class FakeTetheredSyncQuery final : public platform::TetheredSyncQuery {
 public:
  bool isReachable = true;
  Dictionary domain;               // what every domain holds
  std::vector<std::string> asked;  // "DOMAIN KEY", "DOMAIN" without a key
  int openConnections = 0;
  platform::Result<std::unique_ptr<platform::TetheredSyncConnection>> connect() override;
};

class FakeExternalSourcesQuery final : public platform::ExternalSourcesQuery {
 public:
  std::map<platform::SyncDataType, platform::ExternalSources> sources;
  [[nodiscard]] platform::ExternalSources enabledSources(platform::SyncDataType type) const override;
};

class FakeSystemAccountQuery final : public platform::SystemAccountQuery {
 public:
  std::optional<Text> primaryKey = "primaryAccount";

  [[nodiscard]] Text hostedServiceStatusKey() const override { return "hostedServiceStatus"; }
  [[nodiscard]] std::optional<Text> primaryAccountKey() const override { return primaryKey; }
  [[nodiscard]] Text systemAccountTypeString() const override { return "Cirrant"; }
};

class FakeModuleLoader final : public platform::ModuleLoader {
 public:
  std::vector<std::string> opened;            // every call, in order
  std::map<std::string, std::string> errors;  // by path
  platform::Status open(const std::string& path) override;
};

class FakeLocalizedStrings final : public platform::LocalizedStrings {
 public:
  std::map<std::pair<std::string, std::string>, std::string> texts;  // table and key
  [[nodiscard]] std::optional<std::string> text(std::string_view table, std::string_view key) const override;
};

// Answers 00000000-0000-4000-8000-000000000001, …2 and so on.
class FakeUniqueIdentifiers final : public platform::UniqueIdentifiers {
 public:
  bool canMake = true;
  int made = 0;
  platform::Result<std::string> makeUuid() override;
};

class FakeClock final : public platform::Clock {
 public:
  std::string time = "2011-10-12-9-10-5";
  mutable std::vector<std::string> patterns;
  platform::Result<std::string> currentLocalTime(std::string_view pattern) const override;
};

// A whole device in memory. Making one sets it as the process's platform.
class FakeDevice {
 public:
  FakeDevice();
  FakeDevice(const FakeDevice&) = delete;
  FakeDevice& operator=(const FakeDevice&) = delete;
  ~FakeDevice() = default;

  Outputs outputs;  // console, log and notices, in one order
  std::shared_ptr<FakeBaseDirectories> directories = std::make_shared<FakeBaseDirectories>();
  std::shared_ptr<FakeFileSystem> files = std::make_shared<FakeFileSystem>();
  std::shared_ptr<FakePropertyListStore> propertyLists = std::make_shared<FakePropertyListStore>(files);
  std::shared_ptr<FakePreferencesStore> preferences = std::make_shared<FakePreferencesStore>();
  std::shared_ptr<FakeExclusiveFileLocks> locks = std::make_shared<FakeExclusiveFileLocks>();
  std::shared_ptr<FakeSystemLog> systemLog = std::make_shared<FakeSystemLog>(outputs);
  std::shared_ptr<FakeConsoleLog> console = std::make_shared<FakeConsoleLog>(outputs);
  std::shared_ptr<FakeDeviceInfoQuery> deviceInfo = std::make_shared<FakeDeviceInfoQuery>();
  std::shared_ptr<FakeProfileRestrictions> restrictions = std::make_shared<FakeProfileRestrictions>();
  std::shared_ptr<FakeTetheredSyncQuery> tetheredSync = std::make_shared<FakeTetheredSyncQuery>();
  std::shared_ptr<FakeExternalSourcesQuery> externalSources = std::make_shared<FakeExternalSourcesQuery>();
  std::shared_ptr<FakeSystemAccountQuery> systemAccount = std::make_shared<FakeSystemAccountQuery>();
  std::shared_ptr<FakeModuleLoader> modules = std::make_shared<FakeModuleLoader>();
  std::shared_ptr<FakeLocalizedStrings> strings = std::make_shared<FakeLocalizedStrings>();
  std::shared_ptr<FakeUniqueIdentifiers> identifiers = std::make_shared<FakeUniqueIdentifiers>();
  std::shared_ptr<FakeClock> clock = std::make_shared<FakeClock>();

  // From here on the process's platform is as `change` leaves it.
  void changePlatform(const std::function<void(platform::Platform&)>& change);
  // Lets it watch runs; null lets nobody.
  void setObserver(std::shared_ptr<platform::RunObserver> observer);

  // Writes a property list; reads one back (an empty dictionary where there is none).
  void put(const Path& path, const Dictionary& dictionary);
  [[nodiscard]] Dictionary dictionaryAt(const Path& path);
  // The quoted parts of all log messages so far, without method and line.
  [[nodiscard]] std::vector<std::string> logMessages() const;
};

}  // namespace tests
