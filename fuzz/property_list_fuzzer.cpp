#include <cstddef>
#include <cstdint>
#include <memory>

#include "fuzz/require.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "tests/support/fake_file_system.h"

// Any bytes are refused or read; what is read can be written and read back with the same value.

namespace {

struct Reader {
  std::shared_ptr<tests::FakeFileSystem> files = std::make_shared<tests::FakeFileSystem>();
  std::shared_ptr<platform::PropertyListStore> store = platform::makeLibplistPropertyListStore(files);

  std::optional<platform::Dictionary> read(platform::Bytes bytes) {
    files->calls.clear();
    files->put("/file.plist", std::move(bytes));
    return store->readDictionary("/file.plist").optional();
  }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static Reader reader;
  const auto read = reader.read({data, data + size});
  if (!read) return 0;
  const auto written = reader.store->serialize(*read);
  fuzz::require(written.data != nullptr, written.status.description());
  fuzz::require(reader.read(*written.data) == read, "not equal once written and read back");
  return 0;
}
