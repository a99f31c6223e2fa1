#pragma once

#include <span>
#include <string>
#include <vector>

#include "platform/linux/linux_platform.h"

namespace tools {

// What the command line asks for. Every path is absolute.
struct Options {
  platform::LinuxPlatformOptions device;
  bool opensModulesOfOtherRoots = false;
  bool printsJson = false;
  bool printsHelp = false;
  bool printsVersion = false;
  std::string command;                 // empty where none is given
  std::vector<std::string> arguments;  // the command's

  // Whether the device's modules may be opened, and so whether anybody can be told of changes. The modules of an image
  // that is merely mounted somewhere are foreign code; they are opened only where that is asked for.
  [[nodiscard]] bool opensModules() const;
};

// Reads the arguments that follow the program's name. Options stand before or after the command, written `--name VALUE`
// or `--name=VALUE`, in full; `--` ends them. Throws Failure (wrong use) for an option that is unknown or given twice,
// a value that is missing or empty, a root
// that is no directory, and a word that is not UTF-8.
[[nodiscard]] Options parseArguments(std::span<const char* const> arguments);

}  // namespace tools
