#include "tools/options.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>

#include "platform/text.h"
#include "tools/failure.h"

namespace tools {
namespace {

using Path = std::filesystem::path;
using Arguments = std::span<const char* const>;

[[noreturn]] void refuse(const std::string& message) { throw Failure{ExitStatus::wrongUse, message + " (see --help)"}; }

// The entry of a short table under the name, or null.
template <typename Table>
auto* entryOf(const Table& table, std::string_view name) {
  const auto* const found = std::ranges::find(table, name, &Table::value_type::first);
  return found == table.end() ? nullptr : found->second;
}

std::optional<Path>* pathOf(std::string_view name, Options& options) {
  const std::array<std::pair<std::string_view, std::optional<Path>*>, 3> places{{
      {"--root", &options.device.systemRoot},
      {"--home", &options.device.home},
      {"--resources", &options.device.resources},
  }};
  return entryOf(places, name);
}

bool* switchOf(std::string_view name, Options& options) {
  const std::array<std::pair<std::string_view, bool*>, 4> places{{
      {"--modules", &options.opensModulesOfOtherRoots},
      {"--json", &options.printsJson},
      {"--help", &options.printsHelp},
      {"--version", &options.printsVersion},
  }};
  return entryOf(places, name);
}

std::string_view take(Arguments& arguments) {
  const std::string_view first = arguments.front();
  arguments = arguments.subspan(1);
  return first;
}

void readOption(std::string_view argument, Arguments& rest, Options& options) {
  const auto equals = argument.find('=');
  const std::string name{argument.substr(0, equals)};
  const bool hasValue = equals != std::string_view::npos;
  if (auto* const isOn = switchOf(name, options); isOn != nullptr && !hasValue) {
    *isOn = true;
    return;
  }
  auto* const path = pathOf(name, options);
  if (path == nullptr) refuse("unknown option: " + name);
  if (path->has_value()) refuse(name + " is given twice");
  std::string_view value = hasValue ? argument.substr(equals + 1) : std::string_view{};
  if (!hasValue && !rest.empty() && !std::string_view{rest.front()}.starts_with("--")) value = take(rest);
  if (value.empty()) refuse(name + " needs a value");
  *path = std::filesystem::absolute(value);
}

void readWord(std::string_view word, Options& options) {
  if (options.command.empty()) {
    options.command = word;
    if (word.empty()) refuse("unknown command: ");
  } else {
    options.arguments.emplace_back(word);
  }
}

// Property lists hold nothing but text; what is none would be kept as something else than was asked for.
void checkWords(const Options& options) {
  const auto& words = options.arguments;
  const auto found = std::ranges::find_if_not(words, platform::isWellFormedText);
  if (found == words.end()) return;
  refuse("argument " + std::to_string(found - words.begin() + 1) + " of " + options.command + " is not UTF-8");
}

}  // namespace

bool Options::opensModules() const {
  if (!device.systemRoot || opensModulesOfOtherRoots) return true;
  std::error_code failure;
  return std::filesystem::equivalent(*device.systemRoot, "/", failure) && !failure;
}

Options parseArguments(Arguments arguments) {
  Options options;
  bool optionsHaveEnded = false;
  while (!arguments.empty()) {
    const auto argument = take(arguments);
    if (optionsHaveEnded || !argument.starts_with('-') || argument == "-") {
      readWord(argument, options);
    } else if (argument == "--") {
      optionsHaveEnded = true;
    } else {
      readOption(argument, arguments, options);
    }
  }
  checkWords(options);
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    refuse("--root is no directory: " + root->string());
  }
  return options;
}

}  // namespace tools
