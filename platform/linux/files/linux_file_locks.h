#pragma once

#include <filesystem>
#include <memory>

#include "platform/exclusive_file_lock.h"
#include "platform/export.h"

namespace platform {

// Locks on the files DIRECTORY/NAME. A missing file is made, readable by everybody, since waiting takes no more than
// reading; it stays when the lock is given back. The directory may be sticky and writable by everybody, and the file
// anybody's: it is opened, never followed where it is a link, and refused where it is no regular file.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<ExclusiveFileLocks> makeFileLocks(std::filesystem::path directory);

}  // namespace platform
