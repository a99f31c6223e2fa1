#include "platform/linux/files/file_services.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstdint>
#include <utility>

#include "platform/linux/files/account_names.h"
#include "platform/linux/files/path_resolution.h"

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

bool isDirectory(const Entry& entry) { return S_ISDIR(entry.status.st_mode); }

bool isThere(const Entry& entry) { return entry.isThere() || refuse(ENOENT); }

bool isFree(const Entry& entry) { return !entry.isThere() || refuse(EEXIST); }

bool isFile(const Entry& entry) {
  if (S_ISREG(entry.status.st_mode)) return true;
  if (!entry.isThere()) return refuse(ENOENT);
  if (isDirectory(entry)) return refuse(EISDIR);
  return refuse(S_ISLNK(entry.status.st_mode) ? ELOOP : EINVAL);
}

bool mayBeCovered(const Entry& entry) { return !isDirectory(entry) || refuse(EISDIR); }

// In a sticky directory, only the owner of an entry or of the directory takes the entry away.
bool mayBeTaken(const Entry& entry, const struct stat& directory) {
  const uid_t user = ::geteuid();
  const bool isSticky = (directory.st_mode & S_ISVTX) != 0;
  if (!isSticky || user == 0 || !entry.isThere()) return true;
  return entry.status.st_uid == user || directory.st_uid == user || refuse(EPERM);
}

bool mayBeChanged(const Spot& spot) {
  if (Overlay::isMade(spot.directory.status)) return true;
  return ::faccessat(spot.directory.descriptor.number(), ".", R_OK | W_OK | X_OK, AT_EACCESS) == 0 &&
         mayBeTaken(spot.entry, spot.directory.status);
}

bool isThereRoomFor(std::size_t size, const Descriptor& directory) {
  rlimit limit{};
  if (::getrlimit(RLIMIT_FSIZE, &limit) == 0 && size > limit.rlim_cur) return refuse(EFBIG);
  struct statvfs volume {};
  if (::fstatvfs(directory.number(), &volume) != 0 || volume.f_blocks == 0) return true;
  const std::uintmax_t blocks = ::geteuid() == 0 ? volume.f_bfree : volume.f_bavail;
  return size <= blocks * volume.f_frsize || refuse(ENOSPC);
}

bool mayBePut(const Spot& spot, std::size_t size) {
  return mayBeChanged(spot) && isThereRoomFor(size, spot.directory.descriptor);
}

bool isOnOneVolume(const Spot& left, const Spot& right) {
  struct stat first {};
  struct stat second {};
  if (::fstat(left.directory.descriptor.number(), &first) != 0) return false;
  if (::fstat(right.directory.descriptor.number(), &second) != 0) return false;
  return first.st_dev == second.st_dev || refuse(EXDEV);
}

bool mayBeMoved(const Spot& source, const Spot& target) {
  if (!isThere(source.entry) || !isOnOneVolume(source, target)) return false;
  if (isDirectory(source.entry)) return refuse(ENOTSUP);
  return mayBeCovered(target.entry) && mayBeChanged(source) && mayBeChanged(target);
}

// What the rehearsal made has one name and belongs to this process.
bool isNobodyElses(const Entry& entry) {
  if (S_ISLNK(entry.status.st_mode)) return refuse(ELOOP);
  if (entry.node != nullptr) return true;
  if (!isDirectory(entry) && entry.status.st_nlink > 1) return refuse(EMLINK);
  return ::geteuid() == 0 || entry.status.st_uid == ::geteuid() || refuse(EPERM);
}

// Asks the kernel whether a file of this process could be given away, with a file that lies nowhere.
bool mayGiveAway(const AccountNames::Owner& owner) {
  const Descriptor file{::memfd_create("owner", MFD_CLOEXEC)};
  return file.isOpen() && ::fchown(file.number(), owner.user, owner.group) == 0;
}

Place placeOf(const Spot& spot) {
  return {Descriptor{::fcntl(spot.directory.descriptor.number(), F_DUPFD_CLOEXEC, 0)}, spot.leaf};
}

bool readDeviceFile(const Descriptor& file, std::size_t sizeLimit, Bytes& bytes) {
  return file.isOpen() && readUpTo(file.number(), sizeLimit, bytes);
}

bool readContents(const Spot& spot, std::size_t sizeLimit, Bytes& bytes) {
  if (!isFile(spot.entry)) return false;
  if (spot.entry.node == nullptr) return readDeviceFile(openOwnFile(placeOf(spot)), sizeLimit, bytes);
  if (spot.entry.node->bytes.size() > sizeLimit) return refuse(EFBIG);
  bytes = spot.entry.node->bytes;
  return true;
}

// What a move takes along, whoever's it is: the bytes of a file, or where a link leads.
bool takeContents(const Spot& spot, Bytes& bytes) {
  if (spot.entry.node != nullptr) {
    bytes = spot.entry.node->bytes;
    return true;
  }
  if (!S_ISLNK(spot.entry.status.st_mode)) return readDeviceFile(openRegularFile(placeOf(spot)), SIZE_MAX, bytes);
  std::array<char, PATH_MAX> text{};
  const ssize_t size = ::readlinkat(spot.entry.descriptor.number(), "", text.data(), text.size());
  if (size < 0) return false;
  bytes.assign(text.begin(), text.begin() + size);
  return true;
}

Overlay::Node nodeOf(mode_t mode, Bytes bytes = {}) {
  Overlay::Node node{.bytes = std::move(bytes)};
  node.status.st_mode = mode;
  node.status.st_uid = ::geteuid();
  node.status.st_gid = ::getegid();
  return node;
}

class RehearsalFileSystem final : public RehearsedFiles {
 public:
  explicit RehearsalFileSystem(const BaseDirectories& directories)
      : _accounts{directories.systemRoot()}, _paths{treesOf(directories), &_overlay} {}

  Result<FileKind> kindOf(const Path& path) override {
    std::optional<Spot> spot = _paths.findTarget(path);
    if (!spot && errno == ELOOP) spot = _paths.find(path);
    if (!spot || !isThere(spot->entry)) return failure("look at", path);
    if (S_ISREG(spot->entry.status.st_mode)) return FileKind::file;
    return isDirectory(spot->entry) ? FileKind::directory : FileKind::other;
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    Bytes bytes;
    const std::optional<Spot> spot = _paths.findTarget(path);
    if (!spot || !readContents(*spot, sizeLimit, bytes)) return failure("read", path);
    return bytes;
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !isFree(spot->entry) || !mayBePut(*spot, bytes.size())) return failure("create", path);
    putFile(*spot, {bytes.begin(), bytes.end()});
    return {};
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !mayBePut(*spot, bytes.size()) || !mayBeCovered(spot->entry)) return failure("replace", path);
    putFile(*spot, {bytes.begin(), bytes.end()});
    return {};
  }

  Status copy(const Path& from, const Path& to) override {
    Bytes bytes;
    const std::optional<Spot> source = _paths.findTarget(from);
    if (!source || !readContents(*source, SIZE_MAX, bytes)) return failure("copy", from);
    const std::optional<Spot> target = _paths.find(to);
    if (!target || !isFree(target->entry) || !mayBePut(*target, bytes.size())) return failure("copy to", to);
    putFile(*target, std::move(bytes));
    return {};
  }

  Status remove(const Path& path) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !isThere(spot->entry) || !mayBeChanged(*spot)) return failure("remove", path);
    if (!isEntryName(spot->leaf)) return Status::failure(EINVAL, "remove " + path.string());
    _overlay.put(spot->directory.status, spot->leaf, {});
    return {};
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    return makeDirectories(path.has_filename() ? path : path.parent_path(), permissions)
               ? Status{}
               : failure("create the directory", path);
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const Result<AccountNames::Owner> numbers = _accounts.ownerOf(path, std::string{owner}, std::string{group});
    if (!numbers.isOk()) return numbers.status();
    const std::optional<Spot> spot = _paths.find(path);
    const bool isGiven = spot && isThere(spot->entry) && isNobodyElses(spot->entry) && mayGiveAway(numbers.value());
    return isGiven ? Status{} : failure("set the owner of", path);
  }

  Result<Path> temporaryName() override {
    const Result<Path> directory = temporaryDirectory(*this);
    if (!directory.isOk()) return directory;
    for (unsigned attempt = 0; attempt < 1'000'000; ++attempt) {
      const std::string number = std::to_string(++_temporaryNames);
      Path name = directory.value() / ("file" + std::string(6 - std::min<std::size_t>(number.size(), 6), '0') + number);
      if (!kindOf(name).isOk()) return name;
    }
    return Status::failure(EEXIST, "find a temporary name in " + directory.value().string());
  }

  [[nodiscard]] std::optional<unsigned> permissionsAt(const Path& path) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !spot->entry.isThere()) return std::nullopt;
    return spot->entry.status.st_mode & 07777U;
  }

  Status rename(const Path& from, const Path& to) override {
    const std::optional<Spot> source = _paths.find(from);
    const std::optional<Spot> target = source ? _paths.find(to) : std::nullopt;
    Bytes bytes;
    if (target && mayBeMoved(*source, *target) && takeContents(*source, bytes)) {
      Overlay::Node moved = nodeOf(source->entry.status.st_mode, std::move(bytes));
      _overlay.put(source->directory.status, source->leaf, {});
      _overlay.put(target->directory.status, target->leaf, std::move(moved));
      return {};
    }
    const int cause = errno;
    return Status::failure(cause, "rename " + from.string() + " to " + to.string());
  }

 private:
  void putFile(const Spot& spot, Bytes bytes) {
    _overlay.put(spot.directory.status, spot.leaf, nodeOf(S_IFREG | S_IRUSR | S_IWUSR, std::move(bytes)));
  }

  [[nodiscard]] bool makeDirectories(const Path& path, mode_t permissions) {
    std::optional<Spot> spot = _paths.find(path);
    if (!spot) {
      if (errno != ENOENT || !path.has_relative_path() || !makeDirectories(path.parent_path(), 0755)) return false;
      spot = _paths.find(path);
    }
    if (!spot) return false;
    if (spot->entry.isThere()) return isDirectory(spot->entry) || refuse(ENOTDIR);
    if (!mayBeChanged(*spot)) return false;
    _overlay.put(spot->directory.status, spot->leaf, nodeOf(S_IFDIR | permissions));
    return true;
  }

  AccountNames _accounts;
  Overlay _overlay;
  PathResolver _paths;
  unsigned _temporaryNames = 0;
};

}  // namespace

std::shared_ptr<RehearsedFiles> makeRehearsalFileSystem(const BaseDirectories& directories) {
  return std::make_shared<RehearsalFileSystem>(directories);
}

}  // namespace platform
