#pragma once

#include <filesystem>

#include "platform/platform.h"

namespace host {

// Makes the platform one on which a run changes nothing of the device: files are read as they are and written to
// memory, signals and the journal hear nothing, the console speaks. A run waits for one that is under way, but leaves
// no lock file where there is none. What modules do by themselves, without the platform's services, is not held back.
void rehearseOn(platform::Platform& platform, const std::filesystem::path& lockDirectory);

}  // namespace host
