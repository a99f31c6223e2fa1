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

bool isDirectory(const Entry& entry) { return S_ISDIR(entry.status.st_mode); }

bool isThere(const Entry& entry) { return entry.isThere() || failWith(ENOENT); }

bool isFree(const Entry& entry) { return !entry.isThere() || failWith(EEXIST); }

bool mayBeCovered(const Entry& entry) { return !isDirectory(entry) || failWith(EISDIR); }

// In a sticky directory, only the owner of an entry or of the directory takes the entry away.
bool mayBeChanged(const Spot& spot) {
  const struct stat& directory = spot.directory.status;
  if (Overlay::isMade(directory)) return true;
  if (::faccessat(spot.directory.descriptor.number(), ".", R_OK | W_OK | X_OK, AT_EACCESS) != 0) return false;
  const bool isSticky = (directory.st_mode & S_ISVTX) != 0;
  if (!isSticky || !spot.entry.isThere()) return true;
  const uid_t user = ::geteuid();
  return user == 0 || spot.entry.status.st_uid == user || directory.st_uid == user || failWith(EPERM);
}

// Whether a file of that size may be made there, and there is room for it.
bool mayBePut(const Spot& spot, std::size_t size) {
  if (!mayBeChanged(spot)) return false;
  rlimit limit{};
  if (::getrlimit(RLIMIT_FSIZE, &limit) == 0 && size > limit.rlim_cur) return failWith(EFBIG);
  struct statvfs volume {};
  if (::fstatvfs(spot.directory.descriptor.number(), &volume) != 0 || volume.f_blocks == 0) return true;
  if (size <= std::uintmax_t{volume.f_bavail} * volume.f_frsize) return true;
  const bool hasRest = ::geteuid() == 0 && size <= std::uintmax_t{volume.f_bfree} * volume.f_frsize;
  return hasRest || failWith(ENOSPC);
}

// Of a directory that the rehearsal made, where it would be made.
bool findVolume(const Entry& directory, dev_t& volume) {
  struct stat holder = directory.status;
  if (Overlay::isMade(holder) && ::fstat(directory.descriptor.number(), &holder) != 0) return false;
  volume = holder.st_dev;
  return true;
}

bool mayBeMoved(const Spot& source, const Spot& target) {
  if (!isThere(source.entry)) return false;
  dev_t from = 0;
  dev_t to = 0;
  if (!findVolume(source.directory, from) || !findVolume(target.directory, to)) return false;
  if (from != to) return failWith(EXDEV);
  if (isDirectory(source.entry)) return failWith(ENOTSUP);
  return mayBeCovered(target.entry) && mayBeChanged(source) && mayBeChanged(target);
}

// What the rehearsal made has one name and belongs to this process.
bool isNobodyElses(const Entry& entry) {
  if (S_ISLNK(entry.status.st_mode)) return failWith(ELOOP);
  if (entry.node != nullptr) return true;
  if (!isDirectory(entry) && entry.status.st_nlink > 1) return failWith(EMLINK);
  return ::geteuid() == 0 || entry.status.st_uid == ::geteuid() || failWith(EPERM);
}

// `open` is how the device's file is opened: openOwnFile or openRegularFile. The spot's directory goes with it.
template <typename Open>
bool readDeviceFile(Spot& spot, const Open& open, std::size_t sizeLimit, Bytes& bytes) {
  struct stat opened {};
  const Descriptor file = open(Place{std::move(spot.directory.descriptor), spot.leaf}, opened);
  return file.isOpen() && readUpTo(file.number(), opened, sizeLimit, bytes);
}

bool readContents(Spot& spot, std::size_t sizeLimit, Bytes& bytes) {
  if (!isThere(spot.entry)) return false;
  if (isDirectory(spot.entry)) return failWith(EISDIR);
  if (!S_ISREG(spot.entry.status.st_mode)) return failWith(S_ISLNK(spot.entry.status.st_mode) ? ELOOP : EINVAL);
  if (spot.entry.node == nullptr) return readDeviceFile(spot, openOwnFile, sizeLimit, bytes);
  if (spot.entry.node->bytes.size() > sizeLimit) return failWith(EFBIG);
  bytes = spot.entry.node->bytes;
  return true;
}

// What a move takes along, whoever's it is: the bytes of a file, or where a link leads.
bool takeContents(Spot& spot, Bytes& bytes) {
  if (spot.entry.node != nullptr) {
    bytes = spot.entry.node->bytes;
    return true;
  }
  if (!S_ISLNK(spot.entry.status.st_mode)) return readDeviceFile(spot, openRegularFile, SIZE_MAX, bytes);
  std::array<char, PATH_MAX> text{};
  const ssize_t size = ::readlinkat(spot.directory.descriptor.number(), spot.leaf.c_str(), text.data(), text.size());
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
    struct stat status {};
    const Descriptor thing = _paths.openPlain(path);
    if (!thing.isOpen() && errno == ENOENT) return failureOf("look at", path);
    if (thing.isOpen() && ::fstat(thing.number(), &status) == 0) return platform::kindOf(status.st_mode);
    std::optional<Spot> spot = _paths.findTarget(path);
    if (!spot && errno == ELOOP) spot = _paths.find(path);
    if (!spot || !isThere(spot->entry)) return failureOf("look at", path);
    return platform::kindOf(spot->entry.status.st_mode);
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    Bytes bytes;
    struct stat opened {};
    const Place place = _paths.openParentOfUnchanged(path);
    const Descriptor file = place.parent.isOpen() ? openOwnFile(place, opened) : Descriptor{};
    const bool isCertain = file.isOpen() || errno == ENOENT || errno == EMLINK;
    if (!isCertain) return readTarget(path, sizeLimit);
    if (!file.isOpen() || !readUpTo(file.number(), opened, sizeLimit, bytes)) return failureOf("read", path);
    return bytes;
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !isFree(spot->entry) || !mayBePut(*spot, bytes.size())) return failureOf("create", path);
    putFile(*spot, {bytes.begin(), bytes.end()});
    return {};
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !mayBePut(*spot, bytes.size()) || !mayBeCovered(spot->entry)) return failureOf("replace", path);
    putFile(*spot, {bytes.begin(), bytes.end()});
    return {};
  }

  Status copy(const Path& from, const Path& to) override {
    Bytes bytes;
    std::optional<Spot> source = _paths.findTarget(from);
    if (!source || !readContents(*source, SIZE_MAX, bytes)) return failureOf("copy", from);
    const std::optional<Spot> target = _paths.find(to);
    if (!target || !isFree(target->entry) || !mayBePut(*target, bytes.size())) return failureOf("copy to", to);
    putFile(*target, std::move(bytes));
    return {};
  }

  Status remove(const Path& path) override {
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !isThere(spot->entry) || !mayBeChanged(*spot)) return failureOf("remove", path);
    if (!isEntryName(spot->leaf)) return Status::failure(EINVAL, "remove " + path.string());
    _overlay.put(spot->directory.status, spot->leaf, {});
    return {};
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    return makeDirectories(path.has_filename() ? path : path.parent_path(), permissions)
               ? Status{}
               : failureOf("create the directory", path);
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const Result<AccountNames::Owner> numbers = _accounts.ownerOf(path, std::string{owner}, std::string{group});
    if (!numbers.isOk()) return numbers.status();
    const std::optional<Spot> spot = _paths.find(path);
    if (!spot || !isThere(spot->entry) || !isNobodyElses(spot->entry)) return failureOf("set the owner of", path);
    return mayGiveTo(numbers.value()) ? Status{} : failureOf("set the owner of", path);
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
    std::optional<Spot> source = _paths.find(from);
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
  Result<Bytes> readTarget(const Path& path, std::size_t sizeLimit) {
    Bytes bytes;
    std::optional<Spot> spot = _paths.findTarget(path);
    if (!spot || !readContents(*spot, sizeLimit, bytes)) return failureOf("read", path);
    return bytes;
  }

  // Whether a file of this process could be given away, the kernel tells of one that lies nowhere.
  [[nodiscard]] bool mayGiveTo(const AccountNames::Owner& owner) {
    if (_givenTo == owner) return true;
    const Descriptor file{::memfd_create("owner", MFD_CLOEXEC)};
    if (!file.isOpen() || ::fchown(file.number(), owner.user, owner.group) != 0) return false;
    _givenTo = owner;
    return true;
  }

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
    if (spot->entry.isThere()) return isDirectory(spot->entry) || failWith(ENOTDIR);
    if (!mayBeChanged(*spot)) return false;
    _overlay.put(spot->directory.status, spot->leaf, nodeOf(S_IFDIR | permissions));
    return true;
  }

  AccountNames _accounts;
  Overlay _overlay;
  PathResolver _paths;
  unsigned _temporaryNames = 0;
  std::optional<AccountNames::Owner> _givenTo;  // the last one to whom a file could be given away
};

}  // namespace

std::shared_ptr<RehearsedFiles> makeRehearsalFileSystem(const BaseDirectories& directories) {
  return std::make_shared<RehearsalFileSystem>(directories);
}

}  // namespace platform
