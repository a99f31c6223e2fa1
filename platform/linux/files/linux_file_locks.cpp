#include "platform/linux/files/linux_file_locks.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>

#include "platform/linux/files/path_resolution.h"

namespace platform {
namespace {

constexpr mode_t readableByAll = 0644;
// The file may come and go between two steps only if somebody plays with it; then there is no lock to be had.
constexpr int attempts = 100;

Descriptor makeLockFile(const Place& place) {
  constexpr int flags = O_RDONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), flags, readableByAll)};
  if (file.isOpen()) ::fchmod(file.number(), readableByAll);
  return file;
}

// An existing file is opened without O_CREAT: in a sticky directory the kernel may refuse that flag for a file of
// another owner.
Descriptor openLockFile(const Place& place) {
  for (int attempt = 0; place.parent.isOpen() && attempt < attempts; ++attempt) {
    Descriptor file = openRegularFile(place);
    if (file.isOpen() || errno != ENOENT) return file;
    file = makeLockFile(place);
    if (file.isOpen() || errno != EEXIST) return file;
  }
  return {};
}

Status failure(const char* attempt, const std::filesystem::path& path) {
  const int cause = errno;
  return Status::failure(cause, std::string{attempt} + " " + path.string());
}

bool isFileAt(const Place& place, const Descriptor& file) {
  struct stat opened {};
  struct stat present {};
  return ::fstat(file.number(), &opened) == 0 &&
         ::fstatat(place.parent.number(), place.leaf.c_str(), &present, AT_SYMLINK_NOFOLLOW) == 0 &&
         opened.st_dev == present.st_dev && opened.st_ino == present.st_ino;
}

bool waitForLock(const Descriptor& file) {
  while (::flock(file.number(), LOCK_EX) != 0) {
    if (errno != EINTR) return false;
  }
  return true;
}

class LinuxFileLock final : public ExclusiveFileLock {
 public:
  LinuxFileLock(std::string path, Place place, Descriptor file)
      : _path{std::move(path)}, _place{std::move(place)}, _file{std::move(file)} {}

  // A file that was removed meanwhile locks nobody out, so the one that now stands there is tried.
  Status lock() override {
    for (int attempt = 0; attempt < attempts; ++attempt) {
      if (!_file.isOpen() || !waitForLock(_file)) return failure("take the lock", _path);
      if (isFileAt(_place, _file)) return {};
      _file = openLockFile(_place);
    }
    return Status::failure(EAGAIN, "take the lock " + _path);
  }

  void unlock() override { ::flock(_file.number(), LOCK_UN); }

 private:
  std::string _path;
  Place _place;
  Descriptor _file;
};

class LinuxFileLocks final : public ExclusiveFileLocks {
 public:
  explicit LinuxFileLocks(std::filesystem::path directory) : _directory{std::move(directory)} {}

  Result<std::unique_ptr<ExclusiveFileLock>> lockNamed(std::string_view name) override {
    const std::filesystem::path path = _directory / name;
    if (!isEntryName(std::string{name}) || name.find('/') != std::string_view::npos) {
      return Status::failure(EINVAL, "open the lock file " + path.string());
    }
    Place place = PathResolver{}.openParent(path);
    Descriptor file = openLockFile(place);
    if (!file.isOpen()) return failure("open the lock file", path);
    return std::make_unique<LinuxFileLock>(path.string(), std::move(place), std::move(file));
  }

 private:
  std::filesystem::path _directory;
};

}  // namespace

std::shared_ptr<ExclusiveFileLocks> makeFileLocks(std::filesystem::path directory) {
  return std::make_shared<LinuxFileLocks>(std::move(directory));
}

}  // namespace platform
