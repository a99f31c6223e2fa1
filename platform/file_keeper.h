#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "platform/file_system.h"

namespace platform {

// What a file is besides its bytes.
struct FileAttributes {
  FileKind kind = FileKind::file;  // other: also a link
  std::uint64_t size = 0;
  std::uint32_t owner = 0;  // as numbers, which stay true when accounts are renamed
  std::uint32_t group = 0;
  std::uint32_t permissions = 0;         // all twelve bits
  std::int64_t modifiedSeconds = 0;      // since the epoch
  std::int64_t modifiedNanoseconds = 0;  // within the second

  bool operator==(const FileAttributes&) const = default;
};

// What stands at a path: its attributes, and of a regular file the bytes.
struct FileCopy {
  FileAttributes attributes;
  Bytes bytes;
};

// What keeping copies of files, and bringing them back exactly, needs beyond the calls of the file system. Paths are
// absolute, no link at a path itself is followed but by `readTarget`, and a failed call names its cause.
class FileKeeper {
 public:
  virtual ~FileKeeper() = default;

  // The attributes of what stands at the path; ENOENT where nothing does.
  virtual Result<FileAttributes> attributesOf(const Path& path) = 0;

  // What stands at the path, opened once, so that attributes and bytes are of one and the same file. A file that is
  // larger than `sizeLimit` bytes (EFBIG), or that has a second name and may be somebody else's (EMLINK), is refused.
  // Nothing waits for the other side of a pipe.
  virtual Result<FileCopy> read(const Path& path, std::size_t sizeLimit) = 0;

  // The names in a directory, in order.
  virtual Result<std::vector<std::string>> entriesOf(const Path& directory) = 0;

  // Adds to the end of a regular file and brings that to stable storage. On failure the file is as long as it was; a
  // process that dies meanwhile may leave a part of the bytes.
  virtual Status append(const Path& path, std::span<const std::uint8_t> bytes) = 0;

  // Puts a file in the place of whatever file stands at the path, or makes one, with the owner, group, permissions (of
  // which only those of 0777 are given) and time of the last change that are given: a reader sees the old file or the
  // new one, whole. Bytes and directory entry are on stable storage when it succeeds. A process that dies meanwhile may
  // leave `.restoring-NAME` beside the path, which the next such call removes.
  virtual Status restore(const Path& path, std::span<const std::uint8_t> bytes, const FileAttributes& attributes) = 0;

  // Sees to it, on stable storage, that no file stands at the path. A directory there is an error.
  virtual Status removeFile(const Path& path) = 0;

  // Reads as above what a link at the path leads to: the regular file that a run would read there, with the attributes
  // that it has where it stands. What is none is refused (EISDIR, EINVAL), as is what may be planted (ELOOP, EMLINK).
  virtual Result<FileCopy> readTarget(const Path& path, std::size_t sizeLimit) = 0;
};

}  // namespace platform
