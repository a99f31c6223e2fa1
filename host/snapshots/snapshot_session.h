#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "host/snapshots/release_stamp.h"
#include "host/snapshots/restoring.h"
#include "host/snapshots/snapshot_directory.h"
#include "host/snapshots/watched_files.h"
#include "platform/platform.h"

namespace host::snapshots {

// What the snapshots are worked on with, and where.
struct SessionPlace {
  platform::Platform services;
  std::shared_ptr<platform::FileKeeper> keeper;
  std::shared_ptr<platform::ExclusiveFileLocks> locks;  // in the directory
  Path directory;                                       // without a slash at its end
  platform::MigrationFootprint footprint;               // of the plug-in: nothing else is restored
  std::string release;                                  // of the host
  std::function<void(const std::string&)> warn;         // a line for people, on standard error
  // Takes what no run can read out of the place of a file with accounts, and tells where it is kept.
  std::function<platform::Status(const Storage&, const platform::MigrationFile&, const std::string& why)> putAside;
  // How far a restore is: what it does, the share of it that is done, and the one at which that ends.
  std::function<void(const char*, double, double)> progressed = [](const char*, double, double) {};
};

// How a run ended, as the host knows it.
struct RunEnd {
  bool isMigrated = false;
  bool isSaved = true;
  std::vector<std::string> onlyInSnapshot;  // what is nowhere else from now on, a line each
  std::string explanation;                  // for people
  std::string explanationAsJson;
};

enum class Ended : std::uint8_t {
  asItIs,
  rolledBack,  // the device is as it was before the run
};

// Runs with a way back, and restores. One object holds the lock of the snapshots' directory as long as it lives, and
// does one thing: a run (begin, the plug-in, end), its rehearsal, a restore or a release. Every call but `end` throws a
// Problem where it fails.
class SnapshotSession {
 public:
  // Waits for the directory's lock. A directory of another device, and one that holds something else, is wrong use.
  SnapshotSession(SessionPlace place, Missing missing);

  // Recovers the device from a run that died, takes the snapshot and sets the mark, under the migration lock. Answers
  // the files to give to the plug-in.
  [[nodiscard]] std::shared_ptr<platform::FileSystem> begin();

  // Does to the place's files, which are those of a rehearsal, what `begin` does to the device's ahead of a run, but
  // for the snapshot. Fails where a run would.
  void rehearse();

  // Where the snapshot of the run that was begun lies.
  [[nodiscard]] Path runSnapshot() const { return _place.directory / _run.id; }

  // Ends the run that was begun. One that could not save is rolled back; of one that changed nothing no snapshot stays;
  // any other keeps its explanation, and, where accounts are nowhere else, is kept until it is released. Sets the stamp
  // and removes all but the newest snapshots. What fails here is said; it changes nothing about the run.
  Ended end(const RunEnd& end, std::size_t count);

  // Restores a snapshot, under the migration lock. Answers the identifier of the snapshot that has the state before. On
  // failure the device is as it was.
  [[nodiscard]] std::string restore(const std::string& id);

  // The snapshot that is meant by the text, or by nothing: the one from before the last run that changed something.
  [[nodiscard]] std::string identifierMeantBy(const std::optional<std::string>& text) const;

  // Lets the count decide over a snapshot that was kept beyond it. One that was not is wrong use.
  void release(const std::string& id) const;

 private:
  using HeldLock = std::unique_ptr<platform::ExclusiveFileLock>;

  void makeWay() const;
  [[nodiscard]] static HeldLock hold(platform::ExclusiveFileLocks& locks, const std::string& name);
  void requireSameDevice() const;
  void requireFootprint() const;
  void requireOwnPaths(const Manifest& manifest) const;
  [[nodiscard]] Manifest marked(const std::string& id) const;
  [[nodiscard]] Manifest description(const char* reason) const;
  [[nodiscard]] Manifest snapshotFor(Manifest description) const;
  [[nodiscard]] bool isStillTrue(const Manifest& newest, const Manifest& description) const;

  void recover();
  [[nodiscard]] std::vector<Path> restoreBeforeRun(const RunMark& mark, const Manifest& taken) const;
  void keepWhereLeft(Manifest& taken, const std::vector<Path>& left) const;
  [[nodiscard]] Manifest withFilesMade(Manifest taken, const RunMark& mark) const;
  void finishRestore(const RunMark& mark, Manifest before);
  void sayLeft(const std::vector<Path>& left) const;

  void replaceBy(const Manifest& target, const Manifest& before);
  [[nodiscard]] bool hasChangedNothing() const;
  void discardRun();
  [[nodiscard]] Ended rollBack();
  void keepRun(const RunEnd& end);
  void sayWhatOnlyTheSnapshotHas() const;
  void finish(const Manifest& manifest);
  void boundKept() const;
  void attempt(const std::function<void()>& step) const;

  SessionPlace _place;
  Storage _storage;
  DevicePlace _device;
  SnapshotStore _store;
  RunJournal _journal;
  HeldLock _lock;
  bool _isThere = true;  // the directory
  Manifest _run;         // the snapshot of the run that was begun
  std::shared_ptr<WatchedFiles> _watched;
};

inline constexpr const char* kExplanation = "explanation";
inline constexpr const char* kExplanationAsJson = "explanation.json";

}  // namespace host::snapshots
