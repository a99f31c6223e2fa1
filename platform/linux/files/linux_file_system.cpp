#include "platform/linux/files/file_services.h"

#include <fcntl.h>
#include <sys/random.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <deque>
#include <mutex>
#include <tuple>

#include "platform/linux/files/account_names.h"
#include "platform/linux/files/directory_trees.h"

namespace platform {
namespace {

bool isThere(const Place& place, struct stat& status) {
  return ::fstatat(place.parent.number(), place.leaf.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0;
}

Descriptor openAt(const Place& place, int flags) {
  return Descriptor{::openat(place.parent.number(), place.leaf.c_str(), flags | O_NOFOLLOW | O_CLOEXEC)};
}

void unlinkKeepingCause(const Place& place) {
  const int cause = errno;
  ::unlinkat(place.parent.number(), place.leaf.c_str(), 0);
  errno = cause;
}

// Makes a file, mode 0600 whatever the umask, whose contents the writer writes to its descriptor; bytes and entry are
// on stable storage, or nothing remains.
template <typename Writer>
Descriptor makeSyncedFile(const Place& place, const Writer& write) {
  Descriptor file;
  const auto makeAndWrite = [&] {
    file = makeFile(place);
    return file.isOpen() && write(file.number()) && sync(file);
  };
  if (changeEntries(place, makeAndWrite)) return file;
  if (file.isOpen()) unlinkKeepingCause(place);
  return {};
}

Descriptor makeFileOf(const Place& place, std::span<const std::uint8_t> bytes) {
  return makeSyncedFile(place, [bytes](int file) { return writeAll(file, bytes.data(), bytes.size()); });
}

bool copyBytes(int from, int to) {
  std::array<char, std::size_t{1} << 16> buffer;  // no allocation: one that failed would leave half of a copy
  while (true) {
    const ssize_t count = readSome(from, buffer.data(), buffer.size());
    if (count < 0 || !writeAll(to, buffer.data(), static_cast<std::size_t>(count))) return false;
    if (static_cast<std::size_t>(count) < buffer.size()) return true;
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

// Only a failed sync can leave the file moved and yet a failure.
bool moveFile(const Place& from, const Place& to) {
  return changeEntries(to, [&] {
    return ::renameat(from.parent.number(), from.leaf.c_str(), to.parent.number(), to.leaf.c_str()) == 0;
  });
}

bool statOpened(const Descriptor& thing, struct stat& status) {
  return thing.isOpen() && ::fstat(thing.number(), &status) == 0;
}

// Gives away the very thing that is open, and only a file that has no second name elsewhere, and brings its new owner
// to stable storage. `made` is the thing where this process made it, not open where it did not.
bool giveAway(const Place& place, const Descriptor& made, const AccountNames::Owner& owner) {
  const Descriptor found = made.isOpen() ? Descriptor{} : openAt(place, O_PATH);
  const Descriptor& thing = made.isOpen() ? made : found;
  struct stat there {};
  struct stat status {};
  if (!statOpened(thing, there) || !statAtName(place, there, status)) return false;
  if (S_ISLNK(status.st_mode)) return failWith(ELOOP);
  if (!S_ISDIR(status.st_mode) && status.st_nlink > 1) return failWith(EMLINK);
  const bool isTheirs = status.st_uid == owner.user && status.st_gid == owner.group;
  if (isTheirs || (!S_ISDIR(status.st_mode) && !S_ISREG(status.st_mode))) {
    return ::fchownat(thing.number(), "", owner.user, owner.group, AT_EMPTY_PATH) == 0;
  }
  Descriptor opened;
  if (!made.isOpen()) {
    opened = openAt(place, O_RDONLY | O_NONBLOCK | O_NOCTTY);
    const bool isSame = statOpened(opened, status) && status.st_dev == there.st_dev && status.st_ino == there.st_ino;
    if (opened.isOpen() && !isSame) return failWith(ESTALE);
  }
  const Descriptor& theirs = made.isOpen() ? made : opened;
  return theirs.isOpen() && ::fchown(theirs.number(), owner.user, owner.group) == 0 && sync(theirs);
}

// The files and directories that were made and may still be given away, kept open: somebody who writes in their
// directory may put something else in their place meanwhile, which would then be given away. Of those that nobody asks
// for, the newest stay open. For any number of threads.
class MadeThings {
 public:
  // Takes the memory to remember a thing, so that remembering it once it is made cannot fail.
  void makeRoomFor(const Path& path) {
    const std::scoped_lock lock{_guard};
    static_cast<void>(takeOut(path));
    if (_things.size() >= kMaxKept) _things.pop_front();
    _things.emplace_back(path, Descriptor{});
  }
  void remember(const Path& path, Descriptor thing) {
    const std::scoped_lock lock{_guard};
    const auto room = std::ranges::find(_things, path, &Thing::first);
    if (room != _things.end()) room->second = std::move(thing);
  }
  // What was made at the path and not asked for yet; not open where nothing was.
  [[nodiscard]] Descriptor take(const Path& path) {
    const std::scoped_lock lock{_guard};
    return takeOut(path);
  }
  void forget(const Path& path) { static_cast<void>(take(path)); }

 private:
  using Thing = std::pair<Path, Descriptor>;
  static constexpr std::size_t kMaxKept = 16;

  Descriptor takeOut(const Path& path) {
    const auto found = std::ranges::find(_things, path, &Thing::first);
    if (found == _things.end()) return {};
    Descriptor thing = std::move(found->second);
    _things.erase(found);
    return thing;
  }

  std::mutex _guard;
  std::deque<Thing> _things;  // the oldest first
};

// Empty, with errno set, where there is no randomness to have.
std::string randomTemporaryName() {
  constexpr std::string_view kLetters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
  std::array<unsigned char, 6> noise{};
  if (::getrandom(noise.data(), noise.size(), 0) != static_cast<ssize_t>(noise.size())) return {};
  std::string name = "file";
  for (const unsigned char byte : noise) name += kLetters[byte % kLetters.size()];
  return name;
}

class LinuxFileSystem final : public FileSystem {
 public:
  explicit LinuxFileSystem(const FileTrees& trees) : _accounts{trees.systemRoot}, _paths{trees} {}

  Result<FileKind> kindOf(const Path& path) override {
    struct stat status {};
    const Descriptor thing = _paths.openPlain(path);
    if (!thing.isOpen() && errno == ENOENT) return failureOf("look at", path);
    if (thing.isOpen() && ::fstat(thing.number(), &status) == 0) return platform::kindOf(status.st_mode);
    Place place = _paths.openParentOfTarget(path);
    if (!place.parent.isOpen() && errno == ELOOP) place = _paths.openParent(path);
    if (!place.parent.isOpen() || !isThere(place, status)) return failureOf("look at", path);
    return platform::kindOf(status.st_mode);
  }

  Result<Bytes> read(const Path& path, std::size_t sizeLimit) override {
    Bytes bytes;
    struct stat opened {};
    const Descriptor file = _paths.openFile(path, opened);
    if (!file.isOpen() || !readUpTo(file.number(), opened, sizeLimit, bytes)) return failureOf("read", path);
    return bytes;
  }

  Status create(const Path& path, std::span<const std::uint8_t> bytes) override {
    _made.makeRoomFor(path);
    return atToChange(path, "create", [&](const Place& place) {
      Descriptor file = makeFileOf(place, bytes);
      const bool isMade = file.isOpen();
      isMade ? _made.remember(path, std::move(file)) : _made.forget(path);
      return isMade;
    });
  }

  Status replace(const Path& path, std::span<const std::uint8_t> bytes) override {
    return atToChange(path, "replace", [bytes](const Place& place) {
      const Place beside{openForSync(place.parent), randomName(), true};
      if (!beside.parent.isOpen() || !makeFileOf(beside, bytes).isOpen()) return false;
      if (moveFile(beside, place)) return true;
      unlinkKeepingCause(beside);
      return false;
    });
  }

  Status copy(const Path& from, const Path& to) override {
    struct stat opened {};
    const Descriptor source = _paths.openFile(from, opened);
    if (!source.isOpen()) return failureOf("copy", from);
    return atToChange(to, "copy to", [&](const Place& place) {
      return makeSyncedFile(place, [&](int file) { return copyBytes(source.number(), file); }).isOpen();
    });
  }

  Status remove(const Path& path) override {
    _made.forget(path);
    const bool isThere = _paths.openPlain(path).isOpen() || errno != ENOENT;
    if (!isThere) return failureOf("remove", path);
    return atToChange(path, "remove",
                      [](const Place& place) { return changeEntries(place, [&place] { return removeTree(place); }); });
  }

  Status createDirectories(const Path& path, unsigned permissions) override {
    std::optional<Descriptor> directory = makeDirectories(_paths, path, permissions);
    if (!directory) return failureOf("create the directory", path);
    if (!directory->isOpen()) return {};
    _made.makeRoomFor(path);
    _made.remember(path, *std::move(directory));
    return {};
  }

  Status setOwner(const Path& path, std::string_view owner, std::string_view group) override {
    const Result<AccountNames::Owner> numbers = _accounts.ownerOf(path, std::string{owner}, std::string{group});
    if (!numbers.isOk()) return numbers.status();
    const Descriptor made = _made.take(path);
    const Place place = _paths.openParent(path);
    const bool isGiven = place.parent.isOpen() && giveAway(place, made, numbers.value());
    Status given = isGiven ? Status{} : failureOf("set the owner of", path);
    // Whoever took it from its place gets it: a file of ours that stayed with him would hold his bytes.
    const auto [user, theirGroup] = numbers.value();
    if (!given.isOk() && made.isOpen()) std::ignore = ::fchown(made.number(), user, theirGroup);
    return given;
  }

  Result<Path> temporaryName() override {
    constexpr int kAttempts = 1000;
    const Result<Path> directory = temporaryDirectory(*this);
    if (!directory.isOk()) return directory;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
      const std::string name = randomTemporaryName();
      if (name.empty()) return failureOf("find a temporary name in", directory.value());
      Path path = directory.value() / name;
      if (_paths.openPlain(path).isOpen() || (errno != ENOENT && isTaken(path))) continue;
      return errno == ENOENT ? Result<Path>{std::move(path)} : failureOf("find a temporary name in", directory.value());
    }
    return Status::failure(EEXIST, "find a temporary name in " + directory.value().string());
  }

  Status rename(const Path& from, const Path& to) override {
    _made.forget(from);
    const Place source = _paths.openParent(from);
    const Place target = source.parent.isOpen() ? _paths.openParentToChange(to) : Place{};
    if (target.parent.isOpen() && moveFile(source, target)) return {};
    const int cause = errno;
    return Status::failure(cause, "rename " + from.string() + " to " + to.string());
  }

 private:
  // Whether something, be it a link, stands at the path; else errno tells why that is not so.
  [[nodiscard]] bool isTaken(const Path& path) const {
    const Place place = _paths.openParent(path);
    struct stat status {};
    return place.parent.isOpen() && isThere(place, status);
  }

  // Runs the action at the path's place; the action answers false, with errno set, where it fails.
  template <typename Action>
  Status atToChange(const Path& path, const char* verb, const Action& action) {
    const Place place = _paths.openParentToChange(path);
    return place.parent.isOpen() && action(place) ? Status{} : failureOf(verb, path);
  }

  AccountNames _accounts;
  PathResolver _paths;
  MadeThings _made;
};

}  // namespace

std::shared_ptr<FileSystem> makeFileSystem(const BaseDirectories& directories) {
  return std::make_shared<LinuxFileSystem>(treesOf(directories));
}

Result<Path> temporaryDirectory(FileSystem& files) {
  for (const char* const candidate : {static_cast<const char*>(::secure_getenv("TMPDIR")), P_tmpdir}) {
    if (candidate == nullptr || files.kindOf(candidate) != FileKind::directory) continue;
    std::string directory{candidate};
    while (directory.size() > 1 && directory.ends_with('/')) directory.pop_back();
    return Path{std::move(directory)};
  }
  return Status::failure(ENOENT, "find a directory for temporary files");
}

}  // namespace platform
