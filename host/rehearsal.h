#pragma once

#include <filesystem>

#include "platform/file_keeper.h"
#include "platform/platform.h"

namespace host {

// Makes the platform one on which a run changes nothing of the device: files are read as they are and written to
// memory, signals and the journal hear nothing, the console speaks. A run waits for one that is under way, but leaves
// no lock file where there is none. What modules do by themselves, without the platform's services, is not held back.
void rehearseOn(platform::Platform& platform, const std::filesystem::path& lockDirectory);

// Waits for the locks in the directory that somebody holds, but makes no lock file.
[[nodiscard]] std::shared_ptr<platform::ExclusiveFileLocks> makeRehearsalLocks(
    std::shared_ptr<platform::ExclusiveFileLocks> inner, std::filesystem::path directory);

// Looks at the device through `inner`, and changes nothing but the rehearsed files. What it restored is as it was
// restored.
[[nodiscard]] std::shared_ptr<platform::FileKeeper> makeRehearsalKeeper(std::shared_ptr<platform::FileKeeper> inner,
                                                                        std::shared_ptr<platform::FileSystem> files);

}  // namespace host
