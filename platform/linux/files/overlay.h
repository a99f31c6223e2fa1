#pragma once

#include <sys/stat.h>

#include <filesystem>
#include <map>
#include <optional>

#include "platform/property_value.h"

namespace platform {

// What a rehearsal changed, by path: files and directories that were made, and places where nothing stands any more.
// Everything else is as on the device. Paths are absolute, and canonical but for their last part, which is no link.
class Overlay {
 public:
  struct Node {
    mode_t mode;  // kind and permission bits; 0 where nothing stands
    Bytes bytes{};
  };

  // Where the path leads: its parent with links followed, and the last part as it is. Nothing, with errno set, where
  // its parent is no directory that can be entered.
  [[nodiscard]] std::optional<std::filesystem::path> placeOf(const std::filesystem::path& path) const;
  // The same with a link at the place followed.
  [[nodiscard]] std::filesystem::path followed(const std::filesystem::path& place) const;

  // What the rehearsal made of this very place; null where that is the device's to say.
  [[nodiscard]] const Node* nodeAt(const std::filesystem::path& place) const;
  // The kind and the permission bits of what would stand at the place; 0 where nothing would. No link there is
  // followed.
  [[nodiscard]] mode_t modeAt(const std::filesystem::path& place) const;
  // The innermost directory of the device above the place.
  [[nodiscard]] std::filesystem::path deviceDirectoryAbove(const std::filesystem::path& place) const;

  void putFile(const std::filesystem::path& place, Bytes bytes);  // mode 0600
  void putDirectory(const std::filesystem::path& place, mode_t permissions);
  void remove(const std::filesystem::path& place);  // with all below it

 private:
  [[nodiscard]] bool isEnterable(const std::filesystem::path& directory) const;

  std::map<std::filesystem::path, Node> _nodes;
};

}  // namespace platform
