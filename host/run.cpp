#include "host/run.h"

#include <memory>
#include <utility>

#include "host/plugin.h"
#include "host/say.h"
#include "host/snapshot_steps.h"
#include "host/snapshots/problem.h"
#include "host/trace.h"
#include "host/traced_services.h"
#include "platform/temporary_directory.h"

namespace host {
namespace {

// Ends a run before it began, with what is said of it.
struct Refusal {
  ExitStatus status;
};

ExitStatus perform(platform::DataClassMigrator& migrator, const SnapshotOptions& options, Trace* trace) {
  const auto undo = beginUndoableRun(options, migrator);
  const bool success = migrator.performMigration();
  if (undo) undo->end(success, options.keep);
  if (trace != nullptr) trace->result(migrator.dataClassName(), success);
  if (trace != nullptr && !trace->complete()) say("the trace is incomplete: not every event could be written");
  return success ? ExitStatus::migrated : ExitStatus::notMigrated;
}

// The trace that is asked for; null where none is.
std::shared_ptr<Trace> openTrace(const Options& options) {
  if (!options.trace) return nullptr;
  auto opened = Trace::open(*options.trace);
  if (opened.isOk()) return opened.take();
  say(opened.status().description());
  throw Refusal{ExitStatus::wrongUse};
}

std::unique_ptr<platform::DataClassMigrator> load(const Options& options) {
  auto loaded = loadMigrator(platform::current(), options.plugin ? *options.plugin : installedPlugin());
  if (const auto* const error = std::get_if<std::string>(&loaded)) {
    say(*error);
    throw Refusal{ExitStatus::noPlugin};
  }
  return std::get<std::unique_ptr<platform::DataClassMigrator>>(std::move(loaded));
}

ExitStatus runInSteps(const Options& options) {
  auto platform = platform::makeLinuxPlatform(options.device);
  const std::shared_ptr<Trace> trace = openTrace(options);
  if (trace) traceServices(platform, trace);
  platform::setCurrent(std::move(platform));
  if (isForSnapshots(options.snapshots)) return workOnSnapshots(options.snapshots);
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  const auto migrator = load(options);
  return perform(*migrator, options.snapshots, trace.get());
}

}  // namespace

ExitStatus run(const Options& options) {
  try {
    return runInSteps(options);
  } catch (const Refusal& refusal) {
    return refusal.status;
  } catch (const snapshots::Problem& problem) {
    say(problem.what());
    return problem.kind() == snapshots::Problem::Kind::wrongUse ? ExitStatus::wrongUse : ExitStatus::noSnapshot;
  }
}

}  // namespace host
