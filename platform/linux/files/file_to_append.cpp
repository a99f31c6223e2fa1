#include "platform/linux/files/file_services.h"

#include <fcntl.h>

#include <cerrno>
#include <ctime>

#include "platform/linux/files/path_resolution.h"
#include "platform/linux/files/planting.h"

namespace platform {
namespace {

constexpr mode_t ownerOnly = 0600;
// The file may come and go between two steps only if somebody plays with it.
constexpr int attempts = 100;
constexpr int flags = O_WRONLY | O_APPEND | O_NOFOLLOW | O_CLOEXEC | O_NOCTTY | O_NONBLOCK;

int obstacle(const struct stat& thing, const struct stat& holder) {
  if (S_ISLNK(thing.st_mode)) return ELOOP;
  if (S_ISDIR(thing.st_mode)) return EISDIR;
  if (!isOurs(thing.st_uid)) return EPERM;
  if (thing.st_nlink > 1) return EMLINK;
  if (S_ISREG(thing.st_mode)) return 0;
  const bool isStream = S_ISFIFO(thing.st_mode) || S_ISCHR(thing.st_mode);
  return isStream && isOurs(holder.st_uid) && isClosed(holder) ? 0 : EINVAL;
}

bool isUsable(int asked, const struct stat& thing, const Place& place) {
  struct stat holder {};
  if (asked != 0 || ::fstat(place.parent.number(), &holder) != 0) return false;
  const int cause = obstacle(thing, holder);
  if (cause != 0) errno = cause;
  return cause == 0;
}

// Whoever started both may have started the reader of a pipe a moment later.
Descriptor openWaitingForReader(const Place& place) {
  constexpr timespec moment{.tv_sec = 0, .tv_nsec = 10'000'000};
  for (int attempt = 1;; ++attempt) {
    Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), flags)};
    if (file.isOpen() || errno != ENXIO || attempt == attempts) return file;
    ::nanosleep(&moment, nullptr);
  }
}

Descriptor openExisting(const Place& place) {
  struct stat status {};
  int asked = ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW);
  if (!isUsable(asked, status, place)) return {};
  Descriptor file = openWaitingForReader(place);
  if (!file.isOpen()) return {};
  asked = ::fstat(file.number(), &status);
  if (!isUsable(asked, status, place)) return {};
  const bool isRegular = S_ISREG(status.st_mode);
  const int prepared = isRegular ? ::fchmod(file.number(), ownerOnly) : ::fcntl(file.number(), F_SETFL, O_APPEND);
  return prepared == 0 ? std::move(file) : Descriptor{};
}

Descriptor makeNew(const Place& place) {
  Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), flags | O_CREAT | O_EXCL, ownerOnly)};
  if (file.isOpen()) static_cast<void>(::fchmod(file.number(), ownerOnly));
  return file;
}

Descriptor openOrMake(const Place& place) {
  for (int attempt = 0; place.parent.isOpen() && attempt < attempts; ++attempt) {
    Descriptor file = openExisting(place);
    if (file.isOpen() || errno != ENOENT) return file;
    file = makeNew(place);
    if (file.isOpen() || errno != EEXIST) return file;
  }
  return {};
}

}  // namespace

Result<Descriptor> openToAppend(const std::filesystem::path& path) {
  Descriptor file = openOrMake(PathResolver{}.openParent(path));
  if (file.isOpen()) return file;
  const int cause = errno;
  return Status::failure(cause, "open " + path.string());
}

}  // namespace platform
