#pragma once

#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "commandline/ending.h"
#include "commandline/options.h"
#include "commandline/terminal.h"
#include "platform/linux/linux_platform.h"

namespace tools {

// The program's exit statuses are a contract: scripts tell by them what became of what they asked.
enum class ExitStatus : int {
  done = 0,
  failed = 1,              // the accounts could not be read or saved; the file is as it was
  incomplete = 1,          // some of the accounts that were to come back are faulty; the others are back
  different = 1,           // what was compared is not the same
  wrongUse = 2,            // what was asked makes no sense; nothing was changed
  noSuchAccount = 3,       // nothing was changed
  faultyInstallation = 4,  // the configuration or a module is at fault; the message says whether the change was saved
  findings = 5,            // what was to be verified could be read, and there is something to say about it
};

// Ends a command that cannot do what it was asked.
using Failure = commandline::Ending;

// What the command line asks for. Every path is absolute.
struct Options {
  platform::LinuxPlatformOptions device;
  bool opensModulesOfOtherRoots = false;
  bool printsJson = false;
  bool changesNothing = false;      // a command that changes accounts is only tried
  bool dropsUnreadable = false;     // accounts are saved although records that cannot be loaded go
  bool printsEverything = false;    // however narrow the terminal is
  std::optional<std::string> file;  // what is listed, shown or verified in place of the device's accounts
  std::optional<std::filesystem::path> snapshots;  // the directory of snapshots, where it is not the usual one
  std::vector<std::string> settings;               // properties that recovered accounts are given, as they were written
  commandline::Colour colour = commandline::Colour::automatic;
  std::vector<std::string> columns;  // of a list of accounts; empty for the usual ones
  bool printsHelp = false;
  bool printsVersion = false;
  std::string command;                 // empty where none is given
  std::vector<std::string> arguments;  // the command's

  // Whether the device's modules may be opened, and so whether anybody can be told of changes. The modules of an image
  // that is merely mounted somewhere are foreign code; they are opened only where that is asked for.
  [[nodiscard]] bool opensModules() const;
  // How standard output is to be written.
  [[nodiscard]] commandline::Page page() const;
};

// Reads the arguments that follow the program's name, as commandline/options.h says. Throws Failure (wrong use) for
// what is said there, for a root that is no directory, and for a word that is not UTF-8.
[[nodiscard]] Options parseArguments(std::span<const char* const> arguments);

// The help's lines on the options.
[[nodiscard]] std::string helpOfOptions(const commandline::Page& page);

}  // namespace tools
