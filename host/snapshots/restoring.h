#pragma once

#include <map>
#include <set>
#include <vector>

#include "host/snapshots/snapshot_store.h"

namespace host::snapshots {

// By path, the contents that may be replaced; what else stands there is somebody's work.
using KnownContents = std::map<Path, std::set<std::string>>;

// Brings every file of the snapshot back to the state in which it was kept, provided that its present contents are
// known; what was not kept stays as it is. Answers the paths at which others stand, which stay. All copies are read and
// verified before the first file is touched; each file is replaced in one step, and one that is as it should be is not
// touched, so the whole can be done again wherever it stopped. Throws a Problem where it stops.
[[nodiscard]] std::vector<Path> restoreFiles(const Storage& storage, const SnapshotStore& store,
                                             const Manifest& manifest, const KnownContents& known);

}  // namespace host::snapshots
