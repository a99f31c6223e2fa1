#pragma once

#include <cstdint>

#include "host/options.h"

namespace host {

enum class ExitStatus : std::uint8_t { migrated = 0, notMigrated = 1, wrongUse = 2, noPlugin = 3 };

// One run, as the command line asks for it: makes the platform, loads the plug-in, calls it once and reports.
[[nodiscard]] ExitStatus run(const Options& options);

}  // namespace host
