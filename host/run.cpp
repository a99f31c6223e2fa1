#include "host/run.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <memory>
#include <utility>

#include "commandline/ending.h"
#include "commandline/program.h"
#include "commandline/progress_line.h"
#include "host/explanation.h"
#include "host/explanation_page.h"
#include "host/foretelling.h"
#include "host/migration_lock.h"
#include "host/plugin.h"
#include "host/rehearsal.h"
#include "host/run_recorder.h"
#include "host/say.h"
#include "host/snapshot_steps.h"
#include "host/trace.h"
#include "host/verdict.h"
#include "platform/base_directories.h"
#include "platform/logs_and_notices.h"

namespace host {
namespace {

using commandline::Ending;

// What looks on at a run from outside; the trace is null where none is asked for.
struct Onlookers {
  std::shared_ptr<Trace> trace;
  std::shared_ptr<RunRecorder> recorder;
};

// The present time, as in 2026-03-07T10:15:00Z.
std::string now() {
  const std::time_t seconds = std::time(nullptr);
  std::tm utc{};
  gmtime_r(&seconds, &utc);
  std::array<char, 32> text{};
  return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &utc)};
}

// The trace that is asked for; null where none is.
std::shared_ptr<Trace> openTrace(const Options& options) {
  if (!options.trace) return nullptr;
  auto opened = Trace::open(*options.trace);
  if (opened.isOk()) return opened.take();
  throw Ending{ExitStatus::wrongUse, opened.status().description()};
}

Onlookers onlookersFor(const Options& options) {
  Onlookers onlookers{.trace = openTrace(options), .recorder = {}};
  const bool isExplained = options.explain != Explain::notAsked;
  onlookers.recorder = std::make_shared<RunRecorder>(isExplained ? onlookers.trace : nullptr);
  return onlookers;
}

// A device image is none of the business of the programs that run on this machine.
void silenceNotices(platform::Platform& platform) {
  platform.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  platform.cloudTabs = std::make_shared<platform::SilentCloudTabsNotice>();
}

platform::Platform platformFor(const Options& options, const Onlookers& onlookers) {
  auto platform = platform::makeLinuxPlatform(options.device);
  if (options.isRehearsal) rehearseOn(platform);
  if (platform.directories->systemRoot().lexically_normal() != "/") silenceNotices(platform);
  if (onlookers.trace) traceServices(platform, onlookers.trace);
  putConsoleAroundProgress(platform);
  platform.observer = onlookers.recorder;
  return platform;
}

std::unique_ptr<platform::DataClassMigrator> load(const Options& options) {
  auto loaded = loadMigrator(platform::current(), options.plugin ? *options.plugin : installedPlugin());
  if (const auto* const error = std::get_if<std::string>(&loaded)) throw Ending{ExitStatus::noPlugin, *error};
  return std::get<std::unique_ptr<platform::DataClassMigrator>>(std::move(loaded));
}

// What is said of a run after it.
struct Account {
  const Explanation& explanation;
  Verdict verdict;
  ExplainedRun run;
  std::vector<std::string> foretold{};

  [[nodiscard]] std::string asText() const { return textOf(explanation, verdict, run); }
  [[nodiscard]] std::string asJson() const { return jsonDocumentOf(explanation, verdict, run); }
};

// What the state of the settings file itself tells the snapshots, they know.
bool isToldBySnapshots(const records::Lost& lost) {
  return lost.code == records::LossCode::unreadableSettingsFile || lost.code == records::LossCode::newerSettingsFile;
}

snapshots::RunEnd endOf(const Account& account) {
  snapshots::RunEnd end{.isMigrated = account.run.success,
                        .isSaved = account.verdict.kind != Verdict::Kind::notSaved,
                        .onlyInSnapshot = {},
                        .explanation = account.asText(),
                        .explanationAsJson = account.asJson()};
  for (const records::Lost& lost : account.verdict.lost) {
    if (!isToldBySnapshots(lost)) end.onlyInSnapshot.push_back(textOf(lost));
  }
  if (account.verdict.lost.empty()) end.onlyInSnapshot = account.foretold;
  return end;
}

// Ends the session of the snapshots, where there is one; what is rolled back is lost no longer.
void endSession(snapshots::SnapshotSession* session, std::size_t keep, Account& account) {
  if (session == nullptr) return;
  if (session->end(endOf(account), keep) != snapshots::Ended::rolledBack) return;
  say("the accounts could not be saved; the device is as it was before the run");
  account.verdict.lost.clear();
}

// The accounts that stand in the settings file now; where it cannot be read, none.
std::vector<records::Name> presentAccounts(const platform::MigrationFootprint& footprint) {
  std::vector<records::Name> accounts;
  for (const platform::MigrationFile& file : footprint.files) {
    if (file.part != platform::MigrationFile::Part::settings) continue;
    accounts = accountsIn(platform::current().propertyLists->readDictionary(file.path).valueOr({}));
  }
  return accounts;
}

std::string explanationOf(Explain how, const Account& account, const platform::MigrationFootprint& footprint) {
  switch (how) {
    case Explain::notAsked: return {};
    case Explain::text: return account.asText();
    case Explain::json: return account.asJson();
    case Explain::html: return pageOf(account.asJson(), presentAccounts(footprint));
  }
  return {};
}

ExitStatus statusOf(const Account& account, bool isStrict) {
  if (!account.run.success) return ExitStatus::notMigrated;
  switch (account.verdict.kind) {
    case Verdict::Kind::kept: return ExitStatus::migrated;
    case Verdict::Kind::lost: return isStrict ? ExitStatus::accountsLost : ExitStatus::migrated;
    case Verdict::Kind::notSaved: return ExitStatus::notSaved;
  }
  return ExitStatus::notMigrated;
}

// To the plug-in such a file counts as missing: what is in it would be gone.
void refusePlanted(const platform::Path& file, const platform::Status& read) {
  if (read.cause() != platform::Cause::unsafe) return;
  throw Ending{ExitStatus::refused,
               file.string() + " may have been planted (" + read.reason() +
                   "); put the file itself there, with no second name, and run again; the device was not touched"};
}

// Reads the files that the run will work on. Answers how many version steps it has ahead, as its progress needs them.
std::size_t stepsAhead(const platform::MigrationFootprint& footprint) {
  using Part = platform::MigrationFile::Part;
  std::int64_t stored = footprint.currentVersion;
  for (const platform::MigrationFile& file : footprint.files) {
    if (file.part == Part::other) continue;
    const auto read = platform::current().propertyLists->readDictionary(file.path);
    refusePlanted(file.path, read.status());
    if (file.part == Part::legacy && read.isOk()) stored = std::min<std::int64_t>(stored, 0);
    if (file.part != Part::settings || !read.isOk()) continue;
    const auto* const version = read.value().find(footprint.versionKey);
    stored = version == nullptr ? stored : version->integerValue().value_or(stored);
  }
  return static_cast<std::size_t>(
      std::clamp<std::int64_t>(footprint.currentVersion - stored, 0, footprint.currentVersion));
}

// Everything that may keep a run from beginning. Answers the session of its snapshots; null where there is none.
std::unique_ptr<snapshots::SnapshotSession> prepare(const platform::DataClassMigrator& migrator, const Options& options,
                                                    RunRecorder& recorder) {
  commandline::progressLine().show({"the device's files are looked at"});
  recorder.expect(stepsAhead(migrator.footprint()));
  auto session = beginRunWithSnapshots(options, migrator);
  const platform::Status held = holdMigrationLock(migrator.footprint().lockName);
  if (!held.isOk()) {
    if (session) static_cast<void>(session->end({}, options.snapshots.keep));
    throw Ending{ExitStatus::refused, held.description() + "; the device was not touched"};
  }
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  return session;
}

std::vector<std::string> foretoldOf(const platform::DataClassMigrator& migrator, const Options& options) {
  const bool isAsked = (options.isCareful || options.refusesLoss) && !options.isRehearsal;
  return isAsked ? foretell(options, migrator.footprint().lockName) : std::vector<std::string>{};
}

ExitStatus perform(platform::DataClassMigrator& migrator, const Options& options, const Onlookers& onlookers) {
  ExplainedRun run{.dataClass = migrator.dataClassName(),
                   .isRehearsal = options.isRehearsal,
                   .version = HOST_VERSION,
                   .root = platform::current().directories->systemRoot(),
                   .time = now()};
  if (onlookers.trace) onlookers.trace->start(run.version, run.root, options.given, run.time);
  const auto foretold = foretoldOf(migrator, options);
  const auto session = prepare(migrator, options, *onlookers.recorder);
  run.success = migrator.performMigration();
  commandline::progressLine().end();

  const Explanation& explanation = onlookers.recorder->explanation();
  if (!explanation.isComplete()) say("memory ran out while the run was watched: what is said of it may be incomplete");
  Account account{explanation, verdictOf(explanation, session ? session->runSnapshot().string() : ""), run, foretold};
  endSession(session.get(), options.snapshots.keep, account);
  if (onlookers.trace) {
    onlookers.trace->result(run.dataClass, run.success, account.verdict);
    const platform::Status& traced = onlookers.trace->outcome();
    if (!traced.isOk()) say("the trace is incomplete: not every event could be written: " + traced.reason());
  }
  if (options.explain != Explain::notAsked &&
      !commandline::print(explanationOf(options.explain, account, migrator.footprint()))) {
    say("the explanation could not be written to standard output");
  }
  return statusOf(account, options.isStrict || (options.isRehearsal && options.refusesLoss));
}

// A plug-in that cannot be loaded is the run's to tell.
bool isNeeded(const Options& options) {
  platform::setCurrent(platform::makeLinuxPlatform(options.device));
  const auto loaded = loadMigrator(platform::current(), options.plugin ? *options.plugin : installedPlugin());
  const auto* const migrator = std::get_if<std::unique_ptr<platform::DataClassMigrator>>(&loaded);
  return migrator == nullptr || isRunNeeded(options.snapshots, **migrator);
}

}  // namespace

ExitStatus run(const Options& options) {
  if (options.snapshots.isIfNeeded && !isNeeded(options)) return ExitStatus::migrated;
  const Onlookers onlookers = onlookersFor(options);
  platform::setCurrent(platformFor(options, onlookers));
  if (isToBePrinted(options.snapshots)) {
    printFromSnapshots(options.snapshots, options.explain);
    return ExitStatus::migrated;
  }
  const auto migrator = load(options);  // first, so that nothing is touched where there is none
  if (isToBeChanged(options.snapshots)) {
    changeBySnapshots(options, *migrator);
    return ExitStatus::migrated;
  }
  if (options.isRehearsal) say("this is a rehearsal: nothing on the device is changed");
  return perform(*migrator, options, onlookers);
}

}  // namespace host
