#include "platform/linux/directory_creation.h"

#include <fcntl.h>

#include <cerrno>
#include <vector>

#include "platform/linux/file_access.h"

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

// The permission bits whatever the umask. A directory that its own bits keep us from opening is changed by name, which
// follows no link either.
bool setPermissions(const Place& place, unsigned permissions) {
  const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  const Descriptor directory{::openat(place.parent.number(), place.leaf.c_str(), flags)};
  if (directory.isOpen()) return ::fchmod(directory.number(), permissions) == 0;
  return errno == EACCES &&
         ::fchmodat(place.parent.number(), place.leaf.c_str(), permissions, AT_SYMLINK_NOFOLLOW) == 0;
}

bool makeDirectory(Place place, unsigned permissions, Made& made) {
  if (::mkdirat(place.parent.number(), place.leaf.c_str(), permissions & 0777U) != 0) return errno == EEXIST;
  const Place& own = made.add(std::move(place));
  if (!setPermissions(own, permissions)) return false;
  const Descriptor entries = openForSync(own.parent);
  return entries.isOpen() && sync(entries);
}

bool isDirectory(const Place& place) {
  const int flags = O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
  return Descriptor{::openat(place.parent.number(), place.leaf.c_str(), flags)}.isOpen();
}

// The directory and those above it that are missing, from the innermost on; none where that cannot be told.
std::vector<std::filesystem::path> missingDirectories(const std::filesystem::path& path) {
  std::vector<std::filesystem::path> missing{path.has_filename() ? path : path.parent_path()};
  while (!openParent(missing.back()).parent.isOpen()) {
    if (errno != ENOENT || !missing.back().has_relative_path()) return {};
    missing.push_back(missing.back().parent_path());
  }
  return missing;
}

bool makeMissing(const std::filesystem::path& path, unsigned permissions, Made& made) {
  std::vector<std::filesystem::path> missing = missingDirectories(path);
  if (missing.empty()) return false;
  for (; !missing.empty(); missing.pop_back()) {
    Place place = openParent(missing.back());
    const unsigned bits = missing.size() == 1 ? permissions : permissionsAbove;
    if (!place.parent.isOpen() || !makeDirectory(std::move(place), bits, made)) return false;
    if (!isDirectory(openParent(missing.back()))) return false;
  }
  return true;
}

}  // namespace

bool makeDirectories(const std::filesystem::path& path, unsigned permissions) {
  Made made;
  if (!makeMissing(path, permissions, made)) return false;
  made.keep();
  return true;
}

}  // namespace platform
