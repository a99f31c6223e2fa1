#pragma once

#include <string_view>

#include "commandline/program.h"

namespace host {

constexpr std::string_view kProgram = "migration-host";

inline void say(std::string_view line) noexcept { commandline::say(kProgram, line); }

}  // namespace host
