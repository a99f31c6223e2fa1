#include "host/options.h"

#include <unistd.h>

#include <algorithm>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <iterator>
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
constexpr std::size_t kSecondsOfADay = 86400;

// What is taken as it is written, to be looked at when everything is known.
struct Written {
  std::optional<std::string> explain;
  std::optional<std::string> rehearsal;
  std::optional<std::string> lockTimeout;
  std::optional<std::string> keep;
  std::optional<std::string> listing;
  std::optional<std::string> ifNeeded;
  std::optional<std::string> undo;
  bool isHelpAsked = false;
  bool isVersionAsked = false;
};

std::vector<commandline::Option> runOptions(Options& options, Written& written) {
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
      {"--dry-run", "", "rehearse the run: the device stays as it is", Form{&written.rehearsal, {}}},
      {"--serve-rehearsals", "", "in place of a run, rehearse the devices that standard input names, each in a child",
       &options.isServer},
      {"--strict", "", "exit with 7 where accounts were lost", &options.isStrict},
      {"--careful", "", "rehearse before the run, and keep its snapshot for good where a loss is foretold",
       &options.isCareful},
      {"--refuse-loss", "", "rehearse before the run, and do not run where a loss is foretold", &options.refusesLoss},
      {"--lock-timeout", "SECONDS", "give up where another program holds a lock for longer", &written.lockTimeout},
  };
}

std::vector<commandline::Option> snapshotOptions(SnapshotOptions& options, Written& written) {
  return {
      {"--snapshots", "DIR", "before the run, keep copies in DIR of the files that it may change", &options.directory},
      {"--keep", "N", "keep the newest N snapshots (default: 5)", &written.keep},
      {"--list-snapshots", "", "in place of a run, list the snapshots in DIR; =json for machines",
       Form{&written.listing, {"json"}}},
      {"--if-needed", "", "end at once where this release has run well and nothing is to be migrated",
       Form{&written.ifNeeded, {}}},
      {"--restore", "ID",
       "in place of a run, bring the device back to this snapshot in DIR; an unmistakable beginning will do, or: "
       "latest",
       &options.restore},
      {"--undo", "", "in place of a run, go back to before the last run that changed something",
       Form{&written.undo, {}}},
      {"--release", "ID", "in place of a run, keep this snapshot no longer than the others", &options.release},
      {"--of", "ID", "with --explain, in place of a run: what the run of this snapshot did", &options.explained},
  };
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

// What the option needs is said where the text is no number from `min` to `max`.
std::size_t numberIn(const std::string& text, std::size_t min, std::size_t max, const std::string& need) {
  std::size_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error == std::errc{} && stop == end && number >= min && number <= max) return number;
  throw WrongUse{need + ": " + text};
}

// Those of the options that are given.
std::vector<std::string> givenOf(std::initializer_list<std::pair<const char*, bool>> options) {
  std::vector<std::string> given;
  for (const auto& [name, isGiven] : options) {
    if (isGiven) given.emplace_back(name);
  }
  return given;
}

// What is asked for in place of a run, each by its option.
std::vector<std::string> insteadOfARun(const SnapshotOptions& snapshots) {
  return givenOf({{"--restore", snapshots.restore.has_value()},
                  {"--undo", snapshots.isUndo},
                  {"--release", snapshots.release.has_value()},
                  {"--list-snapshots", snapshots.listing != SnapshotOptions::Listing::none},
                  {"--of", snapshots.explained.has_value()}});
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
  if (!written.keep) return;
  snapshots.keep = numberIn(*written.keep, 1, SIZE_MAX, "--keep needs a number of snapshots, at least 1");
}

// What is done in place of a run is no run to rehearse or to explain, but for what a snapshot has of one.
void settleRun(const Written& written, Options& options) {
  options.isRehearsal = written.rehearsal.has_value();
  const bool isExplained = written.explain.has_value();
  if (options.snapshots.explained && !isExplained) throw WrongUse{"--of needs --explain"};
  const std::vector<std::string> ofRun = givenOf({{"--dry-run", options.isRehearsal},
                                                  {"--metrics", options.metrics.has_value()},
                                                  {"--strict", options.isStrict},
                                                  {"--careful", options.isCareful},
                                                  {"--refuse-loss", options.refusesLoss},
                                                  {"--explain", isExplained && !options.snapshots.explained}});
  if (!ofRun.empty() && !insteadOfARun(options.snapshots).empty()) {
    throw WrongUse{ofRun.front() + " is for a run, and this is none"};
  }
  if (options.isCareful && !options.snapshots.directory) throw WrongUse{"--careful needs --snapshots"};
  if (!isExplained) return;
  options.explain = *written.explain == "json"   ? Explain::json
                    : *written.explain == "html" ? Explain::html
                                                 : Explain::text;
  if (options.explain == Explain::html && ::isatty(STDOUT_FILENO) != 0) {
    // A page is of no use there, and the run would be over before anybody saw that.
    throw WrongUse{"--explain=html makes a page for a browser: send it to a file, as in --explain=html > page.html"};
  }
}

// A server's options are those of each of its rehearsals, which have no root of their own and nothing to keep.
void settleServer(const Written& written, const Options& options) {
  const std::vector<std::string> excluded = givenOf({{"--root", options.device.systemRoot.has_value()},
                                                     {"--home", options.device.home.has_value()},
                                                     {"--trace", options.trace.has_value()},
                                                     {"--metrics", options.metrics.has_value()},
                                                     {"--explain", written.explain.has_value()},
                                                     {"--dry-run", options.isRehearsal},
                                                     {"--strict", options.isStrict},
                                                     {"--careful", options.isCareful},
                                                     {"--refuse-loss", options.refusesLoss},
                                                     {"--snapshots", options.snapshots.directory.has_value()}});
  if (!options.isServer || excluded.empty()) return;
  throw WrongUse{"--serve-rehearsals and " + excluded.front() + " exclude each other"};
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
  std::vector<commandline::Option> declared = runOptions(options, written);
  std::ranges::move(snapshotOptions(options.snapshots, written), std::back_inserter(declared));
  declared.push_back({"--help,-h", "", "print this text", &written.isHelpAsked});
  declared.push_back({"--version", "", "print the version", &written.isVersionAsked});
  const auto words = commandline::readOptions(declared, arguments);
  if (written.isHelpAsked) {
    auto page = commandline::pageOn(STDOUT_FILENO);
    page.columns = page.columns.value_or(kUsualColumns);
    return Answer{std::string{kUsage} + commandline::helpOf(declared, page) + std::string{kStatuses}};
  }
  if (written.isVersionAsked) return Answer{"migration-host " HOST_VERSION "\n"};
  if (!words.empty()) throw WrongUse{"unexpected argument: " + words.front()};
  options.given = givenIn(arguments);
  settleSnapshots(written, options.snapshots);
  settleRun(written, options);
  settleServer(written, options);
  options.device.locks.isShared = options.isRehearsal;  // with other rehearsals
  if (written.lockTimeout) {
    options.device.locks.timeLimit = std::chrono::seconds{
        numberIn(*written.lockTimeout, 0, kSecondsOfADay, "--lock-timeout needs a number of seconds, at most a day")};
  }
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
