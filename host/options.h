#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <variant>
#include <vector>

#include "platform/linux/linux_platform.h"

namespace host {

// What is asked of the snapshots; see docs/SNAPSHOTS.md.
struct SnapshotOptions {
  enum class Listing : std::uint8_t { none, table, json };

  std::optional<std::filesystem::path> directory;  // set where anything is asked of them
  std::size_t keep = 5;                            // how many stay after a run
  bool isIfNeeded = false;                         // a run that has nothing to do is none
  std::optional<std::string> restore;              // the identifier, in place of a run
  bool isUndo = false;                             // back to before the last run, in place of a run
  std::optional<std::string> release;              // the identifier, in place of a run
  std::optional<std::string> explained;            // the identifier of whose run is told, in place of a run
  Listing listing = Listing::none;                 // in place of a run
};

// How a run is explained after it, on standard output; see docs/EXPLAIN.md.
enum class Explain : std::uint8_t { notAsked, text, json, html };

// What the command line asks for. Every path is absolute.
struct Options {
  platform::LinuxPlatformOptions device;
  std::optional<std::filesystem::path> plugin;  // default: the installed one
  std::optional<std::filesystem::path> trace;
  std::optional<std::filesystem::path> metrics;
  Explain explain = Explain::notAsked;
  bool isRehearsal = false;
  bool isServer = false;     // of rehearsals, in place of a run
  bool isStrict = false;     // accounts that are lost have an exit status of their own
  bool isCareful = false;    // a rehearsal goes before the run
  bool refusesLoss = false;  // and there is no run where it speaks against it
  SnapshotOptions snapshots;
  std::vector<std::string> given{};  // the options as they were given, each as --name or --name=VALUE
};

// What is to be printed on standard output instead of a run.
struct Answer {
  std::string text;
};

// Reads the arguments that follow the program's name, as commandline/options.h says. Throws commandline::WrongUse for
// what is said there, for an argument that is no option, for a root that is no directory, and for options that
// contradict each other or lack the one that they need.
[[nodiscard]] std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments);

// The rehearsal, for machines, of the run that these options ask for.
[[nodiscard]] Options rehearsalOf(const Options& run);

// What `--root ROOT --dry-run --explain=json` together with a server's options asks for. Throws commandline::WrongUse
// for a root that is no directory.
[[nodiscard]] Options rehearsalBelow(const std::filesystem::path& root, const Options& server);

}  // namespace host
