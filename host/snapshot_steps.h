#pragma once

#include <memory>

#include "host/run.h"
#include "host/snapshots/undo.h"

namespace host {

// What the process's platform and the command line make of the snapshots. All throw snapshots::Problem.

// Takes the snapshot that a run goes back to, and lets the plug-in change the device's files only with that noted. Null
// where no snapshots are asked for.
[[nodiscard]] std::unique_ptr<snapshots::Undo> beginUndoableRun(const SnapshotOptions& options,
                                                                const platform::DataClassMigrator& migrator);

// Whether a list or a restore is asked for in place of a run.
[[nodiscard]] bool isForSnapshots(const SnapshotOptions& options);
[[nodiscard]] ExitStatus workOnSnapshots(const SnapshotOptions& options);

}  // namespace host
