#include <unistd.h>

#include "host/snapshots/problem.h"
#include "host/snapshots/undo.h"

namespace host::snapshots {
namespace {

[[noreturn]] void fail(const std::string& text) { throw Problem{Problem::Kind::failed, text}; }

platform::MigrationFootprint footprintOf(const Manifest& manifest) {
  platform::MigrationFootprint footprint{.lockName = manifest.lockName, .versionKey = manifest.versionKey, .files = {}};
  for (const KeptFile& file : manifest.files) footprint.files.push_back({file.part, file.path});
  return footprint;
}

void addContents(const Manifest& manifest, KnownContents& known) {
  for (const KeptFile& file : manifest.files) known[file.path].insert(file.contents);
}

KnownContents contentsOfBoth(const Manifest& one, const Manifest& other) {
  KnownContents known;
  addContents(one, known);
  addContents(other, known);
  return known;
}

// With the files that the run made, which were not there before it.
Manifest withFilesMade(Manifest taken, const RunMark& mark) {
  KnownContents known;
  addContents(taken, known);
  for (const auto& [path, contents] : mark.left) {
    if (known.contains(path) || mark.edited.contains(path)) continue;
    KeptFile made;
    made.path = path;
    taken.files.push_back(std::move(made));
  }
  return taken;
}

// A file that the run was making may be there in part; it is still the maker's own then.
bool isPartOfWhatWasMade(const Look& present) {
  return present.contents != kAbsent && present.contents != kNoFile && present.attributes.owner == ::geteuid();
}

KnownContents leftByRun(const Storage& storage, const Manifest& taken, const RunMark& mark) {
  KnownContents known = mark.left;
  addContents(taken, known);
  for (const Path& path : mark.made) {
    const Look present = lookAt(storage, path);
    if (isPartOfWhatWasMade(present)) known[path].insert(present.contents);
  }
  for (const Path& path : mark.edited) known.erase(path);
  return known;
}

}  // namespace

void Undo::sayLeft(const std::vector<Path>& left) const {
  for (const Path& path : left) {
    _place.services.console->write(path.string() + " was changed by somebody else meanwhile and stays as it is");
  }
}

Manifest Undo::marked(const std::string& id) const {
  std::optional<Manifest> manifest = _store.undamagedManifest(id);
  if (!manifest) fail("snapshot " + id + ", of what died, is damaged or gone");
  return *std::move(manifest);
}

void Undo::recover() {
  const std::optional<RunMark> mark = _journal.read();
  if (!mark) return;
  Manifest taken = marked(mark->snapshot);
  if (taken.outcome) {
    _journal.clear();
  } else if (mark->restores) {
    finishRestore(*mark, taken);
  } else {
    takeBack(*mark, std::move(taken));
  }
}

void Undo::takeBack(const RunMark& mark, Manifest taken) {
  _place.services.console->write("A run died; the device goes back to snapshot " + taken.id);
  const std::vector<Path> left =
      bringBack(_storage, _store, withFilesMade(taken, mark), leftByRun(_storage, taken, mark));
  sayLeft(left);
  taken.isKept = taken.isKept || !left.empty();
  if (taken.isKept) _store.rewrite(taken);
  _journal.clear();
}

void Undo::finishRestore(const RunMark& mark, const Manifest& before) {
  _place.services.console->write("A restore died; it is finished, to snapshot " + *mark.restores);
  const Manifest target = marked(*mark.restores);
  sayLeft(bringBack(_storage, _store, target, contentsOfBoth(target, before)));
  finish(before, "restored");
}

void Undo::replaceBy(const Manifest& target, const Manifest& before) {
  const KnownContents known = contentsOfBoth(target, before);
  try {
    const std::vector<Path> left = bringBack(_storage, _store, target, known);
    if (!left.empty()) fail(left.front().string() + " was changed by somebody else during the restore");
  } catch (const Problem&) {
    static_cast<void>(bringBack(_storage, _store, before, known));
    _journal.clear();
    throw;
  }
}

std::string Undo::restore(const std::string& id) {
  const Manifest target = _store.manifest(id);
  const HeldLock migration = hold(*_place.services.locks, target.lockName);
  _store.sweep();
  try {
    recover();
  } catch (const Problem& problem) {
    _place.warn(std::string{"what died before is not taken back first: "} + problem.what());
  }
  for (const KeptFile& file : target.files) {
    if (file.isPresent()) static_cast<void>(_store.copyOf(target, file));
  }
  const Manifest before = snapshotFor(description(footprintOf(target), Manifest::kRestore));
  _journal.begin(before.id, id);
  replaceBy(target, before);
  finish(before, "restored");
  return before.id;
}

}  // namespace host::snapshots
