#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <span>
#include <string>
#include <string_view>

#include "platform/property_value.h"
#include "platform/status.h"

namespace platform {

using Path = std::filesystem::path;

enum class FileKind : std::uint8_t { file, directory, other };

// The device's files. Paths are absolute. Every call works relative to the opened parent directory of its path and
// never follows a link at the path itself, except where a call says so; links above it, and those, are followed only
// where nobody can have planted them. A failed call names its cause and leaves nothing half made that it made itself.
//
// A call that makes, replaces, moves, removes or gives away something brings its bytes, entry and owner to stable
// storage; where that fails, the call failed. What was moved or removed by then stays so: only then may the new state
// be there after a failed call.
class FileSystem {
 public:
  virtual ~FileSystem() = default;

  // What stands at the path, links followed; ENOENT or ENOTDIR where nothing does, another error where it cannot be
  // told. A link that is not to be followed is itself what stands there. Nothing is opened.
  virtual Result<FileKind> kindOf(const Path& path) = 0;

  // The whole contents of a regular file, links followed. Anything that is no regular file, or that is larger than
  // `sizeLimit` bytes, or that has a second name and may be somebody else's (EMLINK), is refused without being read,
  // and nothing blocks.
  virtual Result<Bytes> read(const Path& path, std::size_t sizeLimit) = 0;

  // Makes a file at a path where nothing stands, mode 0600, and writes the bytes. On failure no file remains.
  virtual Status create(const Path& path, std::span<const std::uint8_t> bytes) = 0;

  // Replaces whatever file stands at the path, or makes one, mode 0600: a reader sees the old file or the new one,
  // whole.
  virtual Status replace(const Path& path, std::span<const std::uint8_t> bytes) = 0;

  // Copies a regular file that `read` would read, byte for byte, to a path where nothing stands, mode 0600.
  virtual Status copy(const Path& from, const Path& to) = 0;

  // Removes what stands at the path, a directory with all below it, never following a link. A path at which nothing
  // stands is an error (ENOENT).
  virtual Status remove(const Path& path) = 0;

  // Makes a directory and those above it that are missing. The last one has exactly the given permission bits, whatever
  // the process's umask, those above it mode 0755. A directory that is there already is success and stays as it is.
  virtual Status createDirectories(const Path& path, unsigned permissions) = 0;

  // Sets the owner and the group of the file or directory at the path, by account name, as the device's own passwd and
  // group files have them. An unknown name is an error (ENOENT), and so is a file with a second name elsewhere
  // (EMLINK), which would be given away with it, and what stands in the place of what was made there (ESTALE).
  virtual Status setOwner(const Path& path, std::string_view owner, std::string_view group) = 0;

  // A name for a temporary file in the process's default temporary directory, at which nothing stands. The
  // name is a proposal: only `create` makes sure that nobody else takes it.
  virtual Result<Path> temporaryName() = 0;

  // Moves a file onto a path in one step, replacing what is there.
  virtual Status rename(const Path& from, const Path& to) = 0;
};

}  // namespace platform
