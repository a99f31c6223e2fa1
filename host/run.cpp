#include "host/run.h"

#include <unistd.h>

#include <memory>
#include <utility>

#include "commandline/ending.h"
#include "commandline/text.h"
#include "host/explanation_output.h"
#include "host/migration_lock.h"
#include "host/plugin.h"
#include "host/rehearsal.h"
#include "host/run_watch.h"
#include "host/say.h"
#include "host/snapshot_steps.h"
#include "host/trace.h"
#include "host/traced_services.h"
#include "platform/silent_services.h"
#include "platform/temporary_directory.h"

namespace host {
namespace {

using commandline::Ending;

// What watches a run from outside. The watch is null where nobody asks for anything that it could tell.
struct Watchers {
  std::shared_ptr<Trace> trace;
  std::shared_ptr<ProgressLine> progress = std::make_shared<ProgressLine>(STDERR_FILENO);
  std::shared_ptr<RunWatch> watch;
};

// The trace that is asked for; null where none is.
std::shared_ptr<Trace> openTrace(const Options& options) {
  if (!options.trace) return nullptr;
  auto opened = Trace::open(*options.trace);
  if (opened.isOk()) return opened.take();
  throw Ending{ExitStatus::wrongUse, opened.status().description()};
}

Watchers watchersFor(const Options& options) {
  Watchers watchers;
  watchers.trace = openTrace(options);
  const bool isExplained = options.explain != Explain::notAsked;
  const bool isKept = options.snapshots.directory.has_value();  // with the snapshot
  if (isExplained || isKept || watchers.progress->isOnTerminal()) {
    watchers.watch =
        std::make_shared<RunWatch>(isExplained ? watchers.trace : nullptr, isExplained || isKept, watchers.progress);
  }
  return watchers;
}

// A device image is none of the business of the programs that run on this machine.
void silenceNotices(platform::Platform& platform) {
  platform.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  platform.cloudTabs = std::make_shared<platform::SilentCloudTabsNotice>();
}

platform::Platform platformFor(const Options& options, const Watchers& watchers) {
  auto platform = platform::makeLinuxPlatform(options.device);
  if (options.isRehearsal) rehearseOn(platform);
  if (platform.directories->systemRoot().lexically_normal() != "/") silenceNotices(platform);
  if (watchers.trace) traceServices(platform, watchers.trace);
  putConsoleInFrontOf(watchers.progress, platform);
  platform.observer = watchers.watch;
  return platform;
}

std::unique_ptr<platform::DataClassMigrator> load(const Options& options) {
  auto loaded = loadMigrator(platform::current(), options.plugin ? *options.plugin : installedPlugin());
  if (const auto* const error = std::get_if<std::string>(&loaded)) throw Ending{ExitStatus::noPlugin, *error};
  return std::get<std::unique_ptr<platform::DataClassMigrator>>(std::move(loaded));
}

void explain(const Options& options, const Watchers& watchers, const Outcome& outcome) {
  if (options.explain == Explain::notAsked) return;
  const Explanation& explanation = watchers.watch->explanation();
  const std::string text = options.explain == Explain::json ? jsonDocumentOf(explanation, outcome)
                                                            : commandline::printableLines(textOf(explanation, outcome));
  if (!commandline::print(text)) say("the explanation could not be written to standard output");
}

bool isSaved(const Explanation& explanation) {
  const platform::RunFact* const save = explanation.lastSave();
  return save == nullptr || save->kind != platform::RunFact::Kind::saveFailed;
}

snapshots::RunEnd endOf(const Explanation& explanation, const Outcome& outcome) {
  snapshots::RunEnd end{.isMigrated = outcome.success,
                        .isSaved = isSaved(explanation),
                        .onlyInSnapshot = {},
                        .explanation = textOf(explanation, outcome),
                        .explanationAsJson = jsonDocumentOf(explanation, outcome)};
  for (const std::string& file : explanation.lostFiles()) end.onlyInSnapshot.push_back("the accounts of " + file);
  return end;
}

// Everything that may keep a run from beginning. Answers the session of its snapshots; null where there is none.
std::unique_ptr<snapshots::SnapshotSession> prepare(const platform::DataClassMigrator& migrator,
                                                    const Options& options) {
  auto session = beginRunWithSnapshots(options, migrator);
  const platform::Status held = holdMigrationLock(migrator.footprint().lockName);
  if (!held.isOk()) {
    if (session) static_cast<void>(session->end({}, options.snapshots.keep));
    throw Ending{ExitStatus::refused, held.description() + "; the device was not touched"};
  }
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  if (options.isRehearsal) say("this is a rehearsal: nothing on the device is changed");
  return session;
}

ExitStatus perform(platform::DataClassMigrator& migrator, const Options& options, const Watchers& watchers) {
  const auto session = prepare(migrator, options);
  const bool success = migrator.performMigration();
  watchers.progress->clear();
  const Outcome outcome{.dataClass = migrator.dataClassName(), .success = success, .isRehearsal = options.isRehearsal};
  auto ended = snapshots::Ended::asItIs;
  if (session) ended = session->end(endOf(watchers.watch->explanation(), outcome), options.snapshots.keep);
  if (watchers.trace) {
    watchers.trace->result(migrator.dataClassName(), success);
    if (!watchers.trace->complete()) say("the trace is incomplete: not every event could be written");
  }
  explain(options, watchers, outcome);
  if (ended == snapshots::Ended::rolledBack) {
    say("the accounts could not be saved; the device is as it was before the run");
    return ExitStatus::notSaved;
  }
  return success ? ExitStatus::migrated : ExitStatus::notMigrated;
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
  const Watchers watchers = watchersFor(options);
  platform::setCurrent(platformFor(options, watchers));
  if (isToBePrinted(options.snapshots)) {
    printFromSnapshots(options.snapshots, options.explain);
    return ExitStatus::migrated;
  }
  const auto migrator = load(options);  // first, so that nothing is touched where there is none
  if (isToBeChanged(options.snapshots)) {
    changeBySnapshots(options, *migrator);
    return ExitStatus::migrated;
  }
  return perform(*migrator, options, watchers);
}

}  // namespace host
