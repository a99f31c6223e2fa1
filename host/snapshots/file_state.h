#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/data_class_migrator.h"
#include "platform/file_keeper.h"

namespace host::snapshots {

using platform::Path;
using Part = platform::MigrationFile::Part;

// Through which the device's files and the snapshots are read and written.
struct Storage {
  std::shared_ptr<platform::FileSystem> files;
  std::shared_ptr<platform::FileKeeper> keeper;
};

// The same bytes as text and the other way round; neither looks at what they mean.
[[nodiscard]] std::span<const std::uint8_t> bytesOf(std::string_view text);
[[nodiscard]] std::string textIn(const platform::Bytes& bytes);

// The SHA-256 checksum, as 64 hexadecimal digits in lower case.
[[nodiscard]] std::string checksum(std::span<const std::uint8_t> bytes);
[[nodiscard]] inline std::string checksum(std::string_view text) { return checksum(bytesOf(text)); }

// What may stand at a path, by its contents: the checksum of a file, or one of these.
inline constexpr const char* kAbsent = "absent";
inline constexpr const char* kPresent = "present";  // a marker, whose bytes mean nothing
inline constexpr const char* kUnkept = "not kept";  // of which no copy is made: see stateAt

// What stands at a path now.
struct FileState {
  std::string contents;
  platform::FileAttributes attributes;  // where there is a file; at most the permissions 0777
  platform::Bytes bytes;                // of a file that is no marker
  std::string whyUnkept;                // one line
  bool isUnreadable = false;            // is not kept since nobody, no run either, can read it as a property list
};

// Attributes and bytes are of one and the same file; where a link stands at the path of settings or of a legacy file,
// of the one that a run would read. No copy is kept of what is no regular file, has a second name that somebody may
// have planted, or is larger than what can be read back. Throws a Problem where it cannot be told.
[[nodiscard]] FileState stateAt(const Storage& storage, const Path& path, Part part);

// One of the files that a snapshot is about, as it stood when the snapshot was taken.
struct KeptFile {
  Path path;
  Part part = Part::other;
  std::string contents = kAbsent;
  platform::FileAttributes attributes;  // where there was a file
  std::string copy;                     // the name of its copy in the snapshot's directory, where there is one

  // Whether the snapshot can bring a file back.
  [[nodiscard]] bool isPresent() const { return contents != kAbsent && contents != kUnkept; }
  [[nodiscard]] bool hasCopy() const { return isPresent() && contents != kPresent; }
  // Whether the path holds exactly this: the same bytes, owner, group, permissions and time of last change.
  [[nodiscard]] bool isExactly(const FileState& present) const;
  // Whether it holds this but for the time of the last change.
  [[nodiscard]] bool isMuchLike(const FileState& present) const;
};

// Whether accounts are lost with what stands there, so that no run begins without a copy of it.
[[nodiscard]] constexpr bool holdsAccounts(Part part) { return part == Part::settings || part == Part::legacy; }

}  // namespace host::snapshots
