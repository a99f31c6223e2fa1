#pragma once

#include <sys/stat.h>

#include <functional>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <tuple>

#include "platform/property_value.h"

namespace platform {

// The names that a rehearsal changed, each in its directory, whichever path leads there. Everything else is as on the
// device.
class Overlay {
 public:
  // What stands at a name now: nothing where the mode is 0.
  struct Node {
    struct stat status {};
    Bytes bytes{};  // of a file; of a link, where it leads
  };

  // Null where the name is as on the device.
  [[nodiscard]] const Node* find(const struct stat& directory, const std::string& name) const {
    const auto found = _nodes.find(keyOf(directory, name));
    return found == _nodes.end() ? nullptr : &found->second;
  }

  // Whether some directory has a name of that text that is not as on the device.
  [[nodiscard]] bool isKnown(std::string_view name) const { return _names.contains(name); }

  void put(const struct stat& directory, const std::string& name, Node node) {
    _names.insert(name);
    node.status.st_dev = kNoDevice;
    node.status.st_ino = ++_made;
    node.status.st_nlink = 1;
    _nodes.insert_or_assign(keyOf(directory, name), std::move(node));
  }

  // Whether the directory was made here, so that only what was made here stands in it.
  [[nodiscard]] static bool isMade(const struct stat& directory) { return directory.st_dev == kNoDevice; }

 private:
  using Key = std::tuple<dev_t, ino_t, std::string>;

  static constexpr dev_t kNoDevice = 0;

  [[nodiscard]] static Key keyOf(const struct stat& directory, const std::string& name) {
    return {directory.st_dev, directory.st_ino, name};
  }

  std::map<Key, Node> _nodes;
  std::set<std::string, std::less<>> _names;
  ino_t _made = 0;  // numbers that tell what was made here apart
};

}  // namespace platform
