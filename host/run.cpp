#include "host/run.h"

#include <unistd.h>

#include <memory>
#include <utility>

#include "commandline/ending.h"
#include "commandline/text.h"
#include "host/explanation_output.h"
#include "host/plugin.h"
#include "host/rehearsal.h"
#include "host/run_watch.h"
#include "host/say.h"
#include "host/snapshot_steps.h"
#include "host/trace.h"
#include "host/traced_services.h"
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
  if (isExplained || watchers.progress->isOnTerminal()) {
    watchers.watch = std::make_shared<RunWatch>(watchers.trace, isExplained, watchers.progress);
  }
  return watchers;
}

platform::Platform platformFor(const Options& options, const Watchers& watchers) {
  auto platform = platform::makeLinuxPlatform(options.device);
  if (options.isRehearsal) rehearseOn(platform, options.device.lockDirectory);
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

bool perform(platform::DataClassMigrator& migrator, const SnapshotOptions& options, const Watchers& watchers) {
  const auto undo = beginUndoableRun(options, migrator);
  const bool success = migrator.performMigration();
  watchers.progress->clear();
  if (undo) undo->end(success, options.keep);
  if (watchers.trace) {
    watchers.trace->result(migrator.dataClassName(), success);
    if (!watchers.trace->complete()) say("the trace is incomplete: not every event could be written");
  }
  return success;
}

void explain(const Options& options, const Watchers& watchers, const Outcome& outcome) {
  if (options.explain == Explain::notAsked) return;
  const Explanation& explanation = watchers.watch->explanation();
  const std::string text = options.explain == Explain::json ? jsonDocumentOf(explanation, outcome)
                                                            : commandline::printableLines(textOf(explanation, outcome));
  if (!commandline::print(text)) say("the explanation could not be written to standard output");
}

}  // namespace

ExitStatus run(const Options& options) {
  const Watchers watchers = watchersFor(options);
  platform::setCurrent(platformFor(options, watchers));
  if (isForSnapshots(options.snapshots)) return workOnSnapshots(options.snapshots);
  const auto migrator = load(options);  // first, so that nothing is touched where there is none
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  if (options.isRehearsal) say("this is a rehearsal: nothing on the device is changed");
  const bool success = perform(*migrator, options.snapshots, watchers);
  explain(options, watchers,
          {.dataClass = migrator->dataClassName(), .success = success, .isRehearsal = options.isRehearsal});
  return success ? ExitStatus::migrated : ExitStatus::notMigrated;
}

}  // namespace host
