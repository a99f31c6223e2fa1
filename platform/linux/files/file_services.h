#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>

#include "platform/base_directories.h"
#include "platform/exclusive_file_lock.h"
#include "platform/export.h"
#include "platform/file_keeper.h"
#include "platform/file_system.h"
#include "platform/linux/files/descriptor.h"
#include "platform/linux/files/path_resolution.h"
#include "platform/status.h"

namespace platform {

// The files of the device that has these directories, and others; account names are those of that device.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileSystem> makeFileSystem(const BaseDirectories& directories);

// The process's temporary directory, chosen as the C library does: that of TMPDIR, without the slashes behind it, else
// /tmp; ENOENT where neither is a directory. A program with more rights than its user has does not follow the
// environment.
[[nodiscard]] ACCOUNT_EXPORT Result<Path> temporaryDirectory(FileSystem& files);

// The files of a rehearsal.
class RehearsedFiles : public FileSystem {
 public:
  // The permission bits that what stands at the path would have, links unfollowed; nothing where nothing would stand.
  [[nodiscard]] virtual std::optional<unsigned> permissionsAt(const Path& path) = 0;
};

// The device's files as a run would leave them, while they stay as they are: reads see the device, every change lands
// in memory and is what later calls see. Calls answer as on the device itself, failures and their descriptions
// included, as far as that can be told without trying: links, missing and occupied places, permissions, volumes,
// unknown owners, files with a second name, files larger than the free space or the process's limit. What only a try
// shows (failing media, a volume that fills up meanwhile, files marked immutable) is taken to succeed. Moving a
// directory is refused (ENOTSUP). Temporary names lie where those of the process would.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<RehearsedFiles> makeRehearsalFileSystem(
    const BaseDirectories& directories);

// For the files of the device that has these directories, and others.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileKeeper> makeFileKeeper(const BaseDirectories& directories);

struct FileLockOptions {
  std::filesystem::path directory;  // made where it is missing, mode 1777
  FileTrees trees = {};             // of the device whose lock it is; its user mobile is one whose files are trusted
  LockManner manner = {};
  std::function<void(std::string_view line)> say = [](std::string_view) {};  // for people
};

// Locks on the files DIRECTORY/NAME. A missing file is made, readable by everybody, since waiting takes no more than
// reading; it stays when the lock is given back. The directory may be sticky and writable by everybody: no link there
// is followed, nothing waits for the other side of a pipe, and a lock counts only while its file still stands at the
// name. Root replaces what somebody else may have put there, and says so: everything but a regular file of root's or
// mobile's with this one name. Who is not root takes any regular file, and fails with ELOOP, EISDIR or EINVAL on
// anything else. Who waits says after one second, once, for which process.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<ExclusiveFileLocks> makeFileLocks(FileLockOptions options);

// Opens a file that a run appends to, such as a trace, making it where there is none; mode 0600 whatever the umask and
// whatever it was. What stands there already is used where it is
// - a regular file of root's or the process's user without a second name; or
// - a pipe or a character device of theirs in a directory in which nobody else can write. A pipe needs a reader
//   (ENXIO): opening waits for nobody.
// Everything else is refused, a link too: what the run tells would go to somebody else.
ACCOUNT_EXPORT Result<Descriptor> openToAppend(const std::filesystem::path& path);

// The absolute directory, without links, in which this library stands. What was installed with it is found from there.
[[nodiscard]] std::filesystem::path ownDirectory();

}  // namespace platform
