#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "tests/support/fake_file_system.h"

namespace tests {

inline std::string bigEndian(std::uint64_t number, std::size_t width) {
  std::string bytes(width, '\0');
  for (std::size_t index = width; index > 0; number >>= 8U) bytes[--index] = static_cast<char>(number & 0xFFU);
  return bytes;
}

// A binary property list put together object by object, sound or not.
struct BinaryFile {
  std::vector<std::string> objects;
  std::size_t referenceSize = 1;
  std::size_t offsetSize = 4;
  std::uint64_t root = 0;

  // The index of the object that is added.
  std::size_t add(std::string object) {
    objects.push_back(std::move(object));
    return objects.size() - 1;
  }
  [[nodiscard]] std::string reference(std::uint64_t index) const { return bigEndian(index, referenceSize); }

  [[nodiscard]] std::string bytes() const {
    std::string file = "bplist00";
    std::string table;
    for (const std::string& object : objects) {
      table += bigEndian(file.size(), offsetSize);
      file += object;
    }
    const std::size_t tableOffset = file.size();
    file += table + std::string(6, '\0') + bigEndian(offsetSize, 1) + bigEndian(referenceSize, 1);
    return file + bigEndian(objects.size(), 8) + bigEndian(root, 8) + bigEndian(tableOffset, 8);
  }
};

// The marker of a container or text that holds this many.
inline std::string countedMarker(unsigned kind, std::size_t count) {
  if (count < 15) return bigEndian(kind << 4U | count, 1);
  return bigEndian(kind << 4U | 0xFU, 1) + "\x12" + bigEndian(count, 4);
}

// {k = OBJECT; z = true}: the second key shows that what is odd about the first does not cost it.
inline BinaryFile fileWith(const std::string& object) {
  using namespace std::string_literals;
  return {.objects = {"\xD2\x01\x02\x03\x04"s, "\x51k"s, "\x51z"s, object, "\x09"s}};
}

inline std::string xmlWith(std::string_view elements) {
  return R"(<?xml version="1.0" encoding="UTF-8"?><plist version="1.0"><dict>)" + std::string{elements} +
         "</dict></plist>\n";
}

// The device's own store over files in memory.
class PropertyListFiles {
 public:
  std::shared_ptr<FakeFileSystem> files = std::make_shared<FakeFileSystem>();
  std::shared_ptr<platform::PropertyListStore> store = platform::makeLibplistPropertyListStore(files);

  std::optional<platform::Dictionary> read(platform::Bytes bytes) {
    files->put("/file.plist", std::move(bytes));
    return store->readDictionary("/file.plist").optional();
  }
  std::optional<platform::Dictionary> read(std::string_view bytes) {
    return read(platform::Bytes{bytes.begin(), bytes.end()});
  }
};

}  // namespace tests
