#pragma once

#include <filesystem>
#include <memory>

#include "host/options.h"
#include "host/snapshots/snapshot_session.h"

namespace host {

// What the process's platform and the command line make of the snapshots. All throw snapshots::Problem.

// What the run's files are read and kept through; of a rehearsal, its own.
[[nodiscard]] snapshots::Storage storageFor(const Options& options);

// Begins a run, or its rehearsal: takes the snapshot that the run goes back to, and lets the plug-in change the
// device's files only with that noted. Null where no snapshots are asked for.
[[nodiscard]] std::unique_ptr<snapshots::SnapshotSession> beginRunWithSnapshots(
    const Options& options, const platform::DataClassMigrator& migrator);

// Whether a run has anything to do; see docs/SNAPSHOTS.md.
[[nodiscard]] bool isRunNeeded(const SnapshotOptions& options, const platform::DataClassMigrator& migrator);

// Whether something is to be printed in place of a run, and that; answers whether it was written.
[[nodiscard]] bool isToBePrinted(const SnapshotOptions& options);
[[nodiscard]] bool printFromSnapshots(const SnapshotOptions& options, Explain explain);

// Whether a snapshot is to be restored or released in place of a run, and that.
[[nodiscard]] bool isToBeChanged(const SnapshotOptions& options);
void changeBySnapshots(const Options& options, const platform::DataClassMigrator& migrator);

}  // namespace host
