#pragma once

#include <chrono>

#include "host/snapshots/file_state.h"

namespace host {

// Removes what programs that were killed while they saved left in the device's own temporary directory,
// ROOT/var/mobile/tmp, and nothing else: regular files that are named, begin and are protected as those of a save, that
// belong to this process's user or the directory's, and that were last changed before `start`, the time at which this
// process began. Where another directory is the process's, nothing is removed: others put theirs there. Each one is
// told of by a line and a fact, and by a line why it stays where it cannot be removed. All that is read of such files
// is 64 MiB; those that are larger than what is left of it stay without a word. To be called under the migration lock.
void sweepTemporaryFiles(const snapshots::Storage& storage, std::chrono::system_clock::time_point start);

}  // namespace host
