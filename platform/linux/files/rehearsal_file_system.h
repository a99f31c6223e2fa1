#pragma once

#include <memory>

#include "platform/base_directories.h"
#include "platform/export.h"
#include "platform/file_system.h"

namespace platform {

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

}  // namespace platform
