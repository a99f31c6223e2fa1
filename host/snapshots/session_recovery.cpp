#include <unistd.h>

#include <algorithm>

#include "host/snapshots/problem.h"
#include "host/snapshots/snapshot_session.h"

namespace host::snapshots {
namespace {

constexpr const char* kRestored = "restored";

void addContents(const Manifest& manifest, KnownContents& known) {
  for (const KeptFile& file : manifest.files) known[file.path].insert(file.contents);
}

KnownContents contentsOfBoth(const Manifest& one, const Manifest& other) {
  KnownContents known;
  addContents(one, known);
  addContents(other, known);
  return known;
}

bool isSentinel(const Manifest& manifest, const Path& path) {
  return std::ranges::any_of(
      manifest.files, [&path](const KeptFile& file) { return file.path == path && file.part == Part::sentinel; });
}

KnownContents leftByRun(const Storage& storage, const Manifest& taken, const RunMark& mark) {
  KnownContents known = mark.left;
  addContents(taken, known);
  for (const Path& path : mark.made) {
    const FileState present = stateAt(storage, path, Part::settings);
    const bool isKept = present.contents != kAbsent && present.contents != kUnkept;
    // It may be there in part; it is still its maker's own then. A sentinel tells by its name alone, which a power cut
    // may have left to another file: where it stayed, the next run would delete legacy files that have just come back.
    const bool isOfRun = present.attributes.owner == ::geteuid() || isSentinel(taken, path);
    if (isKept && isOfRun) known[path].insert(present.contents);
  }
  for (const Path& path : mark.edited) known.erase(path);
  return known;
}

}  // namespace

void SnapshotSession::sayLeft(const std::vector<Path>& left) const {
  for (const Path& path : left) {
    _place.services.console->write(path.string() + " was changed by somebody else meanwhile and stays as it is");
  }
}

void SnapshotSession::requireOwnPaths(const Manifest& manifest) const {
  for (const KeptFile& file : manifest.files) {
    if (std::ranges::find(_place.footprint.files, file.path, &platform::MigrationFile::path) !=
        _place.footprint.files.end())
      continue;
    fail("snapshot " + manifest.id + " names " + file.path.string() + ", which no run changes");
  }
}

// A manifest names no other file than those that the plug-in tells of.
Manifest SnapshotSession::marked(const std::string& id) const {
  std::optional<Manifest> manifest = _store.undamagedManifest(id);
  if (!manifest) fail("snapshot " + id + ", of what died, is damaged or gone");
  requireOwnPaths(*manifest);
  return *std::move(manifest);
}

// With the files that the run made, which were not there before it, as far as they are where a run makes files.
Manifest SnapshotSession::withFilesMade(Manifest taken, const RunMark& mark) const {
  const platform::Result<Path> proposed = _place.services.files->temporaryName();
  const std::set<Path> places{_place.services.directories->systemRoot() / "var/mobile/tmp",
                              proposed.isOk() ? proposed.value().parent_path() : Path{}};
  KnownContents known;
  addContents(taken, known);
  for (const auto& [path, contents] : mark.left) {
    if (known.contains(path) || mark.edited.contains(path) || !places.contains(path.parent_path())) continue;
    KeptFile made;
    made.path = path;
    made.part = Part::settings;
    taken.files.push_back(std::move(made));
  }
  return taken;
}

void SnapshotSession::recover() {
  const std::optional<RunMark> mark = _journal.read();
  if (!mark) return;
  Manifest taken = marked(mark->snapshot);
  if (taken.outcome) {
    _journal.clear();
  } else if (mark->restores) {
    finishRestore(*mark, taken);
  } else {
    _place.services.console->write("A run died; the device goes back to snapshot " + taken.id);
    keepWhereLeft(taken, restoreBeforeRun(*mark, taken));
    _journal.clear();
  }
}

std::vector<Path> SnapshotSession::restoreBeforeRun(const RunMark& mark, const Manifest& taken) const {
  std::vector<Path> left = restoreFiles(_storage, _store, withFilesMade(taken, mark), leftByRun(_storage, taken, mark));
  sayLeft(left);
  return left;
}

void SnapshotSession::keepWhereLeft(Manifest& taken, const std::vector<Path>& left) const {
  if (left.empty()) return;
  for (const Path& path : left) taken.keptFor.push_back(path.string() + " was changed by somebody else meanwhile");
  _store.rewrite(taken);
}

void SnapshotSession::finishRestore(const RunMark& mark, Manifest before) {
  _place.services.console->write("A restore died; it is finished, to snapshot " + *mark.restores);
  const Manifest target = marked(*mark.restores);
  sayLeft(restoreFiles(_storage, _store, target, contentsOfBoth(target, before)));
  before.outcome = kRestored;
  finish(before);
}

void SnapshotSession::replaceBy(const Manifest& target, const Manifest& before) {
  const KnownContents known = contentsOfBoth(target, before);
  try {
    const std::vector<Path> left = restoreFiles(_storage, _store, target, known);
    if (!left.empty()) fail(left.front().string() + " was changed by somebody else during the restore");
  } catch (const Problem&) {
    static_cast<void>(restoreFiles(_storage, _store, before, known));
    _journal.clear();
    throw;
  }
}

std::string SnapshotSession::restore(const std::string& id) {
  const Manifest target = _store.manifest(id);
  requireFootprint();
  requireOwnPaths(target);
  const HeldLock migration = hold(*_place.services.locks, _place.footprint.lockName);
  _store.sweep();
  try {
    recover();
  } catch (const Problem& problem) {
    _place.warn(std::string{"what died before is not taken back first: "} + problem.what());
  }
  _place.progressed("the snapshot's copies are verified", 0.1, 0.3);
  for (const KeptFile& file : target.files) {
    if (file.hasCopy()) static_cast<void>(_store.copyOf(target, file));
  }
  _place.progressed("the present state is kept", 0.3, 0.6);
  makeWay();
  Manifest before = snapshotFor(description(Manifest::kRestore));
  _journal.begin(before.id, id);
  _place.progressed("the files are brought back", 0.6, 1);
  replaceBy(target, before);
  before.outcome = kRestored;
  finish(before);
  return before.id;
}

}  // namespace host::snapshots
