#pragma once

#include <string>

#include "host/snapshots/file_state.h"

namespace host::snapshots {

// The snapshots in a directory, oldest first, for people: a table with what each was taken before, followed by why
// snapshots are kept and which copies are damaged; or a line that says that there are none. No lock is taken. Throws a
// Problem where the directory cannot be read.
[[nodiscard]] std::string listingForPeople(const Storage& storage, const Path& directory);

// The same for programs: a JSON object with the number of its "schema" and the "snapshots", an array of manifests, each
// with "state" added ("running", "finished", "unfinished" or "damaged") and "damage", the paths whose copies are
// damaged; of one with a damaged manifest only these and its "id".
[[nodiscard]] std::string listingAsJson(const Storage& storage, const Path& directory);

}  // namespace host::snapshots
