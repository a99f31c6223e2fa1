#pragma once

#include <sys/stat.h>

#include <cerrno>
#include <string>
#include <string_view>

#include "platform/file_system.h"
#include "platform/linux/files/descriptor.h"

namespace platform {

// The steps that the calls of the file system are made of. All set errno and answer false, or a descriptor that is not
// open, where they fail.

// Why a step fails, where no call of the system has set errno. Answers false.
inline bool failWith(int errorNumber) {
  errno = errorNumber;
  return false;
}

// The failure of a call on the path whose last step has just failed: its cause is errno.
[[nodiscard]] Status failureOf(std::string_view attempt, const Path& path);

// A path taken apart: its opened parent directory and the name below it.
struct Place {
  Descriptor parent;     // good for the *at calls only
  std::string leaf;      // "." for a root directory
  bool canSync = false;  // whether the parent is opened for reading, and so for syncing, too
};

[[nodiscard]] FileKind kindOf(mode_t mode);

// Whether the name can be made, moved or removed: neither empty nor "." nor "..".
[[nodiscard]] bool isEntryName(const std::string& leaf);

// Opens a regular file for reading, whoever's it is. Whatever else stands there, a link included, is refused (EISDIR,
// ELOOP or EINVAL), unopened where that can be told before, and nothing waits for the other side of a pipe or a device.
// `opened` is what the opened file tells of itself.
[[nodiscard]] Descriptor openRegularFile(const Place& place, struct stat& opened);

// What stands at the name, where that is the thing that told `opened` of itself (ESTALE where it is not). How many
// names the thing itself tells of is no answer: whoever planted one may have removed it again once it was open.
[[nodiscard]] bool statAtName(const Place& place, const struct stat& opened, struct stat& status);

// The same as openRegularFile for a file whose contents are to be used. One with a second name elsewhere is refused
// (EMLINK) as planting.h has it, and so is one that is exchanged time and again.
[[nodiscard]] Descriptor openOwnFile(const Place& place, struct stat& opened);

// Makes a new file, mode 0600 whatever the umask, open for writing.
[[nodiscard]] Descriptor makeFile(const Place& place);

// Calls again what a signal interrupted, a good many times; a call that is interrupted for ever fails with EINTR.
template <typename Call>
auto retried(const Call& call) {
  constexpr int kAttempts = 100;
  auto answer = call();
  for (int attempt = 1; answer < 0 && errno == EINTR && attempt < kAttempts; ++attempt) answer = call();
  return answer;
}

[[nodiscard]] bool writeAll(int descriptor, const void* bytes, std::size_t size);
// Fills the buffer as far as the file goes. Answers the number of bytes, -1 on failure.
[[nodiscard]] ssize_t readSome(int descriptor, void* buffer, std::size_t size);

// Reads a whole file, which told `opened` of itself, of at most `limit` bytes; errno EFBIG where there are more.
[[nodiscard]] bool readUpTo(int file, const struct stat& opened, std::size_t limit, Bytes& bytes);

// Brings a file, or the entries of a directory, to stable storage. File systems that have nothing to sync are no
// failure.
[[nodiscard]] bool sync(const Descriptor& file);

// The directory opened so that it can be synced.
[[nodiscard]] Descriptor openForSync(const Descriptor& directory);

// Runs a change of the entries of the place's parent, which answers false where it fails, and brings them to stable
// storage. What could not be synced is not changed in the first place; a sync that fails all the same is a failed
// change.
template <typename Change>
bool changeEntries(const Place& place, const Change& change) {
  const Descriptor opened = place.canSync ? Descriptor{} : openForSync(place.parent);
  const Descriptor& entries = place.canSync ? place.parent : opened;
  return entries.isOpen() && change() && sync(entries);
}

}  // namespace platform
