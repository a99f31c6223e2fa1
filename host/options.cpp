#include "host/options.h"

#include <unistd.h>

#include <array>
#include <charconv>
#include <chrono>
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
    "3 the plug-in could not be loaded, 5 a snapshot could not be taken or restored,\n"
    "6 the accounts were not saved, 7 some accounts were lost (with --strict) or\n"
    "would be (with --refuse-loss),\n"
    "8 refused, and nothing was touched: a lock could not be had, a file may be planted,\n"
    "or the settings could neither be read nor kept, 9 the migration succeeded, but its\n"
    "explanation, trace or metrics could not be written.\n";

constexpr std::size_t kUsualColumns = 80;

// What is taken as it is written, to be looked at when everything is known.
struct Written {
  std::optional<std::string> explain;
  std::optional<std::string> dryRun;
  std::optional<std::string> lockTimeout;
  std::optional<std::string> keep;
  std::optional<std::string> listing;
  std::optional<std::string> ifNeeded;
  std::optional<std::string> undo;
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
      {"--metrics", "FILE", "replace this file by the run in numbers, as OpenMetrics text", &options.metrics},
      {"--explain", "", "print what the run did to which account; =json for machines, =html as a page for a browser",
       Form{&written.explain, {"text", "json", "html"}}},
      {"--dry-run", "", "rehearse the run: the device stays as it is", Form{&written.dryRun, {}}},
      {"--serve-rehearsals", "", "in place of a run, rehearse the devices that standard input names, each in a child",
       &options.isServer},
      {"--strict", "", "exit with 7 where accounts were lost", &options.isStrict},
      {"--careful", "", "rehearse before the run, and keep its snapshot for good where a loss is foretold",
       &options.isCareful},
      {"--refuse-loss", "", "rehearse before the run, and do not run where a loss is foretold", &options.refusesLoss},
      {"--lock-timeout", "SECONDS", "give up where another program holds a lock for longer", &written.lockTimeout},
      {"--snapshots", "DIR", "before the run, keep copies in DIR of the files that it may change",
       &options.snapshots.directory},
      {"--keep", "N", "keep the newest N snapshots (default: 5)", &written.keep},
      {"--list-snapshots", "", "in place of a run, list the snapshots in DIR; =json for machines",
       Form{&written.listing, {"json"}}},
      {"--if-needed", "", "end at once where this release has run well and nothing is to be migrated",
       Form{&written.ifNeeded, {}}},
      {"--restore", "ID",
       "in place of a run, bring the device back to this snapshot in DIR; an unmistakable beginning will do, or: "
       "latest",
       &options.snapshots.restore},
      {"--undo", "", "in place of a run, go back to before the last run that changed something",
       Form{&written.undo, {}}},
      {"--release", "ID", "in place of a run, keep this snapshot no longer than the others",
       &options.snapshots.release},
      {"--of", "ID", "with --explain, in place of a run: what the run of this snapshot did",
       &options.snapshots.explained},
      {"--help,-h", "", "print this text", &written.isHelpAsked},
      {"--version", "", "print the version", &written.isVersionAsked},
  };
}

std::string help(const std::vector<commandline::Option>& options) {
  auto page = commandline::pageOn(STDOUT_FILENO);
  page.columns = page.columns.value_or(kUsualColumns);
  return std::string{kUsage} + commandline::helpOf(options, page) + std::string{kStatuses};
}

// The options as they were given; those that the trace tells of otherwise are left out.
std::vector<std::string> givenIn(std::span<const char* const> arguments) {
  std::vector<std::string> given;
  for (const std::string_view word : arguments) {
    if (word.starts_with("--") || given.empty()) {
      given.emplace_back(word);
    } else {
      given.back() += "=" + std::string{word};
    }
  }
  std::erase_if(
      given, [](const std::string& option) { return option.starts_with("--root=") || option.starts_with("--trace="); });
  return given;
}

std::optional<std::size_t> numberIn(const std::string& text) {
  std::size_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  return error == std::errc{} && stop == end ? std::optional{number} : std::nullopt;
}

std::size_t countIn(const std::string& text) {
  const auto count = numberIn(text);
  if (count && *count > 0) return *count;
  throw WrongUse{"--keep needs a number of snapshots, at least 1: " + text};
}

// A rehearsal holds what it looks at together with other rehearsals.
void settleLocks(const Written& written, Options& options) {
  constexpr std::size_t kMaxSeconds = 86400;
  options.device.locks.isShared = options.isRehearsal;
  if (!written.lockTimeout) return;
  const auto seconds = numberIn(*written.lockTimeout);
  if (!seconds || *seconds > kMaxSeconds) {
    throw WrongUse{"--lock-timeout needs a number of seconds, at most a day: " + *written.lockTimeout};
  }
  options.device.locks.timeLimit = std::chrono::seconds{*seconds};
}

// What is asked for in place of a run, each by its option.
std::vector<std::string> insteadOfARun(const SnapshotOptions& snapshots) {
  std::vector<std::string> asked;
  if (snapshots.restore) asked.emplace_back("--restore");
  if (snapshots.isUndo) asked.emplace_back("--undo");
  if (snapshots.release) asked.emplace_back("--release");
  if (snapshots.listing != SnapshotOptions::Listing::none) asked.emplace_back("--list-snapshots");
  if (snapshots.explained) asked.emplace_back("--of");
  return asked;
}

void settleSnapshots(const Written& written, SnapshotOptions& snapshots) {
  using Listing = SnapshotOptions::Listing;
  if (written.listing) snapshots.listing = written.listing->empty() ? Listing::table : Listing::json;
  snapshots.isIfNeeded = written.ifNeeded.has_value();
  snapshots.isUndo = written.undo.has_value();
  const std::vector<std::string> instead = insteadOfARun(snapshots);
  if (!snapshots.directory) {
    if (!instead.empty()) throw WrongUse{instead.front() + " needs --snapshots"};
    if (written.keep) throw WrongUse{"--keep needs --snapshots"};
    if (written.ifNeeded) throw WrongUse{"--if-needed needs --snapshots"};
    return;
  }
  if (instead.size() > 1) throw WrongUse{instead[0] + " and " + instead[1] + " exclude each other"};
  if (written.keep && !instead.empty()) throw WrongUse{"--keep is for a run: only a run removes snapshots"};
  if (written.ifNeeded && !instead.empty()) throw WrongUse{"--if-needed is for a run, and this is none"};
  if (!snapshots.directory->has_filename()) snapshots.directory = snapshots.directory->parent_path();
  if (written.keep) snapshots.keep = countIn(*written.keep);
}

// A page is of no use on a terminal, and the run would be over before anybody saw that.
Explain explainIn(const std::string& form) {
  if (form == "json") return Explain::json;
  if (form != "html") return Explain::text;
  if (::isatty(STDOUT_FILENO) != 0) {
    throw WrongUse{"--explain=html makes a page for a browser: send it to a file, as in --explain=html > page.html"};
  }
  return Explain::html;
}

// What is done in place of a run is no run to rehearse or to explain, but for what a snapshot has of one.
void settleRun(const Written& written, Options& options) {
  const bool isRun = insteadOfARun(options.snapshots).empty();
  options.isRehearsal = written.dryRun.has_value();
  if (options.snapshots.explained && !written.explain) throw WrongUse{"--of needs --explain"};
  if (options.isRehearsal && !isRun) throw WrongUse{"--dry-run is for a run, and this is none"};
  if (options.metrics && !isRun) throw WrongUse{"--metrics is for a run, and this is none"};
  if (options.isStrict && !isRun) throw WrongUse{"--strict is for a run, and this is none"};
  if (options.isCareful && !isRun) throw WrongUse{"--careful is for a run, and this is none"};
  if (options.refusesLoss && !isRun) throw WrongUse{"--refuse-loss is for a run, and this is none"};
  if (options.isCareful && !options.snapshots.directory) throw WrongUse{"--careful needs --snapshots"};
  if (!written.explain) return;
  if (!isRun && !options.snapshots.explained) throw WrongUse{"--explain is for a run, and this is none"};
  options.explain = explainIn(*written.explain);
}

// A server's options are those of each of its rehearsals, which have no root of their own and nothing to keep.
void settleServer(const Written& written, const Options& options) {
  if (!options.isServer) return;
  const std::array<std::pair<bool, const char*>, 10> excluded{
      {{options.device.systemRoot.has_value(), "--root"},
       {options.device.home.has_value(), "--home"},
       {options.trace.has_value(), "--trace"},
       {options.metrics.has_value(), "--metrics"},
       {written.explain.has_value(), "--explain"},
       {options.isRehearsal, "--dry-run"},
       {options.isStrict, "--strict"},
       {options.isCareful, "--careful"},
       {options.refusesLoss, "--refuse-loss"},
       {options.snapshots.directory.has_value(), "--snapshots"}}};
  for (const auto& [isGiven, name] : excluded) {
    if (isGiven) throw WrongUse{"--serve-rehearsals and " + std::string{name} + " exclude each other"};
  }
}

void requireDirectory(const std::optional<std::filesystem::path>& root) {
  std::error_code ignored;
  if (!root || std::filesystem::is_directory(*root, ignored)) return;
  throw WrongUse{"--root is no directory: " + root->string()};
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
  options.given = givenIn(arguments);
  settleSnapshots(written, options.snapshots);
  settleRun(written, options);
  settleServer(written, options);
  settleLocks(written, options);
  requireDirectory(options.device.systemRoot);
  return options;
}

Options rehearsalOf(const Options& run) {
  Options options = run;
  options.device.locks.isShared = true;
  options.trace.reset();
  options.metrics.reset();
  options.explain = Explain::json;
  options.isRehearsal = true;
  options.isStrict = options.isCareful = options.refusesLoss = false;
  options.snapshots.isIfNeeded = false;
  return options;
}

Options rehearsalBelow(const std::filesystem::path& root, const Options& server) {
  Options options = rehearsalOf(server);
  options.isServer = false;
  options.device.systemRoot = std::filesystem::absolute(root);
  requireDirectory(options.device.systemRoot);
  return options;
}

}  // namespace host
