#include "platform/linux/files/rehearsal_file_system.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <utility>

#include "platform/linux/files/account_names.h"
#include "platform/linux/files/descriptor.h"
#include "platform/linux/files/file_access.h"
#include "platform/linux/files/overlay.h"

namespace platform {
namespace {

bool refuse(int errorNumber) {
  errno = errorNumber;
  return false;
}

Status failure(const char* verb, const Path& path) {
  const int cause = errno;
  return Status::failure(cause, std::string{verb} + " " + path.string());
}

bool mayChangeEntriesOf(const Path& directory) {
  return ::faccessat(AT_FDCWD, directory.c_str(), R_OK | W_OK | X_OK, AT_EACCESS) == 0;
}

// In a sticky directory, only the owner of an entry or of the directory takes the entry away.
bool mayTakeFrom(const Path& directory, const Path& place) {
  struct stat above {};
  struct stat entry {};
  const bool isSticky = ::stat(directory.c_str(), &above) == 0 && (above.st_mode & S_ISVTX) != 0;
  if (!isSticky || ::geteuid() == 0 || ::lstat(place.c_str(), &entry) != 0) return true;
  return entry.st_uid == ::geteuid() || above.st_uid == ::geteuid() || refuse(EPERM);
}

bool isThereRoomFor(std::size_t size, const Path& directory) {
  rlimit limit{};
  if (::getrlimit(RLIMIT_FSIZE, &limit) == 0 && size > limit.rlim_cur) return refuse(EFBIG);
  struct statvfs volume {};
  if (::statvfs(directory.c_str(), &volume) != 0 || volume.f_blocks == 0) return true;
  const std::uintmax_t blocks = ::geteuid() == 0 ? volume.f_bfree : volume.f_bavail;
  return size <= blocks * volume.f_frsize || refuse(ENOSPC);
}

// Asks the kernel whether a file of this process could be given away, with a file that lies nowhere.
bool mayGiveAway(uid_t user, gid_t group) {
  const Descriptor file{::memfd_create("owner", MFD_CLOEXEC)};
  return file.isOpen() && ::fchown(file.number(), user, group) == 0;
}

bool isOnOneVolume(const Path& left, const Path& right) {
  struct stat first {};
  struct stat second {};
  if (::stat(left.c_str(), &first) != 0 || ::stat(right.c_str(), &second) != 0) return false;
  return first.st_dev == second.st_dev || refuse(EXDEV);
}

class RehearsalFileSystem final : public RehearsedFiles {
 public:
  RehearsalFileSystem(std::shared_ptr<FileSystem> inner, Path systemRoot)
      : _inner{std::move(inner)}, _accounts{std::move(systemRoot)} {}

  Result<FileKind> kindOf(const Path& path) override {
    const auto place = _overlay.placeOf(path);
    if (!place) return failure("look at", path);
    const Path target = _overlay.followed(*place);
    const Overlay::Node* const node = _overlay.nodeAt(target);
    if (node == nullptr) return _inner->kindOf(target);
    if (node->mode == 0) return Status::failure(ENOENT, "look at " + path.string());
    return S_ISDIR(node->mode) ? FileKind::directory : FileKind::file;
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    const auto place = _overlay.placeOf(path);
    if (!place) return failure("read", path);
    const Path target = _overlay.followed(*place);
    const Overlay::Node* const node = _overlay.nodeAt(target);
    if (node == nullptr) return _inner->read(path, sizeLimit);
    if (!isFile(target)) return failure("read", path);
    if (node->bytes.size() <= sizeLimit) return node->bytes;
    return Status::failure(EFBIG, "read " + path.string());
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    const auto place = _overlay.placeOf(path);
    if (!place || !isFree(*place) || !mayPut(*place, bytes.size())) return failure("create", path);
    _overlay.putFile(*place, {bytes.begin(), bytes.end()});
    return {};
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    const auto place = _overlay.placeOf(path);
    if (!place || !mayPut(*place, bytes.size()) || !mayBeCovered(*place)) return failure("replace", path);
    _overlay.putFile(*place, {bytes.begin(), bytes.end()});
    return {};
  }

  Status copy(const Path& from, const Path& to) override {
    const auto source = _overlay.placeOf(from);
    if (!source || !isFile(*source)) return failure("copy", from);
    Result<Bytes> bytes = read(*source, SIZE_MAX);
    if (!bytes.isOk()) return Status::failure(bytes.status().errorNumber(), "copy " + from.string());
    const auto place = _overlay.placeOf(to);
    if (!place || !isFree(*place) || !mayPut(*place, bytes.value().size())) return failure("copy to", to);
    _overlay.putFile(*place, bytes.take());
    return {};
  }

  Status remove(const Path& path) override {
    const auto place = _overlay.placeOf(path);
    if (!place || !isThere(*place) || !mayChangeAt(*place)) return failure("remove", path);
    if (!isEntryName(path.filename().string())) return Status::failure(EINVAL, "remove " + path.string());
    _overlay.remove(*place);
    return {};
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    return makeDirectories(path.has_filename() ? path : path.parent_path(), permissions)
               ? Status{}
               : failure("create the directory", path);
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const Result<uid_t> user = _accounts.user(std::string{owner});
    if (!user.isOk()) return user.status();
    const Result<gid_t> groupNumber = _accounts.group(std::string{group});
    if (!groupNumber.isOk()) return groupNumber.status();
    const auto place = _overlay.placeOf(path);
    if (place && isThere(*place) && isNobodyElses(*place) && mayGiveAway(user.value(), groupNumber.value())) return {};
    return failure("set the owner of", path);
  }

  Result<Path> temporaryName() override {
    const char* const chosen = ::secure_getenv("TMPDIR");
    const bool isUsable = chosen != nullptr && kindOf(chosen) == FileKind::directory;
    const Path directory = isUsable ? chosen : P_tmpdir;
    for (unsigned attempt = 0; attempt < 1'000'000; ++attempt) {
      const std::string number = std::to_string(++_temporaryNames);
      Path name = directory / ("file" + std::string(6 - std::min<std::size_t>(number.size(), 6), '0') + number);
      if (!kindOf(name).isOk()) return name;
    }
    return Status::failure(EEXIST, "find a temporary name in " + directory.string());
  }

  [[nodiscard]] std::optional<unsigned> permissionsAt(const Path& path) override {
    const auto place = _overlay.placeOf(path);
    const mode_t mode = place ? _overlay.modeAt(*place) : 0;
    return mode == 0 ? std::nullopt : std::optional{mode & 07777U};
  }

  Status rename(const Path& from, const Path& to) override {
    const auto source = _overlay.placeOf(from);
    const auto target = source ? _overlay.placeOf(to) : std::nullopt;
    if (target && mayMove(*source, *target)) {
      Result<Bytes> bytes = read(*source, SIZE_MAX);
      if (!bytes.isOk()) return bytes.status();
      _overlay.remove(*source);
      _overlay.putFile(*target, bytes.take());
      return {};
    }
    const int cause = errno;
    return Status::failure(cause, "rename " + from.string() + " to " + to.string());
  }

 private:
  // Each answers false with errno set.
  [[nodiscard]] bool isThere(const Path& place) const { return _overlay.modeAt(place) != 0 || refuse(ENOENT); }
  [[nodiscard]] bool isFree(const Path& place) const { return _overlay.modeAt(place) == 0 || refuse(EEXIST); }
  [[nodiscard]] bool isFile(const Path& place) const {
    const mode_t mode = _overlay.modeAt(place);
    if (S_ISREG(mode)) return true;
    if (mode == 0) return refuse(ENOENT);
    if (S_ISDIR(mode)) return refuse(EISDIR);
    return refuse(S_ISLNK(mode) ? ELOOP : EINVAL);
  }
  [[nodiscard]] bool mayBeCovered(const Path& place) const {
    return !S_ISDIR(_overlay.modeAt(place)) || refuse(EISDIR);
  }
  [[nodiscard]] bool mayChangeAt(const Path& place) const {
    if (_overlay.nodeAt(place.parent_path()) != nullptr) return true;
    return mayChangeEntriesOf(place.parent_path()) && mayTakeFrom(place.parent_path(), place);
  }
  [[nodiscard]] bool mayPut(const Path& place, std::size_t size) const {
    return mayChangeAt(place) && isThereRoomFor(size, _overlay.deviceDirectoryAbove(place));
  }
  [[nodiscard]] bool mayMove(const Path& source, const Path& target) const {
    if (!isThere(source) ||
        !isOnOneVolume(_overlay.deviceDirectoryAbove(source), _overlay.deviceDirectoryAbove(target)))
      return false;
    if (S_ISDIR(_overlay.modeAt(source))) return refuse(ENOTSUP);
    return mayBeCovered(target) && mayChangeAt(source) && mayChangeAt(target);
  }
  // What the rehearsal made has one name and belongs to this process.
  [[nodiscard]] bool isNobodyElses(const Path& place) const {
    struct stat status {};
    if (_overlay.nodeAt(place) != nullptr) return true;
    if (::lstat(place.c_str(), &status) != 0) return false;
    if (S_ISLNK(status.st_mode)) return refuse(ELOOP);
    if (!S_ISDIR(status.st_mode) && status.st_nlink > 1) return refuse(EMLINK);
    return ::geteuid() == 0 || status.st_uid == ::geteuid() || refuse(EPERM);
  }
  [[nodiscard]] bool makeDirectories(const Path& path, mode_t permissions) {
    if (!_overlay.placeOf(path)) {
      if (errno != ENOENT || !path.has_relative_path() || !makeDirectories(path.parent_path(), 0755)) return false;
    }
    const auto place = _overlay.placeOf(path);
    if (!place) return false;
    const mode_t mode = _overlay.modeAt(*place);
    if (mode != 0) return S_ISDIR(mode) || refuse(ENOTDIR);
    if (!mayChangeAt(*place)) return false;
    _overlay.putDirectory(*place, permissions);
    return true;
  }

  std::shared_ptr<FileSystem> _inner;
  AccountNames _accounts;
  Overlay _overlay;
  unsigned _temporaryNames = 0;
};

}  // namespace

std::shared_ptr<RehearsedFiles> makeRehearsalFileSystem(std::shared_ptr<FileSystem> inner, Path systemRoot) {
  return std::make_shared<RehearsalFileSystem>(std::move(inner), std::move(systemRoot));
}

}  // namespace platform
