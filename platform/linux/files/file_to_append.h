#pragma once

#include <filesystem>

#include "platform/export.h"
#include "platform/linux/files/descriptor.h"
#include "platform/status.h"

namespace platform {

// Opens a file that a run appends to, such as a trace, making it where there is none; mode 0600 whatever the umask and
// whatever it was. What stands there already is used where it is
// - a regular file of root's or the process's user without a second name; or
// - a pipe or a character device of theirs in a directory in which nobody else can write. A pipe needs a reader
// (ENXIO):
//   opening waits for nobody.
// Everything else is refused, a link too: what the run tells would go to somebody else.
ACCOUNT_EXPORT Result<Descriptor> openToAppend(const std::filesystem::path& path);

}  // namespace platform
