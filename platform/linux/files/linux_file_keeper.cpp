#include "platform/linux/files/file_services.h"

#include <dirent.h>
#include <fcntl.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>

#include "platform/linux/files/path_resolution.h"

namespace platform {
namespace {

constexpr mode_t kAllPermissions = 07777;
constexpr mode_t kOrdinaryPermissions = 0777;

FileAttributes attributesFrom(const struct stat& status) {
  return {.kind = kindOf(status.st_mode),
          .size = static_cast<std::uint64_t>(status.st_size),
          .owner = status.st_uid,
          .group = status.st_gid,
          .permissions = status.st_mode & kAllPermissions,
          .modifiedSeconds = status.st_mtim.tv_sec,
          .modifiedNanoseconds = status.st_mtim.tv_nsec};
}

bool lookAt(const Place& place, struct stat& status) {
  return ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

// The owner comes before the permissions, of which a change of owner takes some away.
bool makeAsBefore(int file, const FileAttributes& attributes) {
  struct stat made {};
  if (::fstat(file, &made) != 0) return false;
  const bool isOwned = made.st_uid == attributes.owner && made.st_gid == attributes.group;
  if (!isOwned && ::fchown(file, attributes.owner, attributes.group) != 0) return false;
  if (::fchmod(file, attributes.permissions & kOrdinaryPermissions) != 0) return false;
  const std::array<timespec, 2> times{
      timespec{.tv_sec = 0, .tv_nsec = UTIME_OMIT},
      timespec{.tv_sec = attributes.modifiedSeconds, .tv_nsec = attributes.modifiedNanoseconds}};
  return ::futimens(file, times.data()) == 0;
}

bool putInPlace(const Place& place, const std::string& beside, std::span<const std::uint8_t> bytes,
                const FileAttributes& attributes) {
  const int parent = place.parent.number();
  const Descriptor file = makeFile({Descriptor{::openat(parent, ".", O_PATH | O_DIRECTORY | O_CLOEXEC)}, beside});
  return file.isOpen() && writeAll(file.number(), bytes.data(), bytes.size()) &&
         makeAsBefore(file.number(), attributes) && sync(file) &&
         changeEntries(place, [&] { return ::renameat(parent, beside.c_str(), parent, place.leaf.c_str()) == 0; });
}

class LinuxFileKeeper final : public FileKeeper {
 public:
  explicit LinuxFileKeeper(const FileTrees& trees) : _paths{trees} {}

  Result<FileAttributes> attributesOf(const Path& path) override {
    struct stat status {};
    Status outcome = at(path, "look at", [&status](const Place& place) { return lookAt(place, status); });
    if (!outcome.isOk()) return outcome;
    return attributesFrom(status);
  }

  // What is no regular file is looked at only.
  Result<FileCopy> read(const Path& path, std::size_t sizeLimit) override {
    FileCopy copy;
    Status outcome = at(path, "read", [&](const Place& place) {
      struct stat status {};
      if (!lookAt(place, status)) return false;
      copy.attributes = attributesFrom(status);
      if (copy.attributes.kind != FileKind::file) return true;
      const Descriptor file = openOwnFile(place, status);
      if (!file.isOpen()) return false;
      copy.attributes = attributesFrom(status);
      return readUpTo(file.number(), status, sizeLimit, copy.bytes);
    });
    if (!outcome.isOk()) return outcome;
    return copy;
  }

  Result<FileCopy> readTarget(const Path& path, std::size_t sizeLimit) override {
    FileCopy copy;
    struct stat status {};
    const Descriptor file = _paths.openFile(path, status);
    if (!file.isOpen() || !readUpTo(file.number(), status, sizeLimit, copy.bytes)) return failureOf("read", path);
    copy.attributes = attributesFrom(status);
    return copy;
  }

  Result<std::vector<std::string>> entriesOf(const Path& directory) override {
    std::vector<std::string> names;
    Status outcome = at(directory, "list", [&names](const Place& place) {
      const int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
      const int opened = ::openat(place.parent.number(), place.leaf.c_str(), flags);
      if (opened < 0) return false;
      const std::unique_ptr<DIR, int (*)(DIR*)> stream{::fdopendir(opened), &::closedir};
      if (!stream) return false;
      errno = 0;
      while (const dirent* const entry = ::readdir(stream.get())) {
        if (isEntryName(entry->d_name)) names.emplace_back(entry->d_name);
      }
      return errno == 0;
    });
    if (!outcome.isOk()) return outcome;
    std::ranges::sort(names);
    return names;
  }

  Status append(const Path& path, std::span<const std::uint8_t> bytes) override {
    return at(path, "add to", [bytes](const Place& place) {
      const int flags = O_WRONLY | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
      const Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), flags)};
      struct stat before {};
      if (!file.isOpen() || ::fstat(file.number(), &before) != 0) return false;
      if (!S_ISREG(before.st_mode)) return failWith(EINVAL);
      if (writeAll(file.number(), bytes.data(), bytes.size()) && sync(file)) return true;
      const int cause = errno;
      if (retried([&] { return ::ftruncate(file.number(), before.st_size); }) == 0) static_cast<void>(sync(file));
      return failWith(cause);
    });
  }

  Status restore(const Path& path, std::span<const std::uint8_t> bytes, const FileAttributes& attributes) override {
    return at(_paths.openParentToChange(path), path, "restore", [&](const Place& place) {
      struct stat status {};
      if (lookAt(place, status) && S_ISDIR(status.st_mode)) return failWith(EISDIR);
      const std::string beside = ".restoring-" + place.leaf;
      if (::unlinkat(place.parent.number(), beside.c_str(), 0) != 0 && errno != ENOENT) return false;
      if (putInPlace(place, beside, bytes, attributes)) return true;
      const int cause = errno;
      ::unlinkat(place.parent.number(), beside.c_str(), 0);
      return failWith(cause);
    });
  }

  // Nothing stands in a directory that is missing.
  Status removeFile(const Path& path) override {
    Status removed = at(_paths.openParentToChange(path), path, "remove", [](const Place& place) {
      return changeEntries(
          place, [&place] { return ::unlinkat(place.parent.number(), place.leaf.c_str(), 0) == 0 || errno == ENOENT; });
    });
    return removed.errorNumber() == ENOENT ? Status{} : removed;
  }

 private:
  template <typename Action>
  Status at(const Path& path, const char* verb, const Action& action) {
    return at(_paths.openParent(path), path, verb, action);
  }

  template <typename Action>
  static Status at(const Place& place, const Path& path, const char* verb, const Action& action) {
    return place.parent.isOpen() && action(place) ? Status{} : failureOf(verb, path);
  }

  PathResolver _paths;
};

}  // namespace

std::shared_ptr<FileKeeper> makeFileKeeper(const BaseDirectories& directories) {
  return std::make_shared<LinuxFileKeeper>(treesOf(directories));
}

}  // namespace platform
