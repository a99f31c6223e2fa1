#include "platform/linux/files/file_services.h"

#include <fcntl.h>

#include <cerrno>
#include <ctime>

#include "platform/linux/files/path_resolution.h"
#include "platform/linux/files/planting.h"

namespace platform {
namespace {

constexpr mode_t kOwnerOnly = 0600;
// The file may come and go between two steps only if somebody plays with it.
constexpr int kAttempts = 100;
constexpr int kFlags = O_WRONLY | O_APPEND | O_NOFOLLOW | O_CLOEXEC | O_NOCTTY | O_NONBLOCK;

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
  return cause == 0 || failWith(cause);
}

// Whoever started both may have started the reader of a pipe a moment later.
Descriptor openWaitingForReader(const Place& place) {
  constexpr timespec kMoment{.tv_sec = 0, .tv_nsec = 10'000'000};
  for (int attempt = 1;; ++attempt) {
    Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), kFlags)};
    if (file.isOpen() || errno != ENXIO || attempt == kAttempts) return file;
    ::nanosleep(&kMoment, nullptr);
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
  const int prepared = isRegular ? ::fchmod(file.number(), kOwnerOnly) : ::fcntl(file.number(), F_SETFL, O_APPEND);
  return prepared == 0 ? std::move(file) : Descriptor{};
}

}  // namespace

Result<Descriptor> openToAppend(const std::filesystem::path& path) {
  const Place place = PathResolver{}.openParent(path);
  for (int attempt = 0; place.parent.isOpen() && attempt < kAttempts; ++attempt) {
    Descriptor file = openExisting(place);
    if (!file.isOpen() && errno == ENOENT) {
      file = Descriptor{::openat(place.parent.number(), place.leaf.c_str(), kFlags | O_CREAT | O_EXCL, kOwnerOnly)};
      if (file.isOpen()) static_cast<void>(::fchmod(file.number(), kOwnerOnly));
    }
    if (file.isOpen()) return file;
    if (errno != EEXIST) break;
  }
  return failureOf("open", path);
}

}  // namespace platform
