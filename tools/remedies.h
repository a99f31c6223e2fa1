#pragma once

#include <string>

#include "tools/findings.h"
#include "tools/options.h"

namespace tools {

// What the user should do about a finding, and the command for the shell that does it, for the device that the options
// mean. The command is empty where nothing need be done.
struct Remedy {
  std::string advice;
  std::string command;
};

[[nodiscard]] Remedy remedyFor(const Finding& finding, const platform::Path& file, const Options& options);

}  // namespace tools
