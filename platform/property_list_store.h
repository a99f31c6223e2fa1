#pragma once

#include <cstddef>
#include <memory>

#include "platform/file_system.h"
#include "platform/property_value.h"

namespace platform {

// What a property list may have: containers in one another, the root included, and values, keys among them. Whatever
// can be read can be written.
constexpr std::size_t kMaxNesting = 256;
constexpr std::size_t kMaxValues = 8'000'000;

// A dictionary as bytes, and what went wrong. A service may answer bytes and yet say that something did: they are as
// good as it could make them.
struct SerializedPropertyList {
  std::shared_ptr<const Bytes> data;  // null where there are none; the store may keep them, too
  Status status;
};

// Property lists as files and bytes. Reads the binary and the XML form and writes the binary form, version 1.0.
class PropertyListStore {
 public:
  virtual ~PropertyListStore() = default;

  // The file's root dictionary. Values that are merely malformed are repaired and do not cost the others. What it
  // fails for:
  //
  //   missing     no file stands there
  //   unsafe      somebody may have planted it: a link that is not to be followed, or a second name elsewhere
  //   excessive   it is too large, or reading it would crash, hang or exhaust the process
  //   malformed   it is no property list, or no whole one
  //   unsuitable  its root is no dictionary
  //   other       it cannot be opened or read: no permission, something else than a file, a failing disk
  virtual Result<Dictionary> readDictionary(const Path& path) = 0;

  // The dictionary as a binary property list. What comes back has been read again and compared with the dictionary,
  // value by value, so it may replace a file.
  [[nodiscard]] virtual SerializedPropertyList serialize(const Dictionary& dictionary) = 0;
};

}  // namespace platform
