#include "platform/linux/files/path_resolution.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>

#include <algorithm>
#include <cerrno>

namespace platform {
namespace {

using std::filesystem::path;

bool isBelow(const path& inner, const path& outer) {
  return std::mismatch(outer.begin(), outer.end(), inner.begin(), inner.end()).first == outer.end();
}

path relativeTo(const WalkBase& base, const path& whole) {
  path below;
  auto name = std::next(whole.begin(), std::distance(base.path.begin(), base.path.end()));
  for (; name != whole.end(); ++name) below /= *name;
  return below;
}

path wholePath(const path& given) {
  const path whole = given.is_absolute() ? given : std::filesystem::current_path() / given;
  return whole.has_filename() ? whole : whole.parent_path();
}

Descriptor openAsGiven(const path& directory) {
  return Descriptor{::open(directory.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC)};
}

// In one call of the kernel where no link stands in the way; errno tells whether that could be known.
Descriptor openWithoutLinks(const Descriptor& base, const path& below) {
  open_how how{};
  how.flags = O_PATH | O_DIRECTORY | O_CLOEXEC;
  how.resolve = RESOLVE_NO_SYMLINKS | RESOLVE_BENEATH;
  return Descriptor{static_cast<int>(::syscall(SYS_openat2, base.number(), below.c_str(), &how, sizeof how))};
}

// A link or "..", or a kernel that does not know the call or does not let it through.
bool needsWalk(int cause) {
  constexpr int causes[] = {ELOOP, EXDEV, EAGAIN, ENOSYS, EPERM, EINVAL};
  return std::ranges::find(causes, cause) != std::end(causes);
}

Descriptor openBelow(const WalkBase& base, const path& below) {
  const Descriptor start = openAsGiven(base.path);
  if (!start.isOpen()) return {};
  Descriptor directory = openWithoutLinks(start, below.empty() ? "." : below);
  if (directory.isOpen() || !needsWalk(errno)) return directory;
  return PathWalk{base}.openDirectory(below);
}

bool isLink(const Place& place) {
  struct stat status {};
  return place.parent.isOpen() &&
         ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
         S_ISLNK(status.st_mode);
}

}  // namespace

PathResolver::PathResolver(const FileTrees& trees) {
  const path& root = trees.systemRoot;
  _bases.push_back({root, root});
  for (const path& directory : trees.ofDevice) {
    if (!isBelow(directory, root)) _bases.push_back({directory, root});
  }
  for (const path& directory : trees.ofMachine) _bases.push_back({directory, "/"});
  _bases.push_back({"/", "/"});
  const auto isLonger = [](const WalkBase& one, const WalkBase& other) {
    return one.path.native().size() > other.path.native().size();
  };
  std::ranges::stable_sort(_bases, isLonger);
}

const WalkBase& PathResolver::baseOf(const path& path) const {
  return *std::ranges::find_if(_bases, [&](const WalkBase& base) { return isBelow(path, base.path); });
}

Place PathResolver::openParent(const path& path) const {
  if (path.empty()) {
    errno = ENOENT;
    return {};
  }
  const std::filesystem::path whole = wholePath(path);
  const WalkBase& base = baseOf(whole);
  const std::filesystem::path below = relativeTo(base, whole);
  return {openBelow(base, below.parent_path()), below.empty() ? "." : below.filename().string()};
}

Place PathResolver::openParentOfTarget(const path& path) const {
  Place place = openParent(path);
  if (!isLink(place)) return place;
  const std::filesystem::path whole = wholePath(path);
  const WalkBase& base = baseOf(whole);
  return PathWalk{base}.openParentOfTarget(relativeTo(base, whole));
}

}  // namespace platform
