#pragma once

#include <filesystem>

namespace platform {

// Makes the directory and those above it that are missing; the directory itself gets exactly the permission bits if it
// is made here, those above it mode 0755; their entries are on stable storage when it succeeds. A directory that is
// there already is left as it is. Answers false, with errno set, where it fails; what was made until then is removed
// again.
[[nodiscard]] bool makeDirectories(const std::filesystem::path& path, unsigned permissions);

}  // namespace platform
