#include "platform/linux/files/directory_trees.h"

#include <dirent.h>
#include <fcntl.h>

#include <cerrno>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace platform {
namespace {

constexpr unsigned kPermissionsAbove = 0755;

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

Descriptor openDirectory(const Descriptor& parent, const std::string& name, int access) {
  const int flags = access | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  return Descriptor{::openat(parent.number(), name.c_str(), flags)};
}

// Removes all that is no directory up to the first directory, and names that one: empty where none is left.
bool clearUpToDirectory(const Descriptor& holder, std::string& directory) {
  const Stream stream = streamOf(holder);
  if (!stream) return false;
  directory.clear();
  errno = 0;
  while (const dirent* const entry = ::readdir(stream.get())) {
    std::string name = static_cast<const char*>(entry->d_name);
    if (!isEntryName(name)) continue;
    if (isDirectoryAt(holder.number(), name.c_str())) {
      directory = std::move(name);
      return true;
    }
    if (::unlinkat(holder.number(), name.c_str(), 0) != 0 && errno != ENOENT) return false;
    errno = 0;
  }
  return errno == 0;
}

class Walk {
 public:
  explicit Walk(dev_t volume) : _volume{volume} {}

  // Goes down into the directory of that name.
  bool enter(const Descriptor& from, const std::string& name) {
    Descriptor below = openDirectory(from, name, O_PATH);
    struct stat status {};
    if (!below.isOpen() || ::fstat(below.number(), &status) != 0) return false;
    if (status.st_dev != _volume) return failWith(EXDEV);
    _levels.push_back({name, status.st_dev, status.st_ino});
    _current = std::move(below);
    return true;
  }

  // Empties the directories from the current one up to the first that was entered.
  bool run() {
    std::string directory;
    while (clearUpToDirectory(_current, directory)) {
      if (directory.empty() && _levels.size() == 1) return true;
      const bool isOnItsWay = directory.empty() ? leave() : enter(_current, directory);
      if (!isOnItsWay) return false;
    }
    return false;
  }

 private:
  // Goes up again and removes the directory that was left.
  bool leave() {
    const std::string name = _levels.back().name;
    _levels.pop_back();
    Descriptor above{::openat(_current.number(), "..", O_PATH | O_DIRECTORY | O_CLOEXEC)};
    struct stat status {};
    if (!above.isOpen() || ::fstat(above.number(), &status) != 0) return false;
    if (status.st_dev != _levels.back().device || status.st_ino != _levels.back().inode) return failWith(EAGAIN);
    _current = std::move(above);
    return ::unlinkat(_current.number(), name.c_str(), AT_REMOVEDIR) == 0;
  }

  dev_t _volume;
  Descriptor _current;
  std::vector<Level> _levels;
};

// Directories that were made, removed again from the innermost on unless they are kept.
class Made {
 public:
  Made() = default;
  Made(const Made&) = delete;
  Made& operator=(const Made&) = delete;
  ~Made() {
    const int cause = errno;
    for (auto place = _places.rbegin(); place != _places.rend(); ++place) {
      ::unlinkat(place->parent.number(), place->leaf.c_str(), AT_REMOVEDIR);
    }
    errno = cause;
  }
  const Place& add(Place place) { return _places.emplace_back(std::move(place)); }
  void keep() { _places.clear(); }

 private:
  std::vector<Place> _places;
};

// Somebody who writes in the parent may have put another directory at the name meanwhile; its bits are not ours to set.
bool isNew(const Descriptor& directory) {
  struct stat status {};
  if (::fstat(directory.number(), &status) != 0 || status.st_uid != ::geteuid()) return false;
  const Stream stream = streamOf(directory);
  while (const dirent* const entry = stream ? ::readdir(stream.get()) : nullptr) {
    if (isEntryName(static_cast<const char*>(entry->d_name))) return false;
  }
  return stream != nullptr;
}

// The permission bits whatever the umask. A directory that its own bits keep us from opening is changed by name, which
// follows no link either; only who has no rights over others' directories is kept from opening an own one.
bool setPermissions(const Place& place, unsigned permissions, Descriptor& directory) {
  directory = openDirectory(place.parent, place.leaf, O_RDONLY);
  if (!directory.isOpen()) {
    return errno == EACCES &&
           ::fchmodat(place.parent.number(), place.leaf.c_str(), permissions, AT_SYMLINK_NOFOLLOW) == 0;
  }
  return isNew(directory) ? ::fchmod(directory.number(), permissions) == 0 : failWith(EEXIST);
}

// Leaves `directory` unopened where it was there already.
bool makeDirectory(Place place, unsigned permissions, Made& made, Descriptor& directory) {
  directory = {};
  if (::mkdirat(place.parent.number(), place.leaf.c_str(), permissions & 0777U) != 0) return errno == EEXIST;
  const Place& own = made.add(std::move(place));
  if (!setPermissions(own, permissions, directory)) return false;
  const Descriptor entries = openForSync(own.parent);
  return entries.isOpen() && sync(entries);
}

// The directory and those above it that are missing, from the innermost on; none where that cannot be told.
std::vector<std::filesystem::path> missingDirectories(const PathResolver& paths, const std::filesystem::path& path) {
  std::vector<std::filesystem::path> missing{path.has_filename() ? path : path.parent_path()};
  while (!paths.openParent(missing.back()).parent.isOpen()) {
    if (errno != ENOENT || !missing.back().has_relative_path()) return {};
    missing.push_back(missing.back().parent_path());
  }
  return missing;
}

}  // namespace

std::optional<Descriptor> makeDirectories(const PathResolver& paths, const std::filesystem::path& path,
                                          unsigned permissions) {
  std::vector<std::filesystem::path> missing = missingDirectories(paths, path);
  if (missing.empty()) return std::nullopt;
  Made made;
  Descriptor innermost;
  for (; !missing.empty(); missing.pop_back()) {
    const unsigned bits = missing.size() == 1 ? permissions : kPermissionsAbove;
    Place place = paths.openParent(missing.back());
    if (!place.parent.isOpen() || !makeDirectory(std::move(place), bits, made, innermost)) return std::nullopt;
    place = paths.openParent(missing.back());
    if (!openDirectory(place.parent, place.leaf, O_PATH).isOpen()) return std::nullopt;
  }
  made.keep();
  return innermost;
}

bool removeTree(const Place& place) {
  if (!isEntryName(place.leaf)) return failWith(EINVAL);
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
