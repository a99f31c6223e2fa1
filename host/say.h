#pragma once

#include <string>

namespace host {

// Says one line of the program's own on standard error, "migration-host: " in front of it. Out of memory even for that,
// it says so.
void say(const std::string& line) noexcept;

}  // namespace host
