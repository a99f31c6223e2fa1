#include "bench/device.h"

#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <stdexcept>

#include "bench/silence.h"
#include "platform/linux/linux_platform.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"

namespace bench {
namespace {

using platform::Path;
using platform::Status;

constexpr const char* kSettingsFile = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist";

void writeTable(const Path& path, const std::string& line) { std::ofstream{path} << line << '\n'; }

class CountingFiles final : public platform::FileSystem {
 public:
  CountingFiles(std::shared_ptr<FileSystem> inner, Path settings, std::shared_ptr<FileCounts> counts)
      : _inner{std::move(inner)}, _settings{std::move(settings)}, _counts{std::move(counts)}, _values{values()} {}

  platform::Result<platform::FileKind> kindOf(const Path& path) override { return _inner->kindOf(path); }
  platform::Result<platform::Bytes> read(const Path& path, std::size_t limit) override {
    if (path == _settings) ++_counts->reads;
    return _inner->read(path, limit);
  }
  Status create(const Path& path, std::span<const std::uint8_t> bytes) override { return _inner->create(path, bytes); }
  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    return _inner->replace(path, bytes);
  }
  Status copy(const Path& from, const Path& to) override { return _inner->copy(from, to); }
  Status remove(const Path& path) override { return _inner->remove(path); }
  Status createDirectories(const Path& path, unsigned permissions) override {
    return _inner->createDirectories(path, permissions);
  }
  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    return _inner->setOwner(path, owner, group);
  }
  platform::Result<Path> temporaryName() override { return _inner->temporaryName(); }
  Status rename(const Path& from, const Path& to) override {
    Status renamed = _inner->rename(from, to);
    if (to == _settings && renamed.isOk()) countSave();
    return renamed;
  }

 private:
  [[nodiscard]] std::optional<platform::Dictionary> values() const {
    return platform::makeLibplistPropertyListStore(_inner)->readDictionary(_settings).optional();
  }
  void countSave() {
    ++_counts->saves;
    auto present = values();
    if (present != _values) ++_counts->changes;
    _values = std::move(present);
  }

  std::shared_ptr<FileSystem> _inner;
  Path _settings;
  std::shared_ptr<FileCounts> _counts;
  std::optional<platform::Dictionary> _values;
};

}  // namespace

void makeDevice(const Path& root, const Population& population) {
  for (const char* const directory : {"etc", "var/mobile/Library/Mail", "var/mobile/Library/Preferences",
                                      "var/mobile/Library/Logs/CrashReporter", "var/mobile/tmp", "tmp"}) {
    std::filesystem::create_directories(root / directory);
  }
  std::filesystem::permissions(root / "tmp", std::filesystem::perms::all | std::filesystem::perms::sticky_bit);
  writeTable(root / "etc/passwd",
             "mobile:*:" + std::to_string(::getuid()) + ":" + std::to_string(::getgid()) + "::/var/mobile:/bin/sh");
  writeTable(root / "etc/group", "mobile:*:" + std::to_string(::getgid()) + ":");
  const platform::Platform services = platform::makeLinuxPlatform({.systemRoot = root});
  const auto list = services.propertyLists->serialize(settingsOf(population));
  if (list.data == nullptr || !services.files->create(root / kSettingsFile, *list.data).isOk()) {
    throw std::runtime_error{"the settings file cannot be written below " + root.string()};
  }
}

platform::Platform servicesOf(const Path& root) {
  ::setenv("TMPDIR", (root / "var/mobile/tmp").c_str(), 1);
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = root, .lockDirectory = root});
  services.systemLog = std::make_shared<CountingLog>();
  silence(services);
  return services;
}

std::shared_ptr<const FileCounts> countFileUse(platform::Platform& services) {
  auto counts = std::make_shared<FileCounts>();
  const Path settings = services.directories->systemRoot() / kSettingsFile;
  services.files = std::make_shared<CountingFiles>(services.files, settings, counts);
  services.propertyLists = platform::makeLibplistPropertyListStore(services.files);
  return counts;
}

}  // namespace bench
