#pragma once

#include <string>

#include "platform/status.h"

namespace host {

// Takes the migration lock for the plug-in, so that a run that cannot have it is refused before anything is touched:
// waits as the platform's locks do, and sets a platform whose locks hand this one over to whoever asks for it first.
// From then on it is that one's. A plug-in that names no lock needs none.
[[nodiscard]] platform::Status holdMigrationLock(const std::string& name);

}  // namespace host
