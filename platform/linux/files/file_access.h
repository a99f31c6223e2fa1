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
  Descriptor parent;  // good for the *at calls only
  std::string leaf;   // "." for a root directory
};

[[nodiscard]] FileKind kindOf(mode_t mode);

// Whether the name can be made, moved or removed: neither empty nor "." nor "..".
[[nodiscard]] bool isEntryName(const std::string& leaf);

// Opens a regular file for reading, whoever's it is. Whatever else stands there, a link included, is refused (EISDIR,
// ELOOP or EINVAL), unopened where that can be told before, and nothing waits for the other side of a pipe or a device.
[[nodiscard]] Descriptor openRegularFile(const Place& place);

// What stands at the name, where that is the opened thing (ESTALE where it is not). How many names the thing itself
// tells of is no answer: whoever planted one may have removed it again once it was open.
[[nodiscard]] bool statAtName(const Place& place, const Descriptor& thing, struct stat& status);

// The same for a file whose contents are to be used. One with a second name elsewhere is refused (EMLINK) as planting.h
// has it, and so is one that is exchanged time and again.
[[nodiscard]] Descriptor openOwnFile(const Place& place);

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

// Reads a whole file of at most `limit` bytes; errno EFBIG where there are more.
[[nodiscard]] bool readUpTo(int file, std::size_t limit, Bytes& bytes);

// Brings a file, or the entries of a directory, to stable storage. File systems that have nothing to sync are no
// failure.
[[nodiscard]] bool sync(const Descriptor& file);

// The directory opened so that it can be synced; a place's parent cannot.
[[nodiscard]] Descriptor openForSync(const Descriptor& directory);

// Runs a change of the directory's entries, which answers false where it fails, and brings them to stable storage. What
// could not be synced is not changed in the first place; a sync that fails all the same is a failed change.
template <typename Change>
bool changeEntries(const Descriptor& directory, const Change& change) {
  const Descriptor entries = openForSync(directory);
  return entries.isOpen() && change() && sync(entries);
}

}  // namespace platform
