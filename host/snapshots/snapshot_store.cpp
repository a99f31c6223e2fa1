#include "host/snapshots/snapshot_store.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <chrono>

#include "host/snapshots/problem.h"
#include "host/snapshots/snapshot_directory.h"
#include "platform/linux/property_lists/libplist_conversion.h"

namespace host::snapshots {
namespace {

constexpr const char* kManifest = "manifest";
constexpr unsigned kOwnerAlone = 0700;
constexpr std::size_t kMaxSizeOfManifest = std::size_t{1} << 24U;
constexpr const char* kLatest = "latest";
constexpr std::size_t kDigits = 6;

std::uint64_t numberOf(const std::string& id) {
  std::uint64_t number = 0;
  std::from_chars(id.data(), id.data() + id.size(), number);
  return number;
}

}  // namespace

void requireKeepable(const Path& path, Part part, const FileState& state) {
  if (state.contents != kUnkept || !holdsAccounts(part)) return;
  fail(path.string() + " may hold accounts, and no copy of it can be kept: " + state.whyUnkept);
}

void SnapshotStore::removeIfThere(const Path& path) const {
  const platform::Status removed = _storage.files->remove(path);
  if (removed.errorNumber() != ENOENT) require(removed);
}

void SnapshotStore::sweep() const {
  for (const std::string& name : required(_storage.keeper->entriesOf(_directory))) {
    if (isPassing(name)) removeIfThere(_directory / name);
  }
}

std::vector<std::string> SnapshotStore::identifiers() const {
  std::vector<std::string> found = required(_storage.keeper->entriesOf(_directory));
  std::erase_if(found, [](const std::string& name) { return !isIdentifier(name); });
  std::ranges::sort(found, {}, [](const std::string& name) { return numberOf(name); });
  return found;
}

std::string SnapshotStore::identifierMeantBy(const std::string& text) const {
  const std::vector<std::string> known = identifiers();
  if (text == kLatest && !known.empty()) return known.back();
  std::vector<std::string> meant = known;
  std::erase_if(meant, [&text](const std::string& id) { return !id.starts_with(text); });
  if (meant.empty()) failWrongUse("there is no snapshot " + text + " in " + _directory.string());
  if (meant.size() > 1)
    failWrongUse("more than one snapshot begins with " + text + ": " + meant[0] + " and " + meant[1]);
  return meant.front();
}

Manifest SnapshotStore::manifest(const std::string& id) const {
  const std::vector<std::string> known = identifiers();
  if (std::ranges::find(known, id) == known.end()) {
    failWrongUse("there is no snapshot " + id + " in " + _directory.string());
  }
  const platform::Bytes bytes = required(_storage.files->read(_directory / id / kManifest, kMaxSizeOfManifest));
  std::optional<Manifest> manifest = manifestFrom({reinterpret_cast<const char*>(bytes.data()), bytes.size()});
  if (!manifest || manifest->id != id) fail("the manifest of snapshot " + id + " is damaged");
  return *std::move(manifest);
}

std::optional<Manifest> SnapshotStore::undamagedManifest(const std::string& id) const {
  try {
    return manifest(id);
  } catch (const Problem&) {
    return std::nullopt;
  }
}

std::string SnapshotStore::nextIdentifier(std::string time) const {
  const std::vector<std::string> known = identifiers();
  std::string number = std::to_string(known.empty() ? 1 : numberOf(known.back()) + 1);
  if (number.size() < kDigits) number.insert(0, kDigits - number.size(), '0');
  std::erase_if(time, [](char character) { return character == '-' || character == ':'; });
  return number + '-' + time;
}

void SnapshotStore::keepCopy(KeptFile& file, std::size_t number,
                             const std::function<void(const std::string&)>& warn) const {
  const FileState state = stateAt(_storage, file.path, file.part);
  file.contents = state.contents;
  file.attributes = state.attributes;
  requireKeepable(file.path, file.part, state);
  if (state.contents == kUnkept) warn(file.path.string() + " has no copy: " + state.whyUnkept);
  if (!file.hasCopy()) return;
  file.copy = std::to_string(number);
  const Path copy = _directory / kBeingMade / file.copy;
  require(_storage.files->create(copy, state.bytes));
  if (checksum(required(_storage.files->read(copy, platform::kMaxPropertyListSize))) != file.contents) {
    fail("the copy of " + file.path.string() + " is not like it");
  }
}

void SnapshotStore::build(Manifest& manifest, const std::function<void(const std::string&)>& warn) const {
  const Path place = _directory / kBeingMade;
  require(_storage.files->createDirectories(place, kOwnerAlone));
  std::size_t number = 0;
  for (KeptFile& file : manifest.files) keepCopy(file, ++number, warn);
  require(_storage.files->replace(place / kManifest, bytesOf(textOf(manifest))));
  require(_storage.files->rename(place, _directory / manifest.id));
}

Manifest SnapshotStore::take(Manifest description, const std::function<void(const std::string&)>& warn) const {
  description.taken = universalTime(std::chrono::system_clock::now());
  description.id = nextIdentifier(description.taken);
  try {
    build(description, warn);
  } catch (const Problem&) {
    static_cast<void>(_storage.files->remove(_directory / kBeingMade));
    throw;
  }
  return description;
}

void SnapshotStore::rewrite(const Manifest& manifest) const { keepRecord(manifest.id, kManifest, textOf(manifest)); }

void SnapshotStore::keepRecord(const std::string& id, const std::string& name, std::string_view text) const {
  require(_storage.files->replace(_directory / id / name, bytesOf(text)));
}

std::optional<std::string> SnapshotStore::record(const std::string& id, const std::string& name) const {
  const platform::Result<platform::Bytes> read =
      _storage.files->read(_directory / id / name, platform::kMaxPropertyListSize);
  if (read.status().errorNumber() == ENOENT) return std::nullopt;
  require(read.status());
  return textIn(read.value());
}

platform::Bytes SnapshotStore::copyOf(const Manifest& manifest, const KeptFile& file) const {
  platform::Bytes bytes =
      required(_storage.files->read(_directory / manifest.id / file.copy, platform::kMaxPropertyListSize));
  if (checksum(bytes) != file.contents) {
    fail("the copy of " + file.path.string() + " in snapshot " + manifest.id + " is damaged");
  }
  return bytes;
}

std::vector<Path> SnapshotStore::damageOf(const Manifest& manifest) const {
  std::vector<Path> damaged;
  for (const KeptFile& file : manifest.files) {
    try {
      if (file.hasCopy()) static_cast<void>(copyOf(manifest, file));
    } catch (const Problem&) {
      damaged.push_back(file.path);
    }
  }
  return damaged;
}

void SnapshotStore::remove(const std::string& id) const {
  require(_storage.files->rename(_directory / id, _directory / kBeingRemoved));
  removeIfThere(_directory / kBeingRemoved);
}

std::vector<std::string> SnapshotStore::kept() const {
  std::vector<std::string> found = identifiers();
  std::erase_if(found, [this](const std::string& id) {
    const std::optional<Manifest> known = undamagedManifest(id);
    return !known || !known->isKept();
  });
  return found;
}

void SnapshotStore::prune(std::size_t count) const {
  std::vector<std::string> prunable = identifiers();
  std::erase_if(prunable, [this](const std::string& id) {
    const std::optional<Manifest> known = undamagedManifest(id);
    return !known || known->isKept();
  });
  for (std::size_t excess = prunable.size(); excess > count; --excess) remove(prunable[prunable.size() - excess]);
}

}  // namespace host::snapshots
