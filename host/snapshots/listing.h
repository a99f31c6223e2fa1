#pragma once

#include <string>

#include "host/snapshots/kept_file.h"

namespace host::snapshots {

// The snapshots in a directory, oldest first, for people: a table, or a line that says that there are none. No lock is
// taken. Throws a Problem where the directory cannot be read.
[[nodiscard]] std::string listingForPeople(const Storage& storage, const Path& directory);

// The same for programs: a JSON array of manifests, each with "state" added: "running", "finished" or "unfinished"; of
// a damaged one only its "id" and the state "damaged".
[[nodiscard]] std::string listingAsJson(const Storage& storage, const Path& directory);

}  // namespace host::snapshots
