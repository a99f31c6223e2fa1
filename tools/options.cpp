#include "tools/options.h"

#include <algorithm>
#include <filesystem>
#include <system_error>

#include "platform/text.h"

namespace tools {
namespace {

using commandline::WrongUse;

std::vector<commandline::Option> optionsInto(Options& options) {
  return {
      {"--root", "DIR", "the root of the device's file tree (default: /)", &options.device.systemRoot},
      {"--home", "DIR", "the mobile user's home directory (default: the process's; under a root, var/mobile in it)",
       &options.device.home},
      {"--resources", "DIR", "the configuration, in place of the installed one", &options.device.resources},
      {"--modules", "",
       "open the account modules under another root, too, and tell them of changes; else nobody is told of a change "
       "there",
       &options.opensModulesOfOtherRoots},
      {"--json", "", "print JSON", &options.printsJson},
      {"--help,-h", "", "print this text", &options.printsHelp},
      {"--version", "", "print the version", &options.printsVersion},
  };
}

// Property lists hold nothing but text; what is none would be kept as something else than was asked for.
void checkWords(const Options& options) {
  const auto& words = options.arguments;
  const auto found = std::ranges::find_if_not(words, platform::isWellFormedText);
  if (found == words.end()) return;
  throw WrongUse{"argument " + std::to_string(found - words.begin() + 1) + " of " + options.command + " is not UTF-8"};
}

}  // namespace

bool Options::opensModules() const {
  if (!device.systemRoot || opensModulesOfOtherRoots) return true;
  std::error_code failure;
  return std::filesystem::equivalent(*device.systemRoot, "/", failure) && !failure;
}

Options parseArguments(std::span<const char* const> arguments) {
  Options options;
  auto words = commandline::readOptions(optionsInto(options), arguments);
  if (!words.empty()) {
    options.command = std::move(words.front());
    if (options.command.empty()) throw WrongUse{"unknown command: "};
    options.arguments.assign(std::move_iterator{words.begin() + 1}, std::move_iterator{words.end()});
  }
  checkWords(options);
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    throw WrongUse{"--root is no directory: " + root->string()};
  }
  return options;
}

std::string helpOfOptions(const commandline::Page& page) {
  Options options;
  return commandline::helpOf(optionsInto(options), page);
}

}  // namespace tools
