#include "host/options.h"

#include <unistd.h>

#include <charconv>
#include <string_view>
#include <vector>

#include "commandline/ending.h"
#include "commandline/options.h"
#include "commandline/terminal.h"

namespace host {
namespace {

using commandline::Form;
using commandline::WrongUse;

constexpr std::string_view kUsage =
    "Usage: migration-host [OPTION]...\n"
    "Upgrades a device's account settings after a system update.\n"
    "\n";

constexpr std::string_view kStatuses =
    "\n"
    "Exit status: 0 the migration succeeded, 1 it did not, 2 wrong use,\n"
    "3 the plug-in could not be loaded, 5 a snapshot could not be taken or restored.\n";

constexpr std::size_t kUsualColumns = 80;

// What is taken as it is written, to be looked at when everything is known.
struct Written {
  std::optional<std::string> explain;
  std::optional<std::string> dryRun;
  std::optional<std::string> keep;
  std::optional<std::string> listing;
  bool isHelpAsked = false;
  bool isVersionAsked = false;
};

std::vector<commandline::Option> optionsInto(Options& options, Written& written) {
  return {
      {"--root", "DIR", "the root of the device's file tree (default: /)", &options.device.systemRoot},
      {"--home", "DIR", "the mobile user's home directory (default: the process's; under --root, var/mobile in it)",
       &options.device.home},
      {"--shared-resources", "DIR", "the directory of shared resources (default: var/mobile in the root)",
       &options.device.sharedResources},
      {"--resources", "DIR", "the plug-in's resources, in place of the installed ones", &options.device.resources},
      {"--plugin", "FILE", "the plug-in to load, in place of the installed one", &options.plugin},
      {"--trace", "FILE", "append the run's events to this file, one JSON object a line", &options.trace},
      {"--explain", "", "print what the run did to which account; =json for machines",
       Form{&written.explain, {"text", "json"}}},
      {"--dry-run", "", "rehearse the run: the device stays as it is", Form{&written.dryRun, {}}},
      {"--snapshots", "DIR", "before the run, keep copies in DIR of the files that it may change",
       &options.snapshots.directory},
      {"--keep", "N", "keep the newest N snapshots (default: 5)", &written.keep},
      {"--list-snapshots", "", "in place of a run, list the snapshots in DIR; =json for machines",
       Form{&written.listing, {"json"}}},
      {"--restore", "ID", "in place of a run, bring the device back to this snapshot in DIR",
       &options.snapshots.restore},
      {"--help,-h", "", "print this text", &written.isHelpAsked},
      {"--version", "", "print the version", &written.isVersionAsked},
  };
}

std::string help(const std::vector<commandline::Option>& options) {
  auto page = commandline::pageOn(STDOUT_FILENO);
  page.columns = page.columns.value_or(kUsualColumns);
  return std::string{kUsage} + commandline::helpOf(options, page) + std::string{kStatuses};
}

std::size_t countIn(const std::string& text) {
  std::size_t count = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, count);
  if (error == std::errc{} && stop == end && count > 0) return count;
  throw WrongUse{"--keep needs a number of snapshots, at least 1: " + text};
}

void settleSnapshots(const Written& written, SnapshotOptions& snapshots) {
  const bool isListing = written.listing.has_value();
  if (!snapshots.directory) {
    if (snapshots.restore) throw WrongUse{"--restore needs --snapshots"};
    if (isListing) throw WrongUse{"--list-snapshots needs --snapshots"};
    if (written.keep) throw WrongUse{"--keep needs --snapshots"};
    return;
  }
  if (snapshots.restore && isListing) throw WrongUse{"--restore and --list-snapshots exclude each other"};
  if (written.keep && (snapshots.restore || isListing)) {
    throw WrongUse{"--keep is for a run: only a run removes snapshots"};
  }
  if (!snapshots.directory->has_filename()) snapshots.directory = snapshots.directory->parent_path();
  if (written.keep) snapshots.keep = countIn(*written.keep);
  using Listing = SnapshotOptions::Listing;
  if (isListing) snapshots.listing = written.listing->empty() ? Listing::table : Listing::json;
}

// A rehearsal keeps nothing, and what is done in place of a run is no run to rehearse or to explain.
void settleRun(const Written& written, Options& options) {
  const SnapshotOptions& snapshots = options.snapshots;
  const bool isRun = !snapshots.restore && snapshots.listing == SnapshotOptions::Listing::none;
  options.isRehearsal = written.dryRun.has_value();
  if (options.isRehearsal && snapshots.directory) throw WrongUse{"--dry-run and --snapshots exclude each other"};
  if (!written.explain) return;
  if (!isRun) throw WrongUse{"--explain is for a run, and this is none"};
  options.explain = *written.explain == "json" ? Explain::json : Explain::text;
}

}  // namespace

std::variant<Options, Answer> parseArguments(std::span<const char* const> arguments) {
  Options options;
  Written written;
  const auto declared = optionsInto(options, written);
  const auto words = commandline::readOptions(declared, arguments);
  if (written.isHelpAsked) return Answer{help(declared)};
  if (written.isVersionAsked) return Answer{"migration-host " HOST_VERSION "\n"};
  if (!words.empty()) throw WrongUse{"unexpected argument: " + words.front()};
  settleSnapshots(written, options.snapshots);
  settleRun(written, options);
  std::error_code ignored;
  if (const auto& root = options.device.systemRoot; root && !std::filesystem::is_directory(*root, ignored)) {
    throw WrongUse{"--root is no directory: " + root->string()};
  }
  return options;
}

}  // namespace host
