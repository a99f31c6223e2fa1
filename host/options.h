#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <variant>

#include "platform/linux/linux_platform.h"

namespace host {

// What is asked of the snapshots; see docs/SNAPSHOTS.md.
struct SnapshotOptions {
  enum class Listing : std::uint8_t { none, table, json };

  std::optional<std::filesystem::path> directory;  // set where anything is asked of them
  std::size_t keep = 5;                            // how many stay after a run
  std::optional<std::string> restore;              // the identifier, in place of a run
  Listing listing = Listing::none;                 // in place of a run
};

// How a run is explained after it, on standard output; see docs/EXPLAIN.md.
enum class Explain : std::uint8_t { notAsked, text, json };

// What the command line asks for. Every path is absolute.
struct Options {
  platform::LinuxPlatformOptions device;
  std::optional<std::filesystem::path> plugin;  // default: the installed one
  std::optional<std::filesystem::path> trace;
  Explain explain = Explain::notAsked;
  bool isRehearsal = false;
  SnapshotOptions snapshots;
};

// What is to be printed instead of a run, and to whom.
struct Answer {
  std::string text;
  bool isWrongUse = false;  // one line for standard error; else for standard output
};

// Reads the arguments that follow the program's name. Options are written `--name VALUE` or `--name=VALUE`, in full; a
// value that begins with two hyphens only in the second form. Wrong use is: an option that is unknown or given twice, a
// value that is missing or empty, any other argument, a root that is no directory, and options that contradict each
// other or lack the one that they need.
[[nodiscard]] std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments);

}  // namespace host
