#include "platform/linux/files/directory_creation.h"

#include <fcntl.h>

#include <cerrno>
#include <vector>

#include "platform/linux/files/tree_removal.h"

namespace platform {
namespace {

constexpr unsigned permissionsAbove = 0755;

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
  return ::fstat(directory.number(), &status) == 0 && status.st_uid == ::geteuid() && isEmpty(directory);
}

// The permission bits whatever the umask. A directory that its own bits keep us from opening is changed by name, which
// follows no link either; only who has no rights over others' directories is kept from opening an own one.
bool setPermissions(const Place& place, unsigned permissions, Descriptor& directory) {
  const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  directory = Descriptor{::openat(place.parent.number(), place.leaf.c_str(), flags)};
  if (!directory.isOpen()) {
    return errno == EACCES &&
           ::fchmodat(place.parent.number(), place.leaf.c_str(), permissions, AT_SYMLINK_NOFOLLOW) == 0;
  }
  if (isNew(directory)) return ::fchmod(directory.number(), permissions) == 0;
  errno = EEXIST;
  return false;
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

bool isDirectory(const Place& place) {
  const int flags = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  return Descriptor{::openat(place.parent.number(), place.leaf.c_str(), flags)}.isOpen();
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

bool makeMissing(const PathResolver& paths, std::vector<std::filesystem::path> missing, unsigned permissions,
                 Made& made, Descriptor& innermost) {
  if (missing.empty()) return false;
  for (; !missing.empty(); missing.pop_back()) {
    Place place = paths.openParent(missing.back());
    const unsigned bits = missing.size() == 1 ? permissions : permissionsAbove;
    if (!place.parent.isOpen() || !makeDirectory(std::move(place), bits, made, innermost)) return false;
    if (!isDirectory(paths.openParent(missing.back()))) return false;
  }
  return true;
}

}  // namespace

std::optional<Descriptor> makeDirectories(const PathResolver& paths, const std::filesystem::path& path,
                                          unsigned permissions) {
  Made made;
  Descriptor innermost;
  if (!makeMissing(paths, missingDirectories(paths, path), permissions, made, innermost)) return std::nullopt;
  made.keep();
  return innermost;
}

}  // namespace platform
