#pragma once

#include <memory>
#include <string>

#include "platform/data_class_migrator.h"
#include "platform/file_keeper.h"

namespace host::snapshots {

using platform::Path;

// Through which the device's files and the snapshots are read and written.
struct Storage {
  std::shared_ptr<platform::FileSystem> files;
  std::shared_ptr<platform::FileKeeper> keeper;
};

// What may stand at a path, by its contents: the checksum of a file, or one of these.
inline constexpr const char* kAbsent = "absent";
inline constexpr const char* kNoFile = "no file";  // a directory, a link, a pipe, ...

// What stands at a path now.
struct Look {
  std::string contents;
  platform::FileAttributes attributes;  // of a file
  platform::Bytes bytes;                // of a file
};

// Throws a Problem where that cannot be told.
[[nodiscard]] Look lookAt(const Storage& storage, const Path& path);

// One of the files that a snapshot is about, as it stood when the snapshot was taken.
struct KeptFile {
  Path path;
  platform::MigrationFile::Part part = platform::MigrationFile::Part::other;
  std::string contents = kAbsent;
  platform::FileAttributes attributes;  // where there was a file
  std::string copy;                     // the name of its copy in the snapshot's directory, where there was a file

  [[nodiscard]] bool isPresent() const { return contents != kAbsent; }
  // Whether the path holds exactly this: the same bytes, owner, group, permissions and time of last change.
  [[nodiscard]] bool isExactly(const Look& present) const;
};

}  // namespace host::snapshots
