#include "platform/linux/files/tree_removal.h"

#include <dirent.h>
#include <fcntl.h>

#include <cerrno>
#include <memory>
#include <optional>
#include <vector>

namespace platform {
namespace {

// A directory on the way down: its name in the one above, and what it is, so that it is known again on the way up.
struct Level {
  std::string name;
  dev_t device;
  ino_t inode;
};

using Stream = std::unique_ptr<DIR, int (*)(DIR*)>;

Stream streamOf(const Descriptor& directory) {
  Descriptor own{::openat(directory.number(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC)};
  DIR* const stream = own.isOpen() ? ::fdopendir(own.number()) : nullptr;
  if (stream != nullptr) static_cast<void>(own.release());
  return {stream, &::closedir};
}

bool isDirectoryAt(int parent, const char* name) {
  struct stat status {};
  return ::fstatat(parent, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(status.st_mode);
}

// Removes all that is no directory up to the first directory, and answers that one's name: empty where none is left.
std::optional<std::string> clearUpToDirectory(const Descriptor& directory) {
  const Stream stream = streamOf(directory);
  if (!stream) return std::nullopt;
  errno = 0;
  while (const dirent* const entry = ::readdir(stream.get())) {
    const std::string name = static_cast<const char*>(entry->d_name);
    if (!isEntryName(name)) continue;
    if (isDirectoryAt(directory.number(), name.c_str())) return name;
    if (::unlinkat(directory.number(), name.c_str(), 0) != 0 && errno != ENOENT) return std::nullopt;
    errno = 0;
  }
  return errno == 0 ? std::optional{std::string{}} : std::nullopt;
}

class Walk {
 public:
  explicit Walk(dev_t volume) : _volume{volume} {}

  // Goes down into the directory of that name.
  bool enter(const Descriptor& from, const std::string& name) {
    Descriptor below{::openat(from.number(), name.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC)};
    struct stat status {};
    if (!below.isOpen() || ::fstat(below.number(), &status) != 0) return false;
    if (status.st_dev != _volume) {
      errno = EXDEV;
      return false;
    }
    _levels.push_back({name, status.st_dev, status.st_ino});
    _current = std::move(below);
    return true;
  }

  // Empties the directories from the current one up to the first that was entered.
  bool run() {
    while (true) {
      const std::optional<std::string> directory = clearUpToDirectory(_current);
      if (!directory) return false;
      if (!directory->empty()) {
        if (!enter(_current, *directory)) return false;
        continue;
      }
      if (_levels.size() == 1) return true;
      if (!leave()) return false;
    }
  }

 private:
  // Goes up again and removes the directory that was left.
  bool leave() {
    const std::string name = _levels.back().name;
    _levels.pop_back();
    Descriptor above{::openat(_current.number(), "..", O_PATH | O_DIRECTORY | O_CLOEXEC)};
    struct stat status {};
    if (!above.isOpen() || ::fstat(above.number(), &status) != 0) return false;
    if (status.st_dev != _levels.back().device || status.st_ino != _levels.back().inode) {
      errno = EAGAIN;
      return false;
    }
    _current = std::move(above);
    return ::unlinkat(_current.number(), name.c_str(), AT_REMOVEDIR) == 0;
  }

  dev_t _volume;
  Descriptor _current;
  std::vector<Level> _levels;
};

}  // namespace

bool isEmpty(const Descriptor& directory) {
  const Stream stream = streamOf(directory);
  while (const dirent* const entry = stream ? ::readdir(stream.get()) : nullptr) {
    if (isEntryName(static_cast<const char*>(entry->d_name))) return false;
  }
  return stream != nullptr;
}

bool removeTree(const Place& place) {
  if (!isEntryName(place.leaf)) {
    errno = EINVAL;
    return false;
  }
  if (!isDirectoryAt(place.parent.number(), place.leaf.c_str())) {
    return ::unlinkat(place.parent.number(), place.leaf.c_str(), 0) == 0;
  }
  struct stat holder {};
  if (::fstat(place.parent.number(), &holder) != 0) return false;
  Walk walk{holder.st_dev};
  return walk.enter(place.parent, place.leaf) && walk.run() &&
         ::unlinkat(place.parent.number(), place.leaf.c_str(), AT_REMOVEDIR) == 0;
}

}  // namespace platform
