#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>

#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "platform/property_list_store.h"

namespace fuzz {

// Property lists of which the values are kept beside bytes that stand for them, which takes a fraction of the time that
// writing and parsing them takes. Whatever was not written here, and everything while `isReal`, goes through the
// device's own property lists.
class ValuesInMemory final : public platform::PropertyListStore {
 public:
  explicit ValuesInMemory(std::shared_ptr<platform::FileSystem> files)
      : _files{std::move(files)}, _real{platform::makeLibplistPropertyListStore(_files)} {}

  bool isReal = true;

  // What was written before can no longer be read.
  void forget() { _written.clear(); }

  platform::Result<platform::Dictionary> readDictionary(const platform::Path& path) override {
    if (isReal) return _real->readDictionary(path);
    const platform::Result<platform::Bytes> bytes = _files->read(path, SIZE_MAX);
    if (!bytes.isOk()) return bytes.status();
    const auto written = _written.find(bytes.value());
    return written == _written.end() ? _real->readDictionary(path) : written->second;
  }

  platform::SerializedPropertyList serialize(const platform::Dictionary& dictionary) override {
    if (isReal) return _real->serialize(dictionary);
    const std::string name = "property list " + std::to_string(_written.size());
    auto bytes = std::make_shared<const platform::Bytes>(name.begin(), name.end());
    _written.emplace(*bytes, dictionary);
    return {std::move(bytes), {}};
  }

 private:
  std::shared_ptr<platform::FileSystem> _files;
  std::shared_ptr<platform::PropertyListStore> _real;
  std::map<platform::Bytes, platform::Dictionary> _written;
};

}  // namespace fuzz
