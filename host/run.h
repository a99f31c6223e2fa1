#pragma once

#include <cstdint>

#include "host/options.h"

namespace host {

enum class ExitStatus : std::uint8_t {
  migrated = 0,
  notMigrated = 1,
  wrongUse = 2,
  noPlugin = 3,
  noSnapshot = 5,
  notSaved = 6,
  accountsLost = 7,  // told so where the command line is strict
  refused = 8,
  untold = 9  // migrated, but what is asked to be told of it could not be written
};

// What the command line asks for: a run (makes the platform, loads the plug-in, calls it once and reports), or
// something to be done with the snapshots in its place. Throws commandline::Ending where it ends before the plug-in is
// called.
[[nodiscard]] ExitStatus run(const Options& options);

}  // namespace host
