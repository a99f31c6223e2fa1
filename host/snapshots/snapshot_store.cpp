#include "host/snapshots/snapshot_store.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <ctime>

#include "host/snapshots/checksum.h"
#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

constexpr const char* kBeingMade = ".new";
constexpr const char* kBeingRemoved = ".old";
constexpr const char* kManifest = "manifest";
constexpr unsigned kOwnerAlone = 0700;
constexpr std::size_t kLargestManifest = std::size_t{1} << 24U;
constexpr std::size_t kLargestCopy = std::size_t{1} << 30U;
constexpr std::size_t kDigits = 6;

std::string timeNow() {
  const std::time_t now = std::time(nullptr);
  std::tm parts{};
  std::array<char, 32> text{};
  ::gmtime_r(&now, &parts);
  return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts)};
}

// NNNNNN-TIME, the number with more digits once it has to have them; 0 where it is no identifier.
std::uint64_t numberOf(const std::string& id) {
  std::uint64_t number = 0;
  const char* const end = id.data() + id.size();
  const auto [stop, error] = std::from_chars(id.data(), end, number);
  const bool isIdentifier = error == std::errc{} && stop != end && *stop == '-' && id.find('/') == std::string::npos;
  return isIdentifier && static_cast<std::size_t>(stop - id.data()) >= kDigits ? number : 0;
}

[[noreturn]] void fail(const std::string& text) { throw Problem{Problem::Kind::failed, text}; }

}  // namespace

void SnapshotStore::removeIfThere(const Path& path) const {
  const platform::Status removed = _storage.files->remove(path);
  if (removed.errorNumber() != ENOENT) require(removed);
}

void SnapshotStore::sweep() const {
  for (const std::string& name : required(_storage.keeper->entriesOf(_directory))) {
    if (name.starts_with('.')) removeIfThere(_directory / name);
  }
}

std::vector<std::string> SnapshotStore::identifiers() const {
  std::vector<std::string> found = required(_storage.keeper->entriesOf(_directory));
  std::erase_if(found, [](const std::string& name) { return numberOf(name) == 0; });
  std::ranges::sort(found, {}, [](const std::string& name) { return numberOf(name); });
  return found;
}

Manifest SnapshotStore::manifest(const std::string& id) const {
  const std::vector<std::string> known = identifiers();
  if (std::ranges::find(known, id) == known.end()) {
    throw Problem{Problem::Kind::wrongUse, "there is no snapshot " + id + " in " + _directory.string()};
  }
  const platform::Bytes bytes = required(_storage.files->read(_directory / id / kManifest, kLargestManifest));
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

void SnapshotStore::keepCopy(KeptFile& file, std::size_t number) const {
  const Look look = lookAt(_storage, file.path);
  if (look.contents == kNoFile) fail(file.path.string() + " is no regular file, and no copy of it can be kept");
  file.contents = look.contents;
  file.attributes = look.attributes;
  if (!file.isPresent()) return;
  file.copy = std::to_string(number);
  const Path copy = _directory / kBeingMade / file.copy;
  require(_storage.files->create(copy, look.bytes));
  if (lookAt(_storage, copy).contents != file.contents) fail("the copy of " + file.path.string() + " is not like it");
}

void SnapshotStore::build(Manifest& manifest) const {
  const Path place = _directory / kBeingMade;
  require(_storage.files->createDirectories(place, kOwnerAlone));
  std::size_t number = 0;
  for (KeptFile& file : manifest.files) keepCopy(file, ++number);
  const std::string text = textOf(manifest);
  require(
      _storage.files->replace(place / kManifest, {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()}));
  require(_storage.files->rename(place, _directory / manifest.id));
}

Manifest SnapshotStore::take(Manifest description) const {
  description.taken = timeNow();
  description.id = nextIdentifier(description.taken);
  try {
    build(description);
  } catch (const Problem&) {
    static_cast<void>(_storage.files->remove(_directory / kBeingMade));
    throw;
  }
  return description;
}

void SnapshotStore::rewrite(const Manifest& manifest) const {
  const std::string text = textOf(manifest);
  require(_storage.files->replace(_directory / manifest.id / kManifest,
                                  {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()}));
}

platform::Bytes SnapshotStore::copyOf(const Manifest& manifest, const KeptFile& file) const {
  platform::Bytes bytes = required(_storage.files->read(_directory / manifest.id / file.copy, kLargestCopy));
  if (checksum(bytes) != file.contents) {
    fail("the copy of " + file.path.string() + " in snapshot " + manifest.id + " is damaged");
  }
  return bytes;
}

bool SnapshotStore::hasCopyOf(const Manifest& manifest, const KeptFile& file) const {
  try {
    static_cast<void>(copyOf(manifest, file));
    return true;
  } catch (const Problem&) {
    return false;
  }
}

void SnapshotStore::prune(std::size_t count) const {
  std::vector<std::string> prunable = identifiers();
  std::erase_if(prunable, [this](const std::string& id) {
    const std::optional<Manifest> known = undamagedManifest(id);
    return !known || known->isKept;
  });
  for (std::size_t excess = prunable.size(); excess > count; --excess) {
    require(_storage.files->rename(_directory / prunable[prunable.size() - excess], _directory / kBeingRemoved));
    removeIfThere(_directory / kBeingRemoved);
  }
}

}  // namespace host::snapshots
