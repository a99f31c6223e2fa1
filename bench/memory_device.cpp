#include "bench/memory_device.h"

#include "bench/silent_services.h"
#include "platform/linux/linux_platform.h"

namespace bench {
namespace {

using platform::Bytes;
using platform::Dictionary;
using platform::FileKind;
using platform::Path;
using platform::Status;

constexpr const char* kRoot = "/nonexistent-device";

// Every write succeeds, and nothing is kept.
class NoFiles final : public platform::FileSystem {
 public:
  explicit NoFiles(std::shared_ptr<FileSystem> real) : _real{std::move(real)} {}
  [[nodiscard]] std::optional<FileKind> kindOf(const Path& path) override { return _real->kindOf(path); }
  platform::Result<Bytes> read(const Path& path, std::size_t limit) override { return _real->read(path, limit); }
  Status create(const Path& /*path*/, std::span<const std::uint8_t> /*bytes*/) override { return {}; }
  Status replace(const Path& /*path*/, std::span<const std::uint8_t> /*bytes*/) override { return {}; }
  Status copy(const Path& /*from*/, const Path& /*to*/) override { return {}; }
  Status remove(const Path& /*path*/) override { return {}; }
  Status createDirectories(const Path& /*path*/, unsigned /*permissions*/) override { return {}; }
  Status setOwner(const Path& /*path*/, std::string_view /*owner*/, std::string_view /*group*/) override { return {}; }
  [[nodiscard]] std::optional<Path> temporaryName() override { return Path{kRoot} / "temporary"; }
  Status rename(const Path& /*from*/, const Path& /*to*/) override { return {}; }

 private:
  std::shared_ptr<FileSystem> _real;
};

// What was last serialized is what every file of the device then holds.
class ValuesInMemory final : public platform::PropertyListStore {
 public:
  explicit ValuesInMemory(std::shared_ptr<PropertyListStore> real) : _real{std::move(real)} {}
  [[nodiscard]] std::optional<Dictionary> readDictionary(const Path& path) override {
    return path.native().starts_with(kRoot) ? _values : _real->readDictionary(path);
  }
  [[nodiscard]] platform::SerializedPropertyList serialize(const Dictionary& dictionary) override {
    _values = dictionary;
    return {Bytes{0}, {}};
  }

 private:
  std::shared_ptr<PropertyListStore> _real;
  std::optional<Dictionary> _values;
};

class UnreadLog final : public platform::SystemLog {
 public:
  [[nodiscard]] bool hasReaders() const override { return false; }
  void write(const platform::LogRecord& /*record*/) override {}
};
}  // namespace

platform::Platform makeMemoryDevice() {
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = kRoot});
  services.files = std::make_shared<NoFiles>(services.files);
  services.propertyLists = std::make_shared<ValuesInMemory>(services.propertyLists);
  services.systemLog = std::make_shared<UnreadLog>();
  silence(services);
  return services;
}

}  // namespace bench
