#include "platform/linux/linux_file_system.h"

#include <fcntl.h>
#include <sys/random.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "platform/linux/account_names.h"
#include "platform/linux/directory_creation.h"
#include "platform/linux/file_access.h"
#include "platform/linux/tree_removal.h"

namespace platform {
namespace {

Status failure(const char* verb, const Path& path) {
  const int cause = errno;
  return Status::failure(cause, std::string{verb} + " " + path.string());
}

// Runs the action at the path's place; the action answers false, with errno set, where it fails.
template <typename Action>
Status at(const Path& path, const char* verb, const Action& action) {
  const Place place = openParent(path);
  return place.parent.isOpen() && action(place) ? Status{} : failure(verb, path);
}

void unlinkKeepingCause(const Place& place) {
  const int cause = errno;
  ::unlinkat(place.parent.number(), place.leaf.c_str(), 0);
  errno = cause;
}

// Makes a file whose contents the writer writes to its descriptor; nothing remains where that fails.
template <typename Writer>
bool makeSyncedFile(const Place& place, const Writer& write) {
  bool isMade = false;
  const auto makeAndWrite = [&] {
    const Descriptor file = makeFile(place);
    isMade = file.isOpen();
    return isMade && write(file.number()) && sync(file);
  };
  if (changeEntries(place.parent, makeAndWrite)) return true;
  if (isMade) unlinkKeepingCause(place);
  return false;
}

bool makeFileOf(const Place& place, std::span<const std::uint8_t> bytes) {
  return makeSyncedFile(place, [bytes](int file) { return writeAll(file, bytes.data(), bytes.size()); });
}

bool copyBytes(int from, int to) {
  std::vector<char> buffer(std::size_t{1} << 16);
  while (true) {
    const ssize_t count = readSome(from, buffer.data(), buffer.size());
    if (count <= 0) return count == 0;
    if (!writeAll(to, buffer.data(), static_cast<std::size_t>(count))) return false;
  }
}

std::string randomName() {
  std::array<unsigned char, 8> noise{};
  if (::getrandom(noise.data(), noise.size(), 0) != static_cast<ssize_t>(noise.size())) return {};
  std::string name = ".new-";
  for (const unsigned char byte : noise) {
    name += "0123456789abcdef"[byte >> 4U];
    name += "0123456789abcdef"[byte & 15U];
  }
  return name;
}

bool move(const Place& from, const Place& to) {
  return changeEntries(to.parent, [&] {
    return ::renameat(from.parent.number(), from.leaf.c_str(), to.parent.number(), to.leaf.c_str()) == 0;
  });
}

bool replaceFile(const Place& place, std::span<const std::uint8_t> bytes) {
  const Place beside{Descriptor{::openat(place.parent.number(), ".", O_PATH | O_DIRECTORY | O_CLOEXEC)}, randomName()};
  if (!beside.parent.isOpen() || !makeFileOf(beside, bytes)) return false;
  if (move(beside, place)) return true;
  unlinkKeepingCause(beside);
  return false;
}

// Gives away the very file that was looked at, and only one that has no second name elsewhere.
bool changeOwner(const Place& place, uid_t user, gid_t group) {
  const Descriptor file{::openat(place.parent.number(), place.leaf.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC)};
  struct stat status {};
  if (!file.isOpen() || ::fstat(file.number(), &status) != 0) return false;
  if (S_ISLNK(status.st_mode) || (!S_ISDIR(status.st_mode) && status.st_nlink > 1)) {
    errno = S_ISLNK(status.st_mode) ? ELOOP : EMLINK;
    return false;
  }
  return ::fchownat(file.number(), "", user, group, AT_EMPTY_PATH) == 0;
}

// At most limit bytes; errno EFBIG where there are more.
bool readUpTo(int file, std::size_t limit, Bytes& bytes) {
  struct stat status {};
  if (::fstat(file, &status) != 0) return false;
  errno = EFBIG;
  if (static_cast<std::uintmax_t>(status.st_size) > limit) return false;
  // One byte more than expected shows whether the file ends where it said.
  bytes.resize(static_cast<std::size_t>(status.st_size) + 1);
  std::size_t filled = 0;
  while (true) {
    const ssize_t count = readSome(file, bytes.data() + filled, bytes.size() - filled);
    if (count < 0) return false;
    filled += static_cast<std::size_t>(count);
    errno = EFBIG;
    if (filled > limit) return false;
    if (filled < bytes.size()) break;
    bytes.resize(bytes.size() * 2);
  }
  bytes.resize(filled);
  return true;
}

class LinuxFileSystem final : public FileSystem {
 public:
  explicit LinuxFileSystem(Path systemRoot) : _accounts{std::move(systemRoot)} {}

  [[nodiscard]] std::optional<FileKind> kindOf(const Path& path) override {
    const Place place = openParent(path);
    struct stat status {};
    if (!place.parent.isOpen() || ::fstatat(place.parent.number(), place.leaf.c_str(), &status, 0) != 0) return {};
    if (S_ISREG(status.st_mode)) return FileKind::file;
    return S_ISDIR(status.st_mode) ? FileKind::directory : FileKind::other;
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    Bytes bytes;
    Status outcome = at(path, "read", [&](const Place& place) {
      const Descriptor file = openRegularFile(place, AtLink::follow);
      return file.isOpen() && readUpTo(file.number(), sizeLimit, bytes);
    });
    if (!outcome.isOk()) return outcome;
    return bytes;
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    return at(path, "create", [bytes](const Place& place) { return makeFileOf(place, bytes); });
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    return at(path, "replace", [bytes](const Place& place) { return replaceFile(place, bytes); });
  }

  Status copy(const Path& from, const Path& to) override {
    Descriptor source;
    Status opened = at(from, "copy", [&](const Place& place) {
      source = openRegularFile(place, AtLink::stop);
      return source.isOpen();
    });
    if (!opened.isOk()) return opened;
    return at(to, "copy to", [&](const Place& place) {
      return makeSyncedFile(place, [&](int file) { return copyBytes(source.number(), file); });
    });
  }

  Status remove(const Path& path) override {
    return at(path, "remove",
              [](const Place& place) { return changeEntries(place.parent, [&place] { return removeTree(place); }); });
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    return makeDirectories(path, permissions) ? Status{} : failure("create the directory", path);
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const std::optional<uid_t> user = _accounts.user(std::string{owner});
    const std::optional<gid_t> groupNumber = _accounts.group(std::string{group});
    if (!user || !groupNumber) {
      return Status::failure(ENOENT, "find the account " + std::string{user ? group : owner} + " for " + path.string());
    }
    return at(path, "set the owner of", [&](const Place& place) { return changeOwner(place, *user, *groupNumber); });
  }

  [[nodiscard]] std::optional<Path> temporaryName() override {
    const std::unique_ptr<char, decltype(&std::free)> name{::tempnam(nullptr, nullptr), &std::free};
    if (!name) return std::nullopt;
    return Path{name.get()};
  }

  Status rename(const Path& from, const Path& to) override {
    const Place source = openParent(from);
    const Place target = source.parent.isOpen() ? openParent(to) : Place{};
    if (target.parent.isOpen() && move(source, target)) return {};
    const int cause = errno;
    return Status::failure(cause, "rename " + from.string() + " to " + to.string());
  }

 private:
  AccountNames _accounts;
};

}  // namespace

std::shared_ptr<FileSystem> makeFileSystem(Path systemRoot) {
  return std::make_shared<LinuxFileSystem>(std::move(systemRoot));
}

}  // namespace platform
