#pragma once

#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <variant>

#include "platform/linux/linux_platform.h"

namespace host {

// What the command line asks for. Every path is absolute.
struct Options {
  platform::LinuxPlatformOptions device;
  std::optional<std::filesystem::path> plugin;  // default: the installed one
  std::optional<std::filesystem::path> trace;
};

// What is to be printed instead of a run, and to whom.
struct Answer {
  std::string text;
  bool isWrongUse = false;  // one line for standard error; else for standard output
};

// Reads the arguments that follow the program's name. Options are written `--name VALUE` or `--name=VALUE`, in full; a
// value that begins with two hyphens only in the second form. Wrong use is: an option that is unknown or given twice, a
// value that is missing or empty, any other argument, and a root that is no directory.
[[nodiscard]] std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments);

}  // namespace host
