#include <cstddef>
#include <cstdint>
#include <memory>

#include "fuzz/require.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "tests/support/fake_file_system.h"

// Any bytes are refused or read; what is read can be written and read back with the same value.

namespace {

// A store with one file. It knows again what it has read or written lately, so what one writes another one reads.
class StoreWithOneFile {
 public:
  StoreWithOneFile() { _files->put(_path, std::string_view{}); }

  std::optional<platform::Dictionary> read(platform::Bytes bytes) {
    _files->calls.clear();
    _files->nodes.at(_path).bytes = std::move(bytes);
    return _store->readDictionary(_path).optional();
  }
  platform::SerializedPropertyList write(const platform::Dictionary& values) { return _store->serialize(values); }

 private:
  platform::Path _path{"/file.plist"};
  std::shared_ptr<tests::FakeFileSystem> _files = std::make_shared<tests::FakeFileSystem>();
  std::shared_ptr<platform::PropertyListStore> _store = platform::makeLibplistPropertyListStore(_files);
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static StoreWithOneFile reader;
  static StoreWithOneFile writer;
  const auto read = reader.read({data, data + size});
  if (!read) return 0;
  const auto written = writer.write(*read);
  fuzz::require(written.data != nullptr, written.status.description());
  fuzz::require(reader.read(*written.data) == read, "not equal once written and read back");
  return 0;
}
