#include "bench/memory_device.h"

#include "bench/silence.h"
#include "bench/unchanging_files.h"
#include "platform/linux/linux_platform.h"
#include "platform/logs_and_notices.h"

namespace bench {
namespace {

using platform::Bytes;
using platform::Dictionary;
using platform::FileKind;
using platform::Path;

constexpr const char* kRoot = "/nonexistent-device";

class ReadOnlyFiles final : public UnchangingFiles {
 public:
  explicit ReadOnlyFiles(std::shared_ptr<FileSystem> real) : _real{std::move(real)} {}
  platform::Result<FileKind> kindOf(const Path& path) override { return _real->kindOf(path); }
  platform::Result<Bytes> read(const Path& path, std::size_t limit) override { return _real->read(path, limit); }
  platform::Result<Path> temporaryName() override { return Path{kRoot} / "temporary"; }

 private:
  std::shared_ptr<FileSystem> _real;
};

// What was last serialized is what every file of the device then holds.
class ValuesInMemory final : public platform::PropertyListStore {
 public:
  explicit ValuesInMemory(std::shared_ptr<PropertyListStore> real) : _real{std::move(real)} {}
  platform::Result<Dictionary> readDictionary(const Path& path) override {
    return path.native().starts_with(kRoot) ? platform::Result<Dictionary>{_values} : _real->readDictionary(path);
  }
  platform::SerializedPropertyList serialize(const Dictionary& dictionary) override {
    _values = dictionary;
    return {std::make_shared<const Bytes>(Bytes{0}), {}};
  }

 private:
  std::shared_ptr<PropertyListStore> _real;
  Dictionary _values;
};

}  // namespace

platform::Platform makeMemoryDevice() {
  platform::Platform services = platform::makeLinuxPlatform({.systemRoot = kRoot});
  services.files = std::make_shared<ReadOnlyFiles>(services.files);
  services.propertyLists = std::make_shared<ValuesInMemory>(services.propertyLists);
  services.systemLog = std::make_shared<platform::SilentSystemLog>();
  silence(services);
  return services;
}

}  // namespace bench
