#include "platform/linux/files/linux_file_system.h"

#include <fcntl.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <random>

#include "platform/linux/files/account_names.h"
#include "platform/linux/files/directory_creation.h"
#include "platform/linux/files/file_making.h"
#include "platform/linux/files/made_things.h"
#include "platform/linux/files/tree_removal.h"

namespace platform {
namespace {

Status failure(const char* verb, const Path& path) {
  const int cause = errno;
  return Status::failure(cause, std::string{verb} + " " + path.string());
}

// For a step that says why it fails in errno.
bool refuse(int cause) {
  errno = cause;
  return false;
}

bool isThere(const Place& place, struct stat& status) {
  return ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

Descriptor openAnything(const Place& place) {
  return Descriptor{::openat(place.parent.number(), place.leaf.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC)};
}

// Gives away the very thing that is open, and only a file that has no second name elsewhere.
bool giveAway(const Descriptor& thing, uid_t user, gid_t group) {
  struct stat status {};
  if (!thing.isOpen() || ::fstat(thing.number(), &status) != 0) return false;
  if (S_ISLNK(status.st_mode)) return refuse(ELOOP);
  if (!S_ISDIR(status.st_mode) && status.st_nlink > 1) return refuse(EMLINK);
  return ::fchownat(thing.number(), "", user, group, AT_EMPTY_PATH) == 0;
}

// As the C library chooses it: a program with more rights than its user has does not follow the environment.
Path temporaryDirectory() {
  const char* const chosen = ::secure_getenv("TMPDIR");
  std::error_code unused;
  return chosen != nullptr && std::filesystem::is_directory(chosen, unused) ? chosen : P_tmpdir;
}

std::string randomLetters() {
  constexpr std::string_view kLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
  constexpr std::size_t kCount = 6;
  std::random_device random;
  std::uniform_int_distribution<std::size_t> place{0, kLetters.size() - 1};
  std::string letters;
  while (letters.size() < kCount) letters.push_back(kLetters[place(random)]);
  return letters;
}

class LinuxFileSystem final : public FileSystem {
 public:
  explicit LinuxFileSystem(const FileTrees& trees) : _accounts{trees.systemRoot}, _paths{trees} {}

  Result<FileKind> kindOf(const Path& path) override {
    Place place = _paths.openParentOfTarget(path);
    if (!place.parent.isOpen() && errno == ELOOP) place = _paths.openParent(path);
    struct stat status {};
    if (!place.parent.isOpen() || !isThere(place, status)) return failure("look at", path);
    if (S_ISREG(status.st_mode)) return FileKind::file;
    return S_ISDIR(status.st_mode) ? FileKind::directory : FileKind::other;
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    Bytes bytes;
    const Place place = _paths.openParentOfTarget(path);
    const Descriptor file = place.parent.isOpen() ? openOwnFile(place) : Descriptor{};
    if (!file.isOpen() || !readUpTo(file.number(), sizeLimit, bytes)) return failure("read", path);
    return bytes;
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    _made.makeRoomFor(path);
    return at(path, "create", [&](const Place& place) {
      Descriptor file = makeFileOf(place, bytes);
      const bool isMade = file.isOpen();
      isMade ? _made.remember(path, std::move(file)) : _made.forget(path);
      return isMade;
    });
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    return at(path, "replace", [bytes](const Place& place) { return replaceFile(place, bytes); });
  }

  Status copy(const Path& from, const Path& to) override {
    Descriptor source;
    Status opened = at(from, "copy", [&](const Place& place) {
      source = openOwnFile(place);
      return source.isOpen();
    });
    if (!opened.isOk()) return opened;
    return at(to, "copy to", [&](const Place& place) { return makeCopyOf(place, source).isOpen(); });
  }

  Status remove(const Path& path) override {
    _made.forget(path);
    return at(path, "remove",
              [](const Place& place) { return changeEntries(place.parent, [&place] { return removeTree(place); }); });
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    std::optional<Descriptor> directory = makeDirectories(_paths, path, permissions);
    if (!directory) return failure("create the directory", path);
    if (directory->isOpen()) _made.remember(path, *std::move(directory));
    return {};
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const Result<uid_t> user = _accounts.user(std::string{owner});
    if (!user.isOk()) return user.status();
    const Result<gid_t> groupNumber = _accounts.group(std::string{group});
    if (!groupNumber.isOk()) return groupNumber.status();
    return at(path, "set the owner of", [&](const Place& place) {
      const Descriptor thing = openAnything(place);
      const Descriptor made = _made.take(path);
      if (!thing.isOpen()) return false;
      if (!made.isOpen() || isSame(thing, made)) return giveAway(thing, user.value(), groupNumber.value());
      return refuse(ESTALE);
    });
  }

  Result<Path> temporaryName() override {
    constexpr int kAttempts = 1000;
    const Path directory = temporaryDirectory();
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
      Path name = directory / ("file" + randomLetters());
      struct stat status {};
      if (::lstat(name.c_str(), &status) == 0) continue;
      return errno == ENOENT ? Result<Path>{std::move(name)} : failure("find a temporary name in", directory);
    }
    return Status::failure(EEXIST, "find a temporary name in " + directory.string());
  }

  Status rename(const Path& from, const Path& to) override {
    _made.forget(from);
    const Place source = _paths.openParent(from);
    const Place target = source.parent.isOpen() ? _paths.openParent(to) : Place{};
    if (target.parent.isOpen() && moveFile(source, target)) return {};
    const int cause = errno;
    return Status::failure(cause, "rename " + from.string() + " to " + to.string());
  }

 private:
  // Runs the action at the path's place; the action answers false, with errno set, where it fails.
  template <typename Action>
  Status at(const Path& path, const char* verb, const Action& action) {
    const Place place = _paths.openParent(path);
    return place.parent.isOpen() && action(place) ? Status{} : failure(verb, path);
  }

  AccountNames _accounts;
  PathResolver _paths;
  MadeThings _made;
};

}  // namespace

std::shared_ptr<FileSystem> makeFileSystem(const FileTrees& trees) { return std::make_shared<LinuxFileSystem>(trees); }

}  // namespace platform
