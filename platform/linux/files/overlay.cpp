#include "platform/linux/files/overlay.h"

#include <fcntl.h>

#include <cerrno>
#include <system_error>
#include <utility>

#include "platform/linux/files/descriptor.h"

namespace platform {
namespace {

using Path = std::filesystem::path;

constexpr mode_t kOwnersFile = S_IFREG | S_IRUSR | S_IWUSR;

bool isBelow(const Path& path, const Path& directory) {
  const auto [end, rest] = std::mismatch(directory.begin(), directory.end(), path.begin(), path.end());
  return end == directory.end() && rest != path.end();
}

}  // namespace

std::optional<Path> Overlay::placeOf(const Path& path) const {
  const Path trimmed = path.has_filename() ? path : path.parent_path();
  std::error_code error;
  const Path parent = std::filesystem::weakly_canonical(trimmed.parent_path(), error);
  if (error) {
    errno = error.value();
    return std::nullopt;
  }
  if (!isEnterable(parent)) return std::nullopt;
  return trimmed.has_filename() ? parent / trimmed.filename() : parent;
}

bool Overlay::isEnterable(const Path& directory) const {
  if (const Node* const node = nodeAt(directory)) {
    errno = node->mode == 0 ? ENOENT : ENOTDIR;
    return S_ISDIR(node->mode);
  }
  return Descriptor{::open(directory.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC)}.isOpen();
}

Path Overlay::followed(const Path& place) const {
  if (!S_ISLNK(modeAt(place))) return place;
  std::error_code error;
  Path target = std::filesystem::weakly_canonical(place, error);
  return error ? place : target;
}

const Overlay::Node* Overlay::nodeAt(const Path& place) const {
  static const Node nothing{0};
  const auto found = _nodes.find(place);
  if (found != _nodes.end()) return &found->second;
  for (Path above = place; above.has_relative_path();) {
    above = above.parent_path();
    // Below what was made or removed here, only what was made here stands.
    if (_nodes.contains(above)) return &nothing;
  }
  return nullptr;
}

mode_t Overlay::modeAt(const Path& place) const {
  if (const Node* const node = nodeAt(place)) return node->mode;
  struct stat status {};
  return ::lstat(place.c_str(), &status) == 0 ? status.st_mode : 0;
}

Path Overlay::deviceDirectoryAbove(const Path& place) const {
  Path above = place.parent_path();
  while (nodeAt(above) != nullptr && above.has_relative_path()) above = above.parent_path();
  return above;
}

void Overlay::putFile(const Path& place, Bytes bytes) {
  _nodes.insert_or_assign(place, Node{kOwnersFile, std::move(bytes)});
}

void Overlay::putDirectory(const Path& place, mode_t permissions) {
  _nodes.insert_or_assign(place, Node{S_IFDIR | permissions});
}

void Overlay::remove(const Path& place) {
  std::erase_if(_nodes, [&place](const auto& entry) { return isBelow(entry.first, place); });
  _nodes.insert_or_assign(place, Node{0});
}

}  // namespace platform
