#include "host/snapshots/release_stamp.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "host/snapshots/problem.h"
#include "host/snapshots/run_journal.h"
#include "host/snapshots/snapshot_directory.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;

constexpr int kFormat = 1;
constexpr std::size_t kMaxSize = std::size_t{1} << 16U;

std::string textAt(platform::FileSystem& files, const Path& path) {
  const platform::Result<platform::Bytes> read = files.read(path, kMaxSize);
  return read.isOk() ? textIn(read.value()) : std::string{};
}

// The last one, as the shell that reads such a file has it; empty where there is none.
std::string valueOf(const std::string& key, const std::string& text) {
  std::string value;
  for (std::size_t start = 0; start < text.size();) {
    const std::size_t end = std::min(text.find('\n', start), text.size());
    const std::string line = text.substr(start, end - start);
    start = end + 1;
    if (!line.starts_with(key + "=")) continue;
    value = line.substr(key.size() + 1);
    const bool isQuoted =
        value.size() > 1 && (value.front() == '"' || value.front() == '\'') && value.back() == value.front();
    if (isQuoted) value = value.substr(1, value.size() - 2);
  }
  return value;
}

// What cannot be told is for the run to find out.
bool stands(platform::FileSystem& files, const Path& path) {
  return files.kindOf(path).cause() != platform::Cause::missing;
}

// A settings file without a version of its own, or without a version that is a number, is one of the first.
bool hasWork(const platform::Platform& services, const platform::MigrationFile& file,
             const platform::MigrationFootprint& footprint) {
  if (file.part == Part::legacy || file.part == Part::sentinel) return stands(*services.files, file.path);
  if (file.part != Part::settings) return false;
  const auto contents = services.propertyLists->readDictionary(file.path);
  if (!contents.isOk()) return false;
  const auto* const version = contents.value().find(footprint.versionKey);
  return (version == nullptr ? 0 : version->integerValue().value_or(0)) < footprint.currentVersion;
}

}  // namespace

Release releaseOf(platform::FileSystem& files, const Path& root, std::string host) {
  std::string text = textAt(files, root / "etc/os-release");
  if (text.empty()) text = textAt(files, root / "usr/lib/os-release");
  return {.host = std::move(host),
          .imageVersion = valueOf("IMAGE_VERSION", text),
          .buildId = valueOf("BUILD_ID", text),
          .versionId = valueOf("VERSION_ID", text)};
}

std::optional<Stamp> stampIn(platform::FileSystem& files, const Path& directory) {
  try {
    const Json json = Json::parse(textAt(files, directory / kStampName));
    if (json.at("format") != kFormat) return std::nullopt;
    return Stamp{.release = {.host = json.at("host"),
                             .imageVersion = json.at("image"),
                             .buildId = json.at("build"),
                             .versionId = json.at("version")},
                 .endedWell = json.at("endedWell")};
  } catch (const Json::exception&) {
    return std::nullopt;
  }
}

void setStamp(platform::FileSystem& files, const Path& directory, const Stamp& stamp) {
  const Json json{{"format", kFormat},
                  {"host", stamp.release.host},
                  {"image", stamp.release.imageVersion},
                  {"build", stamp.release.buildId},
                  {"version", stamp.release.versionId},
                  {"endedWell", stamp.endedWell}};
  const std::string text = json.dump(-1, ' ', false, Json::error_handler_t::replace) + '\n';
  require(files.replace(directory / kStampName, bytesOf(text)));
}

bool isRunNeeded(const Storage& storage, const Path& directory, const platform::Platform& services,
                 const platform::MigrationFootprint& footprint, const std::string& host) {
  try {
    if (!requireOwnDirectory(storage, directory, Missing::isAccepted)) return true;
  } catch (const Problem&) {
    return true;
  }
  const std::optional<Stamp> stamp = stampIn(*storage.files, directory);
  const Release present = releaseOf(*storage.files, services.directories->systemRoot(), host);
  if (!stamp || !stamp->endedWell || stamp->release != present) return true;
  if (stands(*storage.files, directory / RunJournal::kName)) return true;
  return std::ranges::any_of(footprint.files, [&](const auto& file) { return hasWork(services, file, footprint); });
}

}  // namespace host::snapshots
