#pragma once

#include <cstdint>
#include <string>

#include "host/snapshots/file_state.h"

namespace host::snapshots {

enum class Missing : std::uint8_t { isMade, isRefused, isAccepted };

// Makes sure that the directory is there, that nobody but root and the caller can write it or put another in its place,
// and that it holds snapshots or nothing: one that is not empty is known by the file that says so, or, where an earlier
// release made it, by all of its names. Answers whether it is there. Throws a Problem where it is not so.
[[nodiscard]] bool requireOwnDirectory(const Storage& storage, const Path& directory, Missing missing);

// Says in the directory that it is one of snapshots, where nothing says so yet. Throws a Problem where it cannot.
void markAsOwn(const Storage& storage, const Path& directory);

// Whether the name is that of a snapshot: a number of six digits or more, and the time in UTC.
[[nodiscard]] bool isIdentifier(const std::string& name);

// Whether the name is one that is given to what is being made or being removed in the directory.
[[nodiscard]] bool isPassing(const std::string& name);

inline constexpr const char* kBeingMade = ".new";
inline constexpr const char* kBeingRemoved = ".old";

}  // namespace host::snapshots
