#include "host/snapshots/snapshot_session.h"

#include <algorithm>
#include <cerrno>

#include "host/snapshots/problem.h"
#include "platform/linux/property_lists/libplist_conversion.h"

namespace host::snapshots {
namespace {

constexpr const char* kMigrated = "migrated";
constexpr const char* kNotMigrated = "not migrated";

}  // namespace

SnapshotSession::SnapshotSession(SessionPlace place, Missing missing)
    : _place{std::move(place)},
      _storage{_place.services.files, _place.keeper},
      _device{_place.services.directories->systemRoot(), _place.services.directories->home()},
      _store{_storage, _place.directory},
      _journal{_storage, _place.directory} {
  _isThere = requireOwnDirectory(_storage, _place.directory, missing);
  if (!_isThere) return;
  _lock = hold(*_place.locks, "lock");
  markAsOwn(_storage, _place.directory);
  requireSameDevice();
}

SnapshotSession::HeldLock SnapshotSession::hold(platform::ExclusiveFileLocks& locks, const std::string& name) {
  platform::Result<HeldLock> lock = locks.lockNamed(name);
  const platform::Status held = lock.isOk() ? lock.value()->lock() : lock.status();
  if (held.errorNumber() == ETIMEDOUT) throw Problem{Problem::Kind::locked, held.description()};
  if (!held.isOk()) fail("the lock " + name + " cannot be taken: " + held.reason());
  return lock.take();
}

void SnapshotSession::requireSameDevice() const {
  for (const std::string& id : _store.identifiers()) {
    const std::optional<Manifest> manifest = _store.undamagedManifest(id);
    if (!manifest || manifest->device == _device) continue;
    failWrongUse(_place.directory.string() + " belongs to another device: --root " + manifest->device.root +
                 " --home " + manifest->device.home);
  }
}

void SnapshotSession::requireFootprint() const {
  if (_place.footprint.files.empty()) {
    fail("the plug-in does not tell which files it changes, so no snapshot can be taken");
  }
}

Manifest SnapshotSession::description(const char* reason) const {
  Manifest manifest;
  manifest.release = _place.release;
  manifest.reason = reason;
  manifest.device = _device;
  manifest.lockName = _place.footprint.lockName;
  manifest.versionKey = _place.footprint.versionKey;
  for (const platform::MigrationFile& file : _place.footprint.files) {
    manifest.files.push_back({.path = file.path, .part = file.part, .contents = kAbsent, .attributes = {}, .copy = {}});
    if (file.part != Part::settings) continue;
    const auto contents = _place.services.propertyLists->readDictionary(file.path);
    const auto* const version = contents.isOk() ? contents.value().find(manifest.versionKey) : nullptr;
    if (version != nullptr) manifest.dataVersion = version->integerValue();
  }
  return manifest;
}

// The snapshot of a run that did not end, with nothing changed since: the same state need not be kept twice, and the
// one from before the first attempt stays the newest.
bool SnapshotSession::isStillTrue(const Manifest& newest, const Manifest& description) const {
  if (newest.outcome || newest.isKept()) return false;
  if (!std::ranges::equal(newest.files, description.files, {}, &KeptFile::path, &KeptFile::path)) return false;
  const bool isUnchanged = std::ranges::all_of(
      newest.files, [this](const KeptFile& file) { return file.isExactly(stateAt(_storage, file.path, file.part)); });
  return isUnchanged && _store.damageOf(newest).empty();
}

Manifest SnapshotSession::snapshotFor(Manifest description) const {
  const std::vector<std::string> known = _store.identifiers();
  if (!known.empty()) {
    std::optional<Manifest> newest = _store.undamagedManifest(known.back());
    if (newest && isStillTrue(*newest, description)) return *std::move(newest);
  }
  return _store.take(std::move(description), _place.warn);
}

// What stands in the place of a file with accounts and can neither be read nor copied, a directory, a pipe, or more
// than a property list may have, keeps nobody's device from its migration. Only what looks like that is read here.
void SnapshotSession::makeWay() const {
  for (const platform::MigrationFile& file : _place.footprint.files) {
    if (!holdsAccounts(file.part)) continue;
    const platform::Result<platform::FileAttributes> found = _storage.keeper->attributesOf(file.path);
    const bool isOrdinary = found.isOk() && found.value().kind == platform::FileKind::file &&
                            found.value().size <= platform::kMaxPropertyListSize;
    if (!found.isOk() || isOrdinary) continue;
    const FileState state = stateAt(_storage, file.path, file.part);
    if (state.isUnreadable) require(_place.putAside(_storage, file, state.whyUnkept));
  }
}

std::shared_ptr<platform::FileSystem> SnapshotSession::begin() {
  requireFootprint();
  const HeldLock migration = hold(*_place.services.locks, _place.footprint.lockName);
  _store.sweep();
  recover();
  makeWay();
  _run = snapshotFor(description(Manifest::kRun));
  _journal.begin(_run.id, std::nullopt);
  _watched = std::make_shared<WatchedFiles>(_storage, _run, _journal);
  return _watched;
}

void SnapshotSession::rehearse() {
  requireFootprint();
  const HeldLock migration = hold(*_place.services.locks, _place.footprint.lockName);
  if (_isThere) recover();
  makeWay();
  for (const platform::MigrationFile& file : _place.footprint.files) {
    requireKeepable(file.path, file.part, stateAt(_storage, file.path, file.part));
  }
}

void SnapshotSession::attempt(const std::function<void()>& step) const {
  try {
    step();
  } catch (const std::exception& thrown) {
    _place.warn(std::string{"the snapshots are not in order: "} + thrown.what());
  }
}

bool SnapshotSession::hasChangedNothing() const {
  return std::ranges::all_of(
      _run.files, [this](const KeptFile& file) { return file.isMuchLike(stateAt(_storage, file.path, file.part)); });
}

// The mark goes first: where it stands, the snapshot has to.
void SnapshotSession::discardRun() {
  _journal.clear();
  _store.remove(_run.id);
}

Ended SnapshotSession::rollBack() {
  const HeldLock migration = hold(*_place.services.locks, _place.footprint.lockName);
  const std::optional<RunMark> mark = _journal.read();
  if (!mark) fail("the run cannot be rolled back: its mark is gone");
  const std::vector<Path> left = restoreBeforeRun(*mark, _run);
  if (!left.empty()) {
    keepWhereLeft(_run, left);
    _journal.clear();
    return Ended::asItIs;
  }
  discardRun();
  return Ended::rolledBack;
}

void SnapshotSession::keepRun(const RunEnd& end) {
  attempt([&] { _store.keepRecord(_run.id, kExplanation, end.explanation); });
  attempt([&] { _store.keepRecord(_run.id, kExplanationAsJson, end.explanationAsJson); });
  _run.keptFor = end.onlyInSnapshot;
  if (_run.isKept()) sayWhatOnlyTheSnapshotHas();
  _run.outcome = end.isMigrated ? kMigrated : kNotMigrated;
  finish(_run);
}

void SnapshotSession::sayWhatOnlyTheSnapshotHas() const {
  _place.warn("snapshot " + _run.id + " is kept until it is released, since what went is nowhere else:");
  for (const std::string& reason : _run.keptFor) _place.warn("  " + reason);
  _place.warn("go back with: migration-host --restore " + _run.id + " --snapshots " + _place.directory.string() +
              " --root " + _device.root + " --home " + _device.home);
}

Ended SnapshotSession::end(const RunEnd& end, std::size_t count) {
  Ended ended = Ended::asItIs;
  attempt([&] {
    if (!end.isSaved) {
      ended = rollBack();
    } else if (hasChangedNothing()) {
      discardRun();
    } else {
      keepRun(end);
    }
  });
  attempt([&] {
    const Release release = releaseOf(*_storage.files, _place.services.directories->systemRoot(), _place.release);
    setStamp(*_storage.files, _place.directory, {.release = release, .endedWell = end.isMigrated && end.isSaved});
  });
  attempt([&] {
    boundKept();
    _store.prune(count);
  });
  return ended;
}

// The outcome is what ends a run or a restore; the mark is taken away also where that cannot be written. What fails is
// made good by the next run, which finds the mark.
void SnapshotSession::finish(const Manifest& manifest) {
  attempt([&] { _store.rewrite(manifest); });
  attempt([&] { _journal.clear(); });
}

void SnapshotSession::boundKept() const {
  const std::vector<std::string> kept = _store.kept();
  for (std::size_t index = 0; index + SnapshotStore::kMaxKept < kept.size(); ++index) {
    _place.warn("snapshot " + kept[index] + " is kept no longer: " + std::to_string(SnapshotStore::kMaxKept) +
                " newer ones are");
    release(kept[index]);
  }
}

void SnapshotSession::release(const std::string& id) const {
  Manifest manifest = _store.manifest(id);
  if (!manifest.isKept()) failWrongUse("snapshot " + id + " is not kept beyond the count");
  manifest.keptFor.clear();
  _store.rewrite(manifest);
}

std::string SnapshotSession::identifierMeantBy(const std::optional<std::string>& text) const {
  if (text) return _store.identifierMeantBy(*text);
  std::vector<std::string> known = _store.identifiers();
  std::erase_if(known, [this](const std::string& id) {
    const std::optional<Manifest> manifest = _store.undamagedManifest(id);
    return !manifest || manifest->reason != Manifest::kRun;
  });
  if (known.empty()) failWrongUse("no snapshot is from before a run");
  return known.back();
}

}  // namespace host::snapshots
