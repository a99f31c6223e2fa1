#include "platform/linux/files/file_access.h"

#include <fcntl.h>

#include <cerrno>
#include <chrono>
#include <ctime>
#include <thread>

#include "platform/linux/files/planting.h"

namespace platform {
namespace {

std::chrono::nanoseconds sinceEpoch(const timespec& time) {
  return std::chrono::seconds{time.tv_sec} + std::chrono::nanoseconds{time.tv_nsec};
}

bool isRegular(mode_t mode) {
  if (S_ISREG(mode)) return true;
  if (S_ISDIR(mode)) return failWith(EISDIR);
  return failWith(S_ISLNK(mode) ? ELOOP : EINVAL);
}

// Whether the file had one name and no other when its name was asked, as `status` has it. The kernel counts a name that
// it is taking away no longer, and finds it for a moment more. It does so under the directory's lock, which a move of
// the name onto itself waits for; after that the name is gone, or the file's time of change is another, unless that is
// so young that the clock has not moved since.
bool hasStoodAlone(const Place& place, const struct stat& status) {
  constexpr std::chrono::milliseconds kOldEnough{50};
  const std::chrono::nanoseconds changed = sinceEpoch(status.st_ctim);
  timespec now{};
  if (::clock_gettime(CLOCK_REALTIME, &now) != 0) return false;
  if (std::chrono::abs(sinceEpoch(now) - changed) < kOldEnough) {
    std::this_thread::sleep_for(kOldEnough);
    return false;
  }
  const int parent = place.parent.number();
  const char* const name = place.leaf.c_str();
  if (::renameat(parent, name, parent, name) != 0 && errno != EROFS) return false;
  struct stat later {};
  return statAtName(place, status, later) && sinceEpoch(later.st_ctim) == changed;
}

}  // namespace

Status failureOf(std::string_view attempt, const Path& path) {
  const int cause = errno;
  return Status::failure(cause, std::string{attempt} + " " + path.string());
}

FileKind kindOf(mode_t mode) {
  if (S_ISREG(mode)) return FileKind::file;
  return S_ISDIR(mode) ? FileKind::directory : FileKind::other;
}

bool isEntryName(const std::string& leaf) { return !leaf.empty() && leaf != "." && leaf != ".."; }

Descriptor openRegularFile(const Place& place, struct stat& opened) {
  if (::fstatat(place.parent.number(), place.leaf.c_str(), &opened, AT_SYMLINK_NOFOLLOW) != 0) return {};
  if (!isRegular(opened.st_mode)) return {};
  constexpr int kFlags = O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK | O_NOFOLLOW;
  Descriptor file{retried([&] { return ::openat(place.parent.number(), place.leaf.c_str(), kFlags); })};
  if (!file.isOpen() || ::fstat(file.number(), &opened) != 0 || !isRegular(opened.st_mode)) return {};
  return file;
}

bool statAtName(const Place& place, const struct stat& opened, struct stat& status) {
  if (::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0) return false;
  return (opened.st_dev == status.st_dev && opened.st_ino == status.st_ino) || failWith(ESTALE);
}

Descriptor openOwnFile(const Place& place, struct stat& opened) {
  constexpr int kAttempts = 100;  // a file that is replaced by a save is another one, and as good
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    Descriptor file = openRegularFile(place, opened);
    struct stat holder {};
    if (!file.isOpen() || ::fstat(place.parent.number(), &holder) != 0) return {};
    if (isOurs(holder.st_uid) && isClosed(holder)) return file;  // nobody can have planted it, with however many names
    struct stat status {};
    if (!statAtName(place, opened, status)) continue;
    if (!mayBeRead(status, holder)) break;
    struct stat withSecondName = status;
    withSecondName.st_nlink = 2;
    if (mayBeRead(withSecondName, holder) || hasStoodAlone(place, status)) return file;
  }
  errno = EMLINK;
  return {};
}

Descriptor makeFile(const Place& place) {
  constexpr int kFlags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), kFlags, 0600)};
  if (!file.isOpen() || ::fchmod(file.number(), 0600) == 0) return file;
  const int cause = errno;
  ::unlinkat(place.parent.number(), place.leaf.c_str(), 0);
  errno = cause;
  return {};
}

bool writeAll(int descriptor, const void* bytes, std::size_t size) {
  const auto* next = static_cast<const char*>(bytes);
  while (size > 0) {
    const ssize_t written = retried([&] { return ::write(descriptor, next, size); });
    if (written < 0) return false;
    next += written;
    size -= static_cast<std::size_t>(written);
  }
  return true;
}

ssize_t readSome(int descriptor, void* buffer, std::size_t size) {
  std::size_t filled = 0;
  while (filled < size) {
    const ssize_t count =
        retried([&] { return ::read(descriptor, static_cast<char*>(buffer) + filled, size - filled); });
    if (count < 0) return -1;
    if (count == 0) break;
    filled += static_cast<std::size_t>(count);
  }
  return static_cast<ssize_t>(filled);
}

bool readUpTo(int file, const struct stat& opened, std::size_t limit, Bytes& bytes) {
  if (static_cast<std::uintmax_t>(opened.st_size) > limit) return failWith(EFBIG);
  const auto expected = static_cast<std::size_t>(opened.st_size);
  bytes.resize(expected + 1);  // one byte more than expected shows whether the file ends where it said
  std::size_t filled = 0;
  while (true) {
    const ssize_t count = retried([&] { return ::read(file, bytes.data() + filled, bytes.size() - filled); });
    if (count < 0) return false;
    filled += static_cast<std::size_t>(count);
    if (filled > limit) return failWith(EFBIG);
    if (count == 0 || filled == expected) break;
    if (filled == bytes.size()) bytes.resize(bytes.size() * 2);
  }
  bytes.resize(filled);
  return true;
}

bool sync(const Descriptor& file) {
  return retried([&] { return ::fsync(file.number()); }) == 0 || errno == EINVAL;
}

Descriptor openForSync(const Descriptor& directory) {
  constexpr int kFlags = O_RDONLY | O_DIRECTORY | O_CLOEXEC;
  return Descriptor{retried([&] { return ::openat(directory.number(), ".", kFlags); })};
}

}  // namespace platform
