#include "platform/linux/libplist_property_list_store.h"

#include "platform/linux/libplist_reader.h"
#include "platform/linux/libplist_writer.h"

namespace platform {
namespace {

class LibplistPropertyListStore final : public PropertyListStore {
 public:
  explicit LibplistPropertyListStore(std::shared_ptr<FileSystem> files) : _files{std::move(files)} {}

  [[nodiscard]] std::optional<Dictionary> readDictionary(const Path& path) override {
    Result<Bytes> bytes = _files->read(path, kLargestPropertyList);
    if (!bytes.isOk()) return std::nullopt;
    return parsePropertyList(bytes.take());
  }

  [[nodiscard]] SerializedPropertyList serialize(const Dictionary& dictionary) override {
    return writePropertyList(dictionary);
  }

 private:
  std::shared_ptr<FileSystem> _files;
};

}  // namespace

std::shared_ptr<PropertyListStore> makeLibplistPropertyListStore(std::shared_ptr<FileSystem> files) {
  return std::make_shared<LibplistPropertyListStore>(std::move(files));
}

}  // namespace platform
