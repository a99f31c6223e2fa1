#include "host/snapshots/undo.h"

#include <algorithm>

#include "host/snapshots/problem.h"
#include "platform/linux/files/linux_file_locks.h"

namespace host::snapshots {
namespace {

using Part = platform::MigrationFile::Part;

[[noreturn]] void fail(const std::string& text) { throw Problem{Problem::Kind::failed, text}; }

bool hasSamePaths(const Manifest& one, const Manifest& other) {
  return std::ranges::equal(one.files, other.files, {}, &KeptFile::path, &KeptFile::path);
}

}  // namespace

Undo::Undo(UndoPlace place, Missing missing)
    : _place{std::move(place)},
      _storage{_place.services.files, _place.keeper},
      _device{_place.services.directories->systemRoot(), _place.services.directories->home()},
      _store{_storage, _place.directory},
      _journal{_storage, _place.directory} {
  requireOwnDirectory(_storage, _place.directory, missing);
  _lock = hold(*platform::makeFileLocks(_place.directory), "lock");
  requireSameDevice();
}

Undo::HeldLock Undo::hold(platform::ExclusiveFileLocks& locks, const std::string& name) {
  platform::Result<HeldLock> lock = locks.lockNamed(name);
  const platform::Status held = lock.isOk() ? lock.value()->lock() : lock.status();
  if (!held.isOk()) fail("the lock " + name + " cannot be taken: " + held.reason());
  return lock.take();
}

void Undo::requireSameDevice() const {
  for (const std::string& id : _store.identifiers()) {
    const std::optional<Manifest> manifest = _store.undamagedManifest(id);
    if (!manifest || manifest->device == _device) continue;
    throw Problem{Problem::Kind::wrongUse, _place.directory.string() + " belongs to another device: --root " +
                                               manifest->device.root + " --home " + manifest->device.home};
  }
}

std::optional<std::int64_t> Undo::dataVersion(const Manifest& manifest) const {
  const auto settings = std::ranges::find(manifest.files, Part::settings, &KeptFile::part);
  if (settings == manifest.files.end()) return std::nullopt;
  const auto contents = _place.services.propertyLists->readDictionary(settings->path);
  const auto* const version = contents.isOk() ? contents.value().find(manifest.versionKey) : nullptr;
  return version == nullptr ? std::nullopt : version->integerValue();
}

Manifest Undo::description(const platform::MigrationFootprint& footprint, const char* reason) const {
  Manifest manifest;
  manifest.release = _place.release;
  manifest.reason = reason;
  manifest.device = _device;
  manifest.lockName = footprint.lockName;
  manifest.versionKey = footprint.versionKey;
  for (const platform::MigrationFile& file : footprint.files) {
    manifest.files.push_back({.path = file.path, .part = file.part, .contents = kAbsent, .attributes = {}, .copy = {}});
  }
  manifest.dataVersion = dataVersion(manifest);
  return manifest;
}

// The snapshot of a run that did not end, with nothing changed since: the same state need not be kept twice, and the
// one from before the first attempt stays the newest.
bool Undo::isStillTrue(const Manifest& newest, const Manifest& description) const {
  if (newest.outcome || newest.isKept || !hasSamePaths(newest, description)) return false;
  return std::ranges::all_of(newest.files, [this, &newest](const KeptFile& file) {
    if (!file.isExactly(lookAt(_storage, file.path))) return false;
    return !file.isPresent() || _store.hasCopyOf(newest, file);
  });
}

Manifest Undo::snapshotFor(Manifest description) const {
  const std::vector<std::string> known = _store.identifiers();
  if (!known.empty()) {
    std::optional<Manifest> newest = _store.undamagedManifest(known.back());
    if (newest && isStillTrue(*newest, description)) return *std::move(newest);
  }
  return _store.take(std::move(description));
}

std::shared_ptr<platform::FileSystem> Undo::begin(const platform::MigrationFootprint& footprint) {
  if (footprint.files.empty()) fail("the plug-in does not tell which files it changes, so no snapshot can be taken");
  const HeldLock migration = hold(*_place.services.locks, footprint.lockName);
  _store.sweep();
  recover();
  _run = snapshotFor(description(footprint, Manifest::kRun));
  _journal.begin(_run.id, std::nullopt);
  _watched = std::make_shared<WatchedFiles>(_storage, _run, _journal);
  return _watched;
}

std::vector<Path> Undo::legacyFilesGone() const {
  std::vector<Path> gone;
  for (const KeptFile& file : _run.files) {
    const bool isLegacy = file.part == Part::legacy && file.isPresent();
    if (isLegacy && lookAt(_storage, file.path).contents == kAbsent) gone.push_back(file.path);
  }
  return gone;
}

void Undo::sayWhatOnlyTheSnapshotHas(const std::vector<Path>& gone) const {
  _place.warn("THE SETTINGS WERE NOT SAVED, but these files are deleted; their accounts are only in snapshot " +
              _run.id + ":");
  for (const Path& path : gone) _place.warn("  " + path.string());
  _place.warn("bring them back with: migration-host --restore " + _run.id + " --snapshots " +
              _place.directory.string() + " --root " + _device.root + " --home " + _device.home);
}

void Undo::end(bool migrated, std::size_t count) {
  try {
    const std::vector<Path> gone = _watched->hasLastSaveFailed() ? legacyFilesGone() : std::vector<Path>{};
    _run.isKept = !gone.empty();
    if (_run.isKept) sayWhatOnlyTheSnapshotHas(gone);
    finish(_run, migrated ? "migrated" : "not migrated");
    _store.prune(count);
  } catch (const std::exception& thrown) {
    _place.warn(std::string{"the snapshots are not in order: "} + thrown.what());
  }
}

// The outcome is what ends a run or a restore; the mark is taken away also where that cannot be written. What fails is
// made good by the next run, which finds the mark.
void Undo::finish(Manifest manifest, const char* outcome) {
  manifest.outcome = outcome;
  const auto tryTo = [this](const auto& step) {
    try {
      step();
    } catch (const Problem& problem) {
      _place.warn(problem.what());
    }
  };
  tryTo([&] { _store.rewrite(manifest); });
  tryTo([&] { _journal.clear(); });
}

}  // namespace host::snapshots
