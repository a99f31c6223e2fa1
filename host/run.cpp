#include "host/run.h"

#include <algorithm>
#include <chrono>
#include <memory>
#include <utility>

#include "commandline/ending.h"
#include "commandline/program.h"
#include "commandline/progress_line.h"
#include "host/explanation.h"
#include "host/explanation_page.h"
#include "host/foretelling.h"
#include "host/keeping_files.h"
#include "host/metrics.h"
#include "host/migration_lock.h"
#include "host/plugin.h"
#include "host/rehearsal.h"
#include "host/run_mark.h"
#include "host/run_recorder.h"
#include "host/say.h"
#include "host/snapshot_steps.h"
#include "host/sweeping.h"
#include "host/trace.h"
#include "host/verdict.h"
#include "platform/base_directories.h"

namespace host {
namespace {

using commandline::Ending;
using Clock = std::chrono::system_clock;

double secondsOf(Clock::duration duration) { return std::chrono::duration<double>{duration}.count(); }

// What looks on at a run from outside; the trace is null where none is asked for.
struct Onlookers {
  std::shared_ptr<Trace> trace;
  std::shared_ptr<RunRecorder> recorder;
};

Onlookers onlookersFor(const Options& options) {
  Onlookers onlookers;
  if (options.trace) {
    auto opened = Trace::open(*options.trace);
    if (!opened.isOk()) throw Ending{ExitStatus::wrongUse, opened.status().description()};
    onlookers.trace = opened.take();
  }
  const bool isExplained = options.explain != Explain::notAsked;
  onlookers.recorder = std::make_shared<RunRecorder>(isExplained ? onlookers.trace : nullptr);
  return onlookers;
}

// A device image is none of the business of the programs that run on this machine.
platform::Platform platformFor(const Options& options, const Onlookers& onlookers) {
  auto platform = platform::makeLinuxPlatform(options.device);
  if (options.isRehearsal) rehearseOn(platform);
  if (platform.directories->systemRoot().lexically_normal() != "/") silenceNotices(platform);
  if (onlookers.trace) traceServices(platform, onlookers.trace);
  putConsoleAroundProgress(platform);
  platform.observer = onlookers.recorder;
  return platform;
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

// Ends the session of the snapshots, where there is one; what is rolled back is lost no longer.
void endSession(snapshots::SnapshotSession* session, std::size_t keep, Account& account) {
  if (session == nullptr) return;
  Verdict& verdict = account.verdict;
  snapshots::RunEnd end{.isMigrated = account.run.success,
                        .isSaved = verdict.kind != Verdict::Kind::notSaved,
                        .onlyInSnapshot = {},
                        .explanation = account.asText(),
                        .explanationAsJson = account.asJson()};
  for (const records::Lost& lost : verdict.lost) {
    if (lost.where == session->runSnapshot()) end.onlyInSnapshot.push_back(textOf(lost));
  }
  if (verdict.lost.empty()) end.onlyInSnapshot = account.foretold;
  if (session->end(end, keep) != snapshots::Ended::rolledBack) return;
  say("the accounts could not be saved; the device is as it was before the run");
  verdict.lost.clear();
}

// On the console, without a word where everything was kept. What a snapshot is kept for, its session says.
void sayVerdict(const Verdict& verdict, bool hasSnapshot) {
  constexpr std::size_t kMaxWarnings = 40;
  if (hasSnapshot && verdict.kind == Verdict::Kind::lost) return;
  const std::vector<std::string> warnings = warningsOf(verdict);
  for (std::size_t place = 0; place < std::min(warnings.size(), kMaxWarnings); ++place) say(warnings[place]);
  if (warnings.size() > kMaxWarnings) {
    say("and " + std::to_string(warnings.size() - kMaxWarnings) + " more losses, which --explain and --trace name");
  }
}

std::string explanationOf(Explain how, const Account& account, const platform::MigrationFootprint& footprint) {
  switch (how) {
    case Explain::notAsked: return {};
    case Explain::text: return account.asText();
    case Explain::json: return account.asJson();
    case Explain::html: break;
  }
  const auto settings = platform::current().propertyLists->readDictionary(settingsIn(footprint));
  return pageOf(account.asJson(), accountsIn(settings.valueOr({})));
}

// Tells of the run in every way that is asked for. Answers whether all of it was written.
bool tell(const Options& options, const Onlookers& onlookers, const Account& account,
          const platform::MigrationFootprint& footprint) {
  bool isTold = true;
  const auto miss = [&isTold](const std::string& what) {
    say(what);
    isTold = false;
  };
  if (onlookers.trace) {
    onlookers.trace->result(account.run.dataClass, account.run.success, account.verdict);
    const platform::Status& traced = onlookers.trace->outcome();
    if (!traced.isOk()) miss("the trace is incomplete: not every event could be written: " + traced.reason());
  }
  if (options.metrics) {
    const std::string text =
        metricsOf(account.explanation, account.verdict, account.run, secondsOf(Clock::now().time_since_epoch()));
    const platform::Status written = writeMetrics(*options.metrics, text, *platform::current().directories);
    if (!written.isOk()) miss("the metrics could not be written: " + written.description());
  }
  if (options.explain != Explain::notAsked && !commandline::print(explanationOf(options.explain, account, footprint))) {
    miss("the explanation could not be written to standard output");
  }
  return isTold;
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

// Reads the files that the run will work on. Answers how many version steps it has ahead, as its progress needs them.
std::size_t stepsAhead(const platform::MigrationFootprint& footprint) {
  using Part = platform::MigrationFile::Part;
  std::int64_t stored = footprint.currentVersion;
  for (const platform::MigrationFile& file : footprint.files) {
    if (file.part == Part::other) continue;
    const auto read = platform::current().propertyLists->readDictionary(file.path);
    if (read.status().cause() == platform::Cause::unsafe) {
      // To the plug-in such a file counts as missing: what is in it would be gone.
      throw Ending{ExitStatus::refused,
                   file.path.string() + " may have been planted (" + read.status().reason() +
                       "); put the file itself there, with no second name, and run again; the device was not touched"};
    }
    if (file.part == Part::legacy && read.isOk()) stored = std::min<std::int64_t>(stored, 0);
    if (file.part != Part::settings || !read.isOk()) continue;
    const auto* const version = read.value().find(footprint.versionKey);
    stored = version == nullptr ? stored : version->integerValue().value_or(stored);
  }
  return static_cast<std::size_t>(
      std::clamp<std::int64_t>(footprint.currentVersion - stored, 0, footprint.currentVersion));
}

void refuseUnkept(const char* what, const platform::Status& kept) {
  if (kept.isOk()) return;
  throw Ending{ExitStatus::refused,
               what + std::string{", and cannot be kept: "} + kept.description() + "; the device was not touched"};
}

// No run takes away what one that was killed left to go back to, and without snapshots the plug-in takes away no
// account that stands nowhere else. What cannot be kept ends the run.
void keepWhatWouldGo(const platform::MigrationFootprint& footprint, const Options& options, const RunRecorder& recorder,
                     RunMark& mark) {
  const bool isAfterDeath = mark.isLeft() && mayMissSteps(footprint);
  if (!isAfterDeath && options.snapshots.directory) return;
  snapshots::Storage storage = storageFor(options);
  const auto keeping = std::make_shared<KeepingFiles>(std::move(storage.files), std::move(storage.keeper), footprint,
                                                      recorder.explanation());
  if (isAfterDeath) {
    refuseUnkept("the copy of the settings is from before a run that was killed", keeping->keepCopyOfKilledRun());
  }
  if (options.snapshots.directory) return;
  refuseUnkept("the settings file is of no use to this run", keeping->keepUnusableSettings());
  platform::Platform services = platform::current();
  services.files = keeping;
  platform::setCurrent(std::move(services));
}

// Everything that may keep a run from beginning. Answers the session of its snapshots; null where there is none.
std::unique_ptr<snapshots::SnapshotSession> prepare(const platform::DataClassMigrator& migrator, const Options& options,
                                                    RunRecorder& recorder, RunMark& mark, Clock::time_point start) {
  commandline::progressLine().show({"the device's files are looked at"});
  const platform::MigrationFootprint footprint = migrator.footprint();
  const std::size_t steps = stepsAhead(footprint);
  recorder.expect(steps);
  auto session = beginRunWithSnapshots(options, migrator);
  const platform::Status held = holdMigrationLock(footprint.lockName);
  if (!held.isOk()) {
    if (session) static_cast<void>(session->end({}, options.snapshots.keep));
    throw Ending{ExitStatus::refused, held.description() + "; the device was not touched"};
  }
  keepWhatWouldGo(footprint, options, recorder, mark);
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  sweepTemporaryFiles(storageFor(options), start);
  if (steps > 0 && !session) mark.set();
  return session;
}

ExitStatus perform(platform::DataClassMigrator& migrator, const Options& options, const Onlookers& onlookers) {
  const Clock::time_point start = Clock::now();
  ExplainedRun run{.dataClass = migrator.dataClassName(),
                   .isRehearsal = options.isRehearsal,
                   .version = HOST_VERSION,
                   .root = platform::current().directories->systemRoot(),
                   .time = snapshots::universalTime(start)};
  if (onlookers.trace) onlookers.trace->start(run.version, run.root, options.given, run.time);
  const bool isForetold = (options.isCareful || options.refusesLoss) && !options.isRehearsal;
  const auto foretold = isForetold ? foretell(options, migrator.footprint().lockName) : std::vector<std::string>{};
  RunMark mark{storageFor(options)};
  const auto session = prepare(migrator, options, *onlookers.recorder, mark, start);
  run.success = migrator.performMigration();
  mark.remove();
  run.seconds = secondsOf(Clock::now() - start);
  commandline::progressLine().end();

  const Explanation& explanation = onlookers.recorder->explanation();
  if (!explanation.isComplete()) say("memory ran out while the run was watched: what is said of it may be incomplete");
  Account account{explanation, verdictOf(explanation, session ? session->runSnapshot().string() : ""), run, foretold};
  endSession(session.get(), options.snapshots.keep, account);
  sayVerdict(account.verdict, session != nullptr);
  const bool isTold = tell(options, onlookers, account, migrator.footprint());
  const ExitStatus status = statusOf(account, options.isStrict || (options.isRehearsal && options.refusesLoss));
  return status == ExitStatus::migrated && !isTold ? ExitStatus::untold : status;
}

}  // namespace

ExitStatus run(const Options& options) {
  if (options.snapshots.isIfNeeded) {
    platform::setCurrent(platform::makeLinuxPlatform(options.device));
    const auto plugin = loadMigrator(platform::current(), options.plugin);  // its failure is the run's to tell
    if (plugin.isOk() && !isRunNeeded(options.snapshots, *plugin.value())) return ExitStatus::migrated;
  }
  const Onlookers onlookers = onlookersFor(options);
  platform::setCurrent(platformFor(options, onlookers));
  if (isToBePrinted(options.snapshots)) {
    return printFromSnapshots(options.snapshots, options.explain) ? ExitStatus::migrated : ExitStatus::untold;
  }
  // First, so that nothing is touched where there is none.
  const auto plugin = loadMigrator(platform::current(), options.plugin);
  if (!plugin.isOk()) throw Ending{ExitStatus::noPlugin, plugin.status().reason()};
  platform::DataClassMigrator& migrator = *plugin.value();
  if (isToBeChanged(options.snapshots)) {
    changeBySnapshots(options, migrator);
    return ExitStatus::migrated;
  }
  if (options.isRehearsal) say("this is a rehearsal: nothing on the device is changed");
  return perform(migrator, options, onlookers);
}

}  // namespace host
