#include "host/options.h"

#include <algorithm>
#include <array>
#include <charconv>
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
    "  --explain               print what the run did to which account; =json for machines\n"
    "  --dry-run               rehearse the run: the device stays as it is\n"
    "  --snapshots DIR         before the run, keep copies in DIR of the files that it may change\n"
    "  --keep N                keep the newest N snapshots (default: 5)\n"
    "  --list-snapshots        in place of a run, list the snapshots in DIR; =json for machines\n"
    "  --restore ID            in place of a run, bring the device back to this snapshot in DIR\n"
    "  --help                  print this text\n"
    "  --version               print the version\n"
    "\n"
    "Exit status: 0 the migration succeeded, 1 it did not, 2 wrong use, 3 the plug-in could not be loaded,\n"
    "5 a snapshot could not be taken or restored.\n";

constexpr std::string_view kVersion = "migration-host " HOST_VERSION "\n";

Answer wrongUse(std::string text) { return {.text = std::move(text) + " (see --help)", .isWrongUse = true}; }

std::optional<Path>* placeOf(std::string_view name, Options& options) {
  const std::array<std::pair<std::string_view, std::optional<Path>*>, 7> places{{
      {"--root", &options.device.systemRoot},
      {"--home", &options.device.home},
      {"--shared-resources", &options.device.sharedResources},
      {"--resources", &options.device.resources},
      {"--plugin", &options.plugin},
      {"--trace", &options.trace},
      {"--snapshots", &options.snapshots.directory},
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

// What is taken by the word, to be looked at when everything is known.
struct Words {
  std::optional<std::string> keep;
  std::optional<std::string> restore;
};

std::optional<std::string>* wordOf(std::string_view name, Words& words) {
  if (name == "--keep") return &words.keep;
  return name == "--restore" ? &words.restore : nullptr;
}

std::optional<Answer> readListing(const Argument& argument, SnapshotOptions& snapshots) {
  if (snapshots.listing != SnapshotOptions::Listing::none) return wrongUse("--list-snapshots is given twice");
  if (argument.value && *argument.value != "json") return wrongUse("--list-snapshots is followed by nothing or =json");
  snapshots.listing = argument.value ? SnapshotOptions::Listing::json : SnapshotOptions::Listing::table;
  return std::nullopt;
}

std::optional<Answer> readExplain(const Argument& argument, Explain& explain) {
  if (explain != Explain::notAsked) return wrongUse("--explain is given twice");
  if (argument.value && *argument.value != "json" && *argument.value != "text") {
    return wrongUse("--explain is followed by nothing, =text or =json");
  }
  explain = argument.value == "json" ? Explain::json : Explain::text;
  return std::nullopt;
}

std::optional<Answer> readDryRun(const Argument& argument, bool& isRehearsal) {
  if (isRehearsal) return wrongUse("--dry-run is given twice");
  if (argument.value) return wrongUse("--dry-run takes no value");
  isRehearsal = true;
  return std::nullopt;
}

template <typename Value, typename Read>
std::optional<Answer> readValue(const Argument& argument, std::span<const char* const>& arguments,
                                std::optional<Value>& place, const Read& read) {
  const std::string name{argument.name};
  if (place.has_value()) return wrongUse(name + " is given twice");
  const auto value = takeValue(argument, arguments);
  if (!value || value->empty()) return wrongUse(name + " needs a value");
  place = read(*value);
  return std::nullopt;
}

std::optional<Answer> readArgument(std::span<const char* const>& arguments, Options& options, Words& words) {
  const auto argument = takeArgument(arguments);
  const std::string name{argument.name};
  if (name == "--help" && !argument.value) return Answer{.text = std::string{kUsage}};
  if (name == "--version" && !argument.value) return Answer{.text = std::string{kVersion}};
  if (!name.starts_with("-")) return wrongUse("unexpected argument: " + name);
  if (name == "--explain") return readExplain(argument, options.explain);
  if (name == "--dry-run") return readDryRun(argument, options.isRehearsal);
  if (name == "--list-snapshots") return readListing(argument, options.snapshots);
  if (auto* const word = wordOf(name, words)) {
    return readValue(argument, arguments, *word, [](std::string_view value) { return std::string{value}; });
  }
  if (auto* const place = placeOf(name, options)) {
    return readValue(argument, arguments, *place,
                     [](std::string_view value) { return std::filesystem::absolute(value); });
  }
  return wrongUse("unknown option: " + name);
}

std::optional<Answer> readCount(const std::string& text, std::size_t& count) {
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, count);
  if (error == std::errc{} && stop == end && count > 0) return std::nullopt;
  return wrongUse("--keep needs a number of snapshots, at least 1: " + text);
}

std::optional<Answer> settleSnapshots(const Words& words, SnapshotOptions& snapshots) {
  const bool isListing = snapshots.listing != SnapshotOptions::Listing::none;
  if (!snapshots.directory) {
    if (words.restore) return wrongUse("--restore needs --snapshots");
    if (isListing) return wrongUse("--list-snapshots needs --snapshots");
    if (words.keep) return wrongUse("--keep needs --snapshots");
    return std::nullopt;
  }
  if (words.restore && isListing) return wrongUse("--restore and --list-snapshots exclude each other");
  if (words.keep && (words.restore || isListing)) return wrongUse("--keep is for a run: only a run removes snapshots");
  if (!snapshots.directory->has_filename()) snapshots.directory = snapshots.directory->parent_path();
  snapshots.restore = words.restore;
  return words.keep ? readCount(*words.keep, snapshots.keep) : std::nullopt;
}

// A rehearsal keeps nothing, and what is done in place of a run is no run to rehearse or to explain.
std::optional<Answer> settleRun(const Options& options) {
  const SnapshotOptions& snapshots = options.snapshots;
  const bool isRun = !snapshots.restore && snapshots.listing == SnapshotOptions::Listing::none;
  if (options.isRehearsal && snapshots.directory) return wrongUse("--dry-run and --snapshots exclude each other");
  if (options.explain != Explain::notAsked && !isRun) return wrongUse("--explain is for a run, and this is none");
  return std::nullopt;
}

}  // namespace

std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments) {
  Options options;
  Words words;
  while (!arguments.empty()) {
    if (auto answer = readArgument(arguments, options, words)) return *std::move(answer);
  }
  if (auto answer = settleSnapshots(words, options.snapshots)) return *std::move(answer);
  if (auto answer = settleRun(options)) return *std::move(answer);
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    return wrongUse("--root is no directory: " + root->string());
  }
  return options;
}

}  // namespace host
