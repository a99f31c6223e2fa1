#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <string_view>

#include "platform/exclusive_file_lock.h"
#include "platform/export.h"
#include "platform/linux/files/path_resolution.h"
#include "platform/lock_manner.h"

namespace platform {

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

}  // namespace platform
