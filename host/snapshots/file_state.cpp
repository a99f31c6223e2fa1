#include "host/snapshots/file_state.h"

#include <sha2.h>
#include <sys/types.h>

#include <array>
#include <cerrno>

#include "host/snapshots/problem.h"
#include "platform/linux/property_lists/libplist_conversion.h"

namespace host::snapshots {
namespace {

using platform::FileAttributes;
using platform::FileKind;

constexpr std::size_t kMaxSizeOfOthers = std::size_t{16} << 20U;
constexpr std::uint32_t kOrdinaryPermissions = 0777;

FileState unkept(std::string why, bool isUnreadable = true) {
  return {
      .contents = kUnkept, .attributes = {}, .bytes = {}, .whyUnkept = std::move(why), .isUnreadable = isUnreadable};
}

// What whoever owns the directory can bring about keeps a file from being kept; what the machine does is a failure.
FileState stateAfter(const platform::Status& failure) {
  switch (failure.errorNumber()) {
    case ENOENT:
    case ENOTDIR: return {.contents = kAbsent, .attributes = {}, .bytes = {}, .whyUnkept = {}};
    case EFBIG:
    case EINVAL:
    case EISDIR:
    case ENXIO: return unkept(failure.description());
    case ELOOP:
    case EMLINK: return unkept(failure.description(), false);
    default: fail(failure.description());
  }
}

}  // namespace

std::span<const std::uint8_t> bytesOf(std::string_view text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

std::string textIn(const platform::Bytes& bytes) { return {bytes.begin(), bytes.end()}; }

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

FileState stateAt(const Storage& storage, const Path& path, Part part) {
  platform::FileCopy file;
  if (part == Part::marker) {
    const platform::Result<FileAttributes> found = storage.keeper->attributesOf(path);
    if (!found.isOk()) return stateAfter(found.status());
    file.attributes = found.value();
    file.attributes.size = 0;
  } else {
    platform::Result<platform::FileCopy> read = holdsAccounts(part)
                                                    ? storage.keeper->readTarget(path, platform::kMaxPropertyListSize)
                                                    : storage.keeper->read(path, kMaxSizeOfOthers);
    if (!read.isOk()) return stateAfter(read.status());
    file = read.take();
  }
  if (file.attributes.kind != FileKind::file) return unkept(path.string() + " is no regular file");
  file.attributes.permissions &= kOrdinaryPermissions;
  return {.contents = part == Part::marker ? kPresent : checksum(file.bytes),
          .attributes = file.attributes,
          .bytes = std::move(file.bytes),
          .whyUnkept = {}};
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
