#include "host/options.h"

#include <algorithm>
#include <array>
#include <string_view>

namespace host {
namespace {

using Path = std::filesystem::path;

constexpr std::string_view kUsage =
    "Usage: migration-host [OPTION]...\n"
    "Upgrades a device's account settings after a system update.\n"
    "\n"
    "  --root DIR              the root of the device's file tree (default: /)\n"
    "  --home DIR              the mobile user's home directory (default: the process's;\n"
    "                          with --root, var/mobile in it)\n"
    "  --shared-resources DIR  the directory of shared resources (default: var/mobile in the root)\n"
    "  --resources DIR         the plug-in's resources, in place of the installed ones\n"
    "  --plugin FILE           the plug-in to load, in place of the installed one\n"
    "  --trace FILE            append the run's events to this file, one JSON object a line\n"
    "  --help                  print this text\n"
    "  --version               print the version\n"
    "\n"
    "Exit status: 0 the migration succeeded, 1 it did not, 2 wrong use, 3 the plug-in could not be loaded.\n";

constexpr std::string_view kVersion = "migration-host " HOST_VERSION "\n";

Answer wrongUse(std::string text) { return {.text = std::move(text) + " (see --help)", .isWrongUse = true}; }

std::optional<Path>* placeOf(std::string_view name, Options& options) {
  const std::array<std::pair<std::string_view, std::optional<Path>*>, 6> places{{
      {"--root", &options.device.systemRoot},
      {"--home", &options.device.home},
      {"--shared-resources", &options.device.sharedResources},
      {"--resources", &options.device.resources},
      {"--plugin", &options.plugin},
      {"--trace", &options.trace},
  }};
  const auto* const found = std::ranges::find(places, name, &decltype(places)::value_type::first);
  return found == places.end() ? nullptr : found->second;
}

struct Argument {
  std::string_view name;
  std::optional<std::string_view> value;
};

// One option with its value, taken off the front.
Argument takeArgument(std::span<const char* const>& arguments) {
  const std::string_view first = arguments.front();
  arguments = arguments.subspan(1);
  if (const auto equals = first.find('='); first.starts_with("--") && equals != std::string_view::npos) {
    return {first.substr(0, equals), first.substr(equals + 1)};
  }
  return {first, std::nullopt};
}

std::optional<std::string_view> takeValue(const Argument& argument, std::span<const char* const>& arguments) {
  if (argument.value) return argument.value;
  if (arguments.empty() || std::string_view{arguments.front()}.starts_with("--")) return std::nullopt;
  const std::string_view value = arguments.front();
  arguments = arguments.subspan(1);
  return value;
}

std::optional<Answer> readArgument(std::span<const char* const>& arguments, Options& options) {
  const auto argument = takeArgument(arguments);
  const std::string name{argument.name};
  if (name == "--help" && !argument.value) return Answer{.text = std::string{kUsage}};
  if (name == "--version" && !argument.value) return Answer{.text = std::string{kVersion}};
  if (!name.starts_with("-")) return wrongUse("unexpected argument: " + name);
  auto* const place = placeOf(name, options);
  if (place == nullptr) return wrongUse("unknown option: " + name);
  if (place->has_value()) return wrongUse(name + " is given twice");
  const auto value = takeValue(argument, arguments);
  if (!value || value->empty()) return wrongUse(name + " needs a value");
  *place = std::filesystem::absolute(*value);
  return std::nullopt;
}

}  // namespace

std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments) {
  Options options;
  while (!arguments.empty()) {
    if (auto answer = readArgument(arguments, options)) return *std::move(answer);
  }
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    return wrongUse("--root is no directory: " + root->string());
  }
  return options;
}

}  // namespace host
