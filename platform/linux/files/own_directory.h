#pragma once

#include <filesystem>

namespace platform {

// The absolute directory, without links, in which this library stands. What was installed with it is found from there.
[[nodiscard]] std::filesystem::path ownDirectory();

}  // namespace platform
