#include "platform/linux/property_lists/libplist_property_list_store.h"

#include "platform/linux/property_lists/known_property_lists.h"
#include "platform/linux/property_lists/libplist_conversion.h"

namespace platform {
namespace {

class LibplistPropertyListStore final : public PropertyListStore {
 public:
  explicit LibplistPropertyListStore(std::shared_ptr<FileSystem> files) : _files{std::move(files)} {}

  Result<Dictionary> readDictionary(const Path& path) override {
    Result<Bytes> read = _files->read(path, kMaxPropertyListSize);
    if (!read.isOk()) return read.status();
    Bytes bytes = read.take();
    if (auto values = _known.valuesOf(bytes)) return *std::move(values);
    Result<ParsedPropertyList> list = parsePropertyList(bytes, "read " + path.string());
    if (!list.isOk()) return list.status();
    ParsedPropertyList parsed = list.take();
    _known.keep(std::make_shared<const Bytes>(std::move(bytes)), parsed.values, parsed.isFaithful);
    return std::move(parsed.values);
  }

  SerializedPropertyList serialize(const Dictionary& dictionary) override {
    if (auto bytes = _known.bytesOf(dictionary)) return {std::move(bytes), {}};
    SerializedPropertyList list = writePropertyList(dictionary);
    if (list.data != nullptr) _known.keep(list.data, dictionary, true);
    return list;
  }

 private:
  std::shared_ptr<FileSystem> _files;
  KnownPropertyLists _known;
};

}  // namespace

std::shared_ptr<PropertyListStore> makeLibplistPropertyListStore(std::shared_ptr<FileSystem> files) {
  return std::make_shared<LibplistPropertyListStore>(std::move(files));
}

}  // namespace platform
