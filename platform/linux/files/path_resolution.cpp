#include "platform/linux/files/path_resolution.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <sys/vfs.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>

#include "platform/linux/files/planting.h"

namespace platform {
namespace {

using std::filesystem::path;
using Base = PathResolver::Base;

constexpr int kMaxLinks = 40;

Descriptor openAsGiven(const path& directory) {
  return Descriptor{::open(directory.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC)};
}

Descriptor copyOf(const Descriptor& descriptor) { return Descriptor{::fcntl(descriptor.number(), F_DUPFD_CLOEXEC, 0)}; }

bool readStatus(Entry& entry) {
  return entry.descriptor.isOpen() && ::fstat(entry.descriptor.number(), &entry.status) == 0;
}

// What stands at the name in the directory, where nothing is to be entered there. Answers false, with errno set, where
// that cannot be told.
bool look(const Entry& directory, const std::string& name, const Overlay* overlay, Entry& entry) {
  entry = {};
  if (overlay != nullptr) entry.node = overlay->find(directory.status, name);
  if (entry.node != nullptr) entry.status = entry.node->status;
  if (entry.node != nullptr || Overlay::isMade(directory.status)) return true;
  const int parent = directory.descriptor.number();
  return ::fstatat(parent, name.c_str(), &entry.status, AT_SYMLINK_NOFOLLOW) == 0 || errno == ENOENT;
}

// The same, opened on the way down.
bool open(const Entry& directory, const std::string& name, const Overlay* overlay, Entry& entry) {
  const Overlay::Node* const node = overlay == nullptr ? nullptr : overlay->find(directory.status, name);
  if (node != nullptr) {
    entry = {copyOf(directory.descriptor), node->status, node};
    return entry.descriptor.isOpen();
  }
  entry = {};
  if (Overlay::isMade(directory.status)) return true;
  entry.descriptor = Descriptor{::openat(directory.descriptor.number(), name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC)};
  return readStatus(entry) || errno == ENOENT;
}

// What the bits of a file promise holds everywhere but in the kernel's own views of its processes.
bool isOfProcesses(const Descriptor& file) {
  struct statfs volume {};
  return ::fstatfs(file.number(), &volume) != 0 || volume.f_type == PROC_SUPER_MAGIC;
}

// One way down from a base, a name at a time, on opened directories: nothing that is moved or replaced meanwhile
// changes what was judged. Everything fails with errno set.
class PathWalk {
 public:
  PathWalk(const Base& base, const Overlay* overlay) : _base{base}, _overlay{overlay} {}

  // Goes to what the path, relative to the base, leads to, which is no link; nothing need stand there.
  bool toTarget(const path& below) {
    _isUnderRoot = _base.path == _base.root;
    putAhead(below);
    if (!startAt(_base.path)) return false;
    for (bool isAtEnd = _ahead.empty(); !isAtEnd;) {
      if (!step(isAtEnd)) return false;
    }
    return givesPlanterNothing() || failWith(ELOOP);
  }

  bool toDirectory(const path& below) {
    if (!toTarget(below)) return false;
    if (_leaf == ".") return true;
    if (!_target.isThere()) return failWith(ENOENT);
    return enter(std::exchange(_target, {}));
  }

  // Goes to the path's parent and looks at what stands at its last name.
  bool toEntry(const path& below) {
    if (!toDirectory(below.parent_path())) return false;
    _leaf = below.empty() ? "." : below.filename().string();
    return !isEntryName(_leaf) || look(_directories.back(), _leaf, _overlay, _target);
  }

  Descriptor takeDirectory() { return std::move(_directories.back().descriptor); }
  const std::string& leaf() const { return _leaf; }

  std::optional<Spot> takeSpot() {
    if (!isEntryName(_leaf)) {
      const Entry& directory = _directories.back();
      _target = {Descriptor{}, directory.status, directory.node};
    }
    return Spot{std::move(_directories.back()), _leaf, std::move(_target)};
  }

 private:
  bool step(bool& isAtEnd) {
    const std::string name = std::move(_ahead.back());
    _ahead.pop_back();
    isAtEnd = _ahead.empty();
    _leaf.assign(1, '.');
    if (name == ".") return true;
    if (name == "..") return goUp();
    Entry entry;
    if (!open(_directories.back(), name, _overlay, entry)) return false;
    if (!entry.isThere() && !isAtEnd) return failWith(ENOENT);
    if (S_ISLNK(entry.status.st_mode)) {
      if (!follow(entry)) return false;
      isAtEnd = _ahead.empty();
      return true;
    }
    if (!isAtEnd) return enter(std::move(entry));
    _leaf = name;
    _target = std::move(entry);
    return true;
  }

  bool enter(Entry entry) {
    if (!S_ISDIR(entry.status.st_mode)) return failWith(ENOTDIR);
    const bool isOpenToAll = (entry.status.st_mode & S_IXOTH) != 0;
    if (_planter && entry.status.st_uid != *_planter && !isOpenToAll) return failWith(ELOOP);
    _directories.push_back(std::move(entry));
    return true;
  }

  bool goUp() {
    if (_directories.size() == 1) return _isUnderRoot || failWith(EXDEV);
    _directories.pop_back();
    return true;
  }

  bool follow(const Entry& link) {
    if (++_links > kMaxLinks || !mayFollow(link.status)) return failWith(ELOOP);
    path target;
    if (!readLink(link, target)) return false;
    putAhead(target.relative_path());
    if (!target.is_absolute()) return true;
    _isUnderRoot = true;
    return startAt(_base.root);
  }

  static bool readLink(const Entry& link, path& target) {
    if (link.node != nullptr) {
      target = std::string{link.node->bytes.begin(), link.node->bytes.end()};
      return true;
    }
    std::array<char, PATH_MAX> text{};
    const ssize_t size = ::readlinkat(link.descriptor.number(), "", text.data(), text.size());
    if (size <= 0) return size < 0 ? false : failWith(ENOENT);
    target = std::string{text.data(), static_cast<std::size_t>(size)};
    return true;
  }

  bool startAt(const path& directory) {
    _directories.clear();
    _directories.push_back({.descriptor = openAsGiven(directory)});
    return readStatus(_directories.back());
  }

  void putAhead(const path& names) {
    const std::vector<path> all{names.begin(), names.end()};
    for (auto name = all.rbegin(); name != all.rend(); ++name) _ahead.push_back(name->empty() ? "." : name->string());
  }

  bool mayFollow(const struct stat& link) {
    const Planters planters = plantersOf(link, _directories.back().status);
    if (planters.mayBeAnybody || (_planter && planters.user && *_planter != *planters.user)) return false;
    if (planters.user) _planter = planters.user;
    return true;
  }

  // What is not there yet would be made in the directory, which then is what must be the planter's.
  [[nodiscard]] bool givesPlanterNothing() const {
    if (!_planter) return true;
    const Entry& end = _leaf != "." && _target.isThere() ? _target : _directories.back();
    if (end.status.st_uid == *_planter) return true;
    return S_ISREG(end.status.st_mode) && isReadableFor(*_planter, end.status) && !isOfProcesses(end.descriptor);
  }

  const Base& _base;
  const Overlay* _overlay;
  std::vector<Entry> _directories;  // from the beginning down
  std::vector<std::string> _ahead;  // the names still to come, the next one last
  bool _isUnderRoot = false;        // ".." of the first directory is itself
  std::string _leaf = ".";          // the end of the walk in the last directory, "." for that itself
  Entry _target;                    // what stands there
  std::optional<uid_t> _planter;    // the one user who can have planted a link that was followed
  int _links = 0;
};

bool isBelow(const path& inner, const path& outer) {
  return std::mismatch(outer.begin(), outer.end(), inner.begin(), inner.end()).first == outer.end();
}

path relativeTo(const Base& base, const path& whole) {
  path below;
  auto name = std::next(whole.begin(), std::distance(base.path.begin(), base.path.end()));
  for (; name != whole.end(); ++name) below /= *name;
  return below;
}

// Empty where the path is, and for a relative one in a directory that is no more.
path wholePath(const path& given) {
  std::error_code error;
  const path whole = given.is_absolute() || given.empty() ? given : std::filesystem::current_path(error) / given;
  if (error) return {};
  return whole.has_filename() ? whole : whole.parent_path();
}

// Whether the last call failed for a link or "..", or since the kernel does not know it or does not let it through.
bool isToBeWalked() {
  constexpr int kCauses[] = {ELOOP, EXDEV, EAGAIN, ENOSYS, EPERM, EINVAL};
  return std::ranges::find(kCauses, errno) != std::end(kCauses);
}

// In one call of the kernel where no link stands in the way; errno tells whether that could be known.
Descriptor openWithoutLinks(int base, const char* path, unsigned flags, unsigned resolve = 0) {
  open_how how{};
  how.flags = flags | O_CLOEXEC;
  how.resolve = RESOLVE_NO_SYMLINKS | resolve;
  return Descriptor{retried([&] { return static_cast<int>(::syscall(SYS_openat2, base, path, &how, sizeof how)); })};
}

// Whether the test holds for every name of an absolute path.
template <typename Test>
bool everyName(std::string_view text, const Test& test) {
  while (!text.empty()) {
    const std::size_t end = std::min(text.find('/', 1), text.size());
    if (!test(text.substr(1, end - 1))) return false;
    text.remove_prefix(end);
  }
  return true;
}

// Whether a path is absolute and made of names alone, so that it leads where it says if no link stands in its way.
bool isPlain(std::string_view text) {
  return text.starts_with('/') &&
         everyName(text, [](std::string_view name) { return !name.empty() && name != "." && name != ".."; });
}

// The directory above a plain path.
std::string above(const path& plain) {
  return plain.native().substr(0, std::max<std::size_t>(plain.native().rfind('/'), 1));
}

std::string leafOf(const path& plain) { return plain.native().substr(plain.native().rfind('/') + 1); }

}  // namespace

PathResolver::PathResolver(const FileTrees& trees, const Overlay* overlay) : _overlay{overlay} {
  const path& root = trees.systemRoot;
  _bases.push_back({root, root});
  for (const path& directory : trees.ofDevice) {
    if (!isBelow(directory, root)) _bases.push_back({directory, root});
  }
  for (const path& directory : trees.ofMachine) _bases.push_back({directory, "/"});
  _bases.push_back({"/", "/"});
  const auto isLonger = [](const Base& one, const Base& other) {
    return one.path.native().size() > other.path.native().size();
  };
  std::ranges::stable_sort(_bases, isLonger);
}

const Base& PathResolver::baseOf(const path& path) const {
  return *std::ranges::find_if(_bases, [&](const Base& base) { return isBelow(path, base.path); });
}

bool PathResolver::isBase(const path& path) const {
  return std::ranges::any_of(_bases, [&](const Base& base) { return base.path.native() == path.native(); });
}

Descriptor PathResolver::openPlain(const path& path) const {
  if (isPlain(path.native()) && isAsOnDevice(path.native())) return openWithoutLinks(AT_FDCWD, path.c_str(), O_PATH);
  errno = ELOOP;
  return {};
}

Descriptor PathResolver::openFile(const path& path, struct stat& opened) const {
  const Place place = openParent(path);
  Descriptor file = place.parent.isOpen() ? openOwnFile(place, opened) : Descriptor{};
  const bool isLink = !file.isOpen() && place.parent.isOpen() && errno == ELOOP;
  if (!isLink) return file;
  const Place target = openParentOfTarget(path);
  return target.parent.isOpen() ? openOwnFile(target, opened) : Descriptor{};
}

Place PathResolver::openParent(const path& path, bool isToSync) const {
  const unsigned flags = isToSync ? O_RDONLY | O_DIRECTORY : O_PATH | O_DIRECTORY;
  if (isPlain(path.native()) && !isBase(path)) {
    Descriptor directory = openWithoutLinks(AT_FDCWD, above(path).c_str(), flags);
    if (directory.isOpen() || !isToBeWalked()) return {std::move(directory), leafOf(path), isToSync};
  }
  const std::filesystem::path whole = wholePath(path);
  if (whole.empty()) {
    errno = ENOENT;
    return {};
  }
  const Base& base = baseOf(whole);
  const std::filesystem::path below = relativeTo(base, whole);
  const std::filesystem::path holder = below.parent_path();
  const std::string leaf = below.empty() ? "." : below.filename().string();
  const Descriptor start = openAsGiven(base.path);
  if (!start.isOpen()) return {{}, leaf};
  Descriptor directory =
      openWithoutLinks(start.number(), holder.empty() ? "." : holder.c_str(), flags, RESOLVE_BENEATH);
  if (directory.isOpen() || !isToBeWalked()) return {std::move(directory), leaf, isToSync};
  PathWalk walk{base, nullptr};
  return {walk.toDirectory(holder) ? walk.takeDirectory() : Descriptor{}, leaf};
}

Place PathResolver::openParentOfTarget(const path& path) const {
  const std::filesystem::path whole = wholePath(path);
  Place place = openParent(whole);
  struct stat status {};
  const bool isLink = place.parent.isOpen() &&
                      ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0 &&
                      S_ISLNK(status.st_mode);
  if (!isLink) return place;
  PathWalk walk{baseOf(whole), nullptr};
  if (!walk.toTarget(relativeTo(baseOf(whole), whole))) return {};
  return {walk.takeDirectory(), walk.leaf()};
}

bool PathResolver::isAsOnDevice(std::string_view path) const {
  return _overlay == nullptr || everyName(path, [this](std::string_view name) { return !_overlay->isKnown(name); });
}

Place PathResolver::openParentOfUnchanged(const path& path) const {
  if (isPlain(path.native()) && !isBase(path) && isAsOnDevice(path.native())) {
    return {openWithoutLinks(AT_FDCWD, above(path).c_str(), O_PATH | O_DIRECTORY), leafOf(path)};
  }
  errno = ELOOP;
  return {};
}

std::optional<Spot> PathResolver::find(const path& path) const {
  if (const std::string way = above(path); isPlain(path.native()) && !isBase(path) && isAsOnDevice(way)) {
    Spot spot;
    spot.leaf = leafOf(path);
    spot.directory.descriptor = openWithoutLinks(AT_FDCWD, way.c_str(), O_PATH | O_DIRECTORY);
    if (readStatus(spot.directory)) {
      return look(spot.directory, spot.leaf, _overlay, spot.entry) ? std::optional{std::move(spot)} : std::nullopt;
    }
    if (!isToBeWalked()) return std::nullopt;
  }
  const std::filesystem::path whole = wholePath(path);
  if (whole.empty()) {
    errno = ENOENT;
    return std::nullopt;
  }
  PathWalk walk{baseOf(whole), _overlay};
  return walk.toEntry(relativeTo(baseOf(whole), whole)) ? walk.takeSpot() : std::nullopt;
}

std::optional<Spot> PathResolver::findTarget(const path& path) const {
  const std::filesystem::path whole = wholePath(path);
  std::optional<Spot> spot = find(whole);
  if (!spot || !S_ISLNK(spot->entry.status.st_mode)) return spot;
  PathWalk walk{baseOf(whole), _overlay};
  return walk.toTarget(relativeTo(baseOf(whole), whole)) ? walk.takeSpot() : std::nullopt;
}

}  // namespace platform
