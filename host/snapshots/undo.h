#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "host/snapshots/bring_back.h"
#include "host/snapshots/snapshot_directory.h"
#include "host/snapshots/watched_files.h"
#include "platform/platform.h"

namespace host::snapshots {

// What the snapshots are worked on with, and where.
struct UndoPlace {
  platform::Platform services;
  std::shared_ptr<platform::FileKeeper> keeper;
  Path directory;                                // without a slash at its end
  std::string release;                           // of the host
  std::function<void(const std::string&)> warn;  // a line for people, on standard error
};

// Runs that can be undone, and undoing them. One object holds the lock of the snapshots' directory as long as it lives,
// and does one thing: a run (begin, the plug-in, end) or a restore. Every call but `end` throws a Problem where it
// fails.
class Undo {
 public:
  // Waits for the directory's lock. A directory of another device is wrong use.
  Undo(UndoPlace place, Missing missing);

  // Brings the device back from a run that died, takes the snapshot and sets the mark, under the migration lock.
  // Answers the files to give to the plug-in.
  [[nodiscard]] std::shared_ptr<platform::FileSystem> begin(const platform::MigrationFootprint& footprint);

  // Ends the run that was begun: says what only the snapshot still has, takes the mark away and removes all but the
  // newest snapshots. What fails here is said; it changes nothing about the run.
  void end(bool migrated, std::size_t count);

  // Brings the device back to a snapshot, under the migration lock. Answers the identifier of the snapshot that has the
  // state before. On failure the device is as it was.
  [[nodiscard]] std::string restore(const std::string& id);

 private:
  using HeldLock = std::unique_ptr<platform::ExclusiveFileLock>;

  [[nodiscard]] static HeldLock hold(platform::ExclusiveFileLocks& locks, const std::string& name);
  void requireSameDevice() const;
  [[nodiscard]] Manifest marked(const std::string& id) const;
  [[nodiscard]] Manifest description(const platform::MigrationFootprint& footprint, const char* reason) const;
  [[nodiscard]] std::optional<std::int64_t> dataVersion(const Manifest& manifest) const;
  [[nodiscard]] Manifest snapshotFor(Manifest description) const;
  [[nodiscard]] bool isStillTrue(const Manifest& newest, const Manifest& description) const;

  void recover();
  void takeBack(const RunMark& mark, Manifest taken);
  void finishRestore(const RunMark& mark, const Manifest& before);
  void sayLeft(const std::vector<Path>& left) const;

  void replaceBy(const Manifest& target, const Manifest& before);
  void finish(Manifest manifest, const char* outcome);
  [[nodiscard]] std::vector<Path> legacyFilesGone() const;
  void sayWhatOnlyTheSnapshotHas(const std::vector<Path>& gone) const;

  UndoPlace _place;
  Storage _storage;
  DevicePlace _device;
  SnapshotStore _store;
  RunJournal _journal;
  HeldLock _lock;
  Manifest _run;  // the snapshot of the run that was begun
  std::shared_ptr<WatchedFiles> _watched;
};

}  // namespace host::snapshots
