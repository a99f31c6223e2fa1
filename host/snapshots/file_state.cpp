#include "host/snapshots/file_state.h"

#include <sha2.h>
#include <sys/types.h>

#include <array>
#include <cerrno>

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using platform::FileAttributes;
using platform::FileKind;

constexpr std::size_t kMaxSizeWithAccounts = std::size_t{256} << 20U;  // no larger property list can be read
constexpr std::size_t kMaxSizeOfOthers = std::size_t{16} << 20U;
constexpr std::uint32_t kOrdinaryPermissions = 0777;

// Failures that whoever owns the directory can bring about, unlike those of the machine.
bool isOfSomebodysMaking(const platform::Status& status) {
  switch (status.errorNumber()) {
    case EFBIG:
    case EINVAL:
    case EISDIR:
    case ELOOP:
    case EMLINK:
    case ENXIO: return true;
    default: return false;
  }
}

FileState unkept(std::string why) {
  return {.contents = kUnkept, .attributes = {}, .bytes = {}, .whyUnkept = std::move(why)};
}

FileState unkeptOrFailed(const platform::Status& status) {
  if (status.errorNumber() == ENOENT || status.errorNumber() == ENOTDIR) {
    return {.contents = kAbsent, .attributes = {}, .bytes = {}, .whyUnkept = {}};
  }
  if (!isOfSomebodysMaking(status)) require(status);
  return unkept(status.description());
}

FileAttributes ordinary(FileAttributes attributes) {
  attributes.permissions &= kOrdinaryPermissions;
  return attributes;
}

FileState markerAt(const Storage& storage, const Path& path) {
  const platform::Result<FileAttributes> found = storage.keeper->attributesOf(path);
  if (!found.isOk()) return unkeptOrFailed(found.status());
  if (found.value().kind != FileKind::file) return unkept(path.string() + " is no regular file");
  FileState state{.contents = kPresent, .attributes = ordinary(found.value()), .bytes = {}, .whyUnkept = {}};
  state.attributes.size = 0;
  return state;
}

}  // namespace

std::string checksum(std::span<const std::uint8_t> bytes) {
  SHA2_CTX state;
  SHA256Init(&state);
  SHA256Update(&state, bytes.data(), bytes.size());
  std::array<std::uint8_t, SHA256_DIGEST_LENGTH> digest{};
  SHA256Final(digest.data(), &state);
  std::string digits;
  for (const std::uint8_t byte : digest) {
    digits += "0123456789abcdef"[byte >> 4U];
    digits += "0123456789abcdef"[byte & 15U];
  }
  return digits;
}

std::string checksum(std::string_view text) {
  return checksum(std::span{reinterpret_cast<const std::uint8_t*>(text.data()), text.size()});
}

FileState stateAt(const Storage& storage, const Path& path, Part part) {
  if (part == Part::marker) return markerAt(storage, path);
  const std::size_t limit = holdsAccounts(part) ? kMaxSizeWithAccounts : kMaxSizeOfOthers;
  platform::Result<platform::FileCopy> read = storage.keeper->read(path, limit);
  if (!read.isOk()) return unkeptOrFailed(read.status());
  platform::FileCopy file = read.take();
  if (file.attributes.kind != FileKind::file) return unkept(path.string() + " is no regular file");
  FileState state{
      .contents = checksum(file.bytes), .attributes = ordinary(file.attributes), .bytes = {}, .whyUnkept = {}};
  state.bytes = std::move(file.bytes);
  return state;
}

bool KeptFile::isExactly(const FileState& present) const {
  return contents == present.contents && (!isPresent() || attributes == present.attributes);
}

bool KeptFile::isMuchLike(const FileState& present) const {
  FileAttributes same = present.attributes;
  same.modifiedSeconds = attributes.modifiedSeconds;
  same.modifiedNanoseconds = attributes.modifiedNanoseconds;
  return contents == present.contents && (!isPresent() || attributes == same);
}

}  // namespace host::snapshots
