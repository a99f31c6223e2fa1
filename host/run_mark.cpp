#include "host/run_mark.h"

#include <unistd.h>

#include <algorithm>
#include <optional>

#include "platform/device_places.h"
#include "platform/platform.h"

namespace host {
namespace {

using platform::MigrationFile;
using platform::Path;

Path place() { return platform::runMarkOf(platform::current().directories->systemRoot()); }

// Of a settings file; nothing where it cannot be told.
std::optional<std::int64_t> versionIn(const Path& file, std::string_view key) {
  const auto read = platform::current().propertyLists->readDictionary(file);
  const auto* const version = read.isOk() ? read.value().find(key) : nullptr;
  return version == nullptr ? std::nullopt : version->integerValue();
}

}  // namespace

bool RunMark::isLeft() {
  const auto found = _storage.keeper->attributesOf(place());
  _isThere = found.isOk() && found.value().kind == platform::FileKind::file;
  return _isThere;
}

void RunMark::set() {
  const platform::FileAttributes own{.owner = ::geteuid(), .group = ::getegid(), .permissions = 0600};
  _isThere = _storage.keeper->restore(place(), {}, own).isOk() || _isThere;
}

void RunMark::remove() {
  if (_isThere) static_cast<void>(_storage.keeper->removeFile(place()));
  _isThere = false;
}

bool mayMissSteps(const platform::MigrationFootprint& footprint) {
  const auto settings = std::ranges::find(footprint.files, MigrationFile::Part::settings, &MigrationFile::part);
  if (settings == footprint.files.end()) return false;
  return versionIn(settings->path, footprint.versionKey) == footprint.currentVersion &&
         versionIn(footprint.copyAside, footprint.versionKey).value_or(0) < footprint.currentVersion;
}

}  // namespace host
