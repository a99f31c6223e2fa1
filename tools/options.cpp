#include "tools/options.h"

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <optional>
#include <sstream>
#include <string_view>
#include <system_error>

#include "platform/text.h"

namespace tools {
namespace {

using commandline::Form;
using commandline::WrongUse;

// What is taken as it is written, to be looked at when everything is known.
struct Written {
  std::optional<std::string> columns;
  std::optional<std::string> colour;
};

std::vector<commandline::Option> optionsInto(Options& options, Written& written) {
  return {
      {"--root", "DIR", "the root of the device's file tree (default: /)", &options.device.systemRoot},
      {"--home", "DIR", "the mobile user's home directory (default: the process's; under a root, var/mobile in it)",
       &options.device.home},
      {"--resources", "DIR", "the configuration, in place of the installed one", &options.device.resources},
      {"--modules", "",
       "open the account modules under another root, too, and tell them of changes; else nobody is told of a change "
       "there",
       &options.opensModulesOfOtherRoots},
      {"--file", "FROM", "list, show or verify what a file, a snapshot or another device holds", &options.file},
      {"--snapshots", "DIR", "where snapshots are looked for (default: /var/lib/account-settings/snapshots)",
       &options.snapshots},
      {"--set", "KEY=VALUE", "give what recover brings back this property; may be repeated", &options.settings},
      {"--dry-run", "", "change nothing, and print what would be changed", &options.changesNothing},
      {"--drop-unreadable", "", "save although records of the file that cannot be loaded go", &options.dropsUnreadable},
      {"--json", "", "print JSON", &options.printsJson},
      {"--columns", "LIST", "of a list: identifier, type, class, name, user, host, enabled", &written.columns},
      {"--wide", "", "shorten nothing, however narrow the terminal is", &options.printsEverything},
      {"--color", "", "bold and faint text: =auto, =always or =never",
       Form{&written.colour, {"auto", "always", "never"}}},
      {"--help,-h", "", "print this text", &options.printsHelp},
      {"--version", "", "print the version", &options.printsVersion},
  };
}

}  // namespace

commandline::Page Options::page() const {
  auto page = commandline::pageOn(STDOUT_FILENO, colour);
  if (printsEverything) page.columns.reset();
  return page;
}

bool Options::opensModules() const {
  if (!device.systemRoot || opensModulesOfOtherRoots) return true;
  std::error_code failure;
  return std::filesystem::equivalent(*device.systemRoot, "/", failure) && !failure;
}

Options parseArguments(std::span<const char* const> arguments) {
  Options options;
  Written written;
  auto words = commandline::readOptions(optionsInto(options, written), arguments);
  std::istringstream columns{written.columns ? *written.columns + "," : ""};
  for (std::string name; std::getline(columns, name, ',');) options.columns.push_back(name);
  if (written.colour && written.colour != "auto") {
    options.colour = written.colour == "never" ? commandline::Colour::never : commandline::Colour::always;
  }
  if (!words.empty()) {
    options.command = std::move(words.front());
    if (options.command.empty()) throw WrongUse{"unknown command: "};
    options.arguments.assign(std::move_iterator{words.begin() + 1}, std::move_iterator{words.end()});
  }
  // Property lists hold nothing but text; what is none would be kept as something else than was asked for.
  const auto& given = options.arguments;
  const auto place = std::ranges::find_if_not(given, platform::isWellFormedText) - given.begin();
  if (place != std::ssize(given)) {
    throw WrongUse{"argument " + std::to_string(place + 1) + " of " + options.command + " is not UTF-8"};
  }
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    throw WrongUse{"--root is no directory: " + root->string()};
  }
  return options;
}

std::string helpOfOptions(const commandline::Page& page) {
  Options options;
  Written written;
  return commandline::helpOf(optionsInto(options, written), page);
}

}  // namespace tools
