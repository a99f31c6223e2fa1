#include "platform/linux/files/file_making.h"

#include <fcntl.h>
#include <sys/random.h>

#include <array>
#include <cerrno>
#include <cstdio>

namespace platform {
namespace {

void unlinkKeepingCause(const Place& place) {
  const int cause = errno;
  ::unlinkat(place.parent.number(), place.leaf.c_str(), 0);
  errno = cause;
}

// Makes a file whose contents the writer writes to its descriptor; nothing remains where that fails.
template <typename Writer>
Descriptor makeSyncedFile(const Place& place, const Writer& write) {
  Descriptor file;
  const auto makeAndWrite = [&] {
    file = makeFile(place);
    return file.isOpen() && write(file.number()) && sync(file);
  };
  if (changeEntries(place.parent, makeAndWrite)) return file;
  if (file.isOpen()) unlinkKeepingCause(place);
  return {};
}

bool copyBytes(int from, int to) {
  std::array<char, std::size_t{1} << 16> buffer;  // no allocation: one that failed would leave half of a copy
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

}  // namespace

Descriptor makeFileOf(const Place& place, std::span<const std::uint8_t> bytes) {
  return makeSyncedFile(place, [bytes](int file) { return writeAll(file, bytes.data(), bytes.size()); });
}

Descriptor makeCopyOf(const Place& place, const Descriptor& source) {
  return makeSyncedFile(place, [&source](int file) { return copyBytes(source.number(), file); });
}

bool moveFile(const Place& from, const Place& to) {
  return changeEntries(to.parent, [&] {
    return ::renameat(from.parent.number(), from.leaf.c_str(), to.parent.number(), to.leaf.c_str()) == 0;
  });
}

bool replaceFile(const Place& place, std::span<const std::uint8_t> bytes) {
  const Place beside{Descriptor{::openat(place.parent.number(), ".", O_PATH | O_DIRECTORY | O_CLOEXEC)}, randomName()};
  if (!beside.parent.isOpen() || !makeFileOf(beside, bytes).isOpen()) return false;
  if (moveFile(beside, place)) return true;
  unlinkKeepingCause(beside);
  return false;
}

}  // namespace platform
