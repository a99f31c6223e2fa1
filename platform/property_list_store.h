#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/file_system.h"
#include "platform/property_value.h"

namespace platform {

struct SerializedPropertyList {
  std::shared_ptr<const Bytes> data;  // null where there is none; the store may keep it, too
  std::string errorDescription;       // empty where nothing went wrong
};

// Property lists as files and bytes. Reads the binary and the XML form and writes the binary form, version 1.0.
class PropertyListStore {
 public:
  virtual ~PropertyListStore() = default;

  // The file's root dictionary. Nothing where there is no file, where it cannot be read as a property list, where
  // reading it would crash, hang or exhaust the process, or where its root is no dictionary. Values that are merely
  // malformed are repaired and do not cost the others.
  [[nodiscard]] virtual std::optional<Dictionary> readDictionary(const Path& path) = 0;

  // The dictionary as a binary property list. What comes back has been read again and compared with the dictionary,
  // value by value, so it may replace a file.
  [[nodiscard]] virtual SerializedPropertyList serialize(const Dictionary& dictionary) = 0;
};

}  // namespace platform
