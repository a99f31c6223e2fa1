#pragma once

#include <cstdint>

#include "host/snapshots/kept_file.h"

namespace host::snapshots {

enum class Missing : std::uint8_t { isMade, isRefused };

// Makes sure that the directory is there and that nobody but root and the caller can write it or put another in its
// place. Throws a Problem where it is not so.
void requireOwnDirectory(const Storage& storage, const Path& directory, Missing missing);

}  // namespace host::snapshots
