#include "host/snapshots/manifest.h"

#include <array>
#include <nlohmann/json.hpp>

#include "host/snapshots/checksum.h"
#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;
using Part = platform::MigrationFile::Part;

constexpr int kFormat = 1;
constexpr std::array<const char*, 3> kParts{"settings", "legacy", "other"};

Part partNamed(const std::string& name) {
  for (const Part part : {Part::settings, Part::legacy}) {
    if (name == nameOf(part)) return part;
  }
  return Part::other;
}

template <typename Value>
Json orNull(const std::optional<Value>& value) {
  return value ? Json(*value) : Json(nullptr);
}

template <typename Value>
std::optional<Value> optionalAt(const Json& json, const char* key) {
  return json.at(key).is_null() ? std::nullopt : std::optional<Value>{json.at(key).get<Value>()};
}

// Four digits, as everybody writes permissions.
std::string octal(std::uint32_t permissions) {
  std::string digits(4, '0');
  for (auto digit = digits.rbegin(); digit != digits.rend(); ++digit, permissions >>= 3U) {
    *digit = static_cast<char>('0' + (permissions & 7U));
  }
  return digits;
}

std::uint32_t fromOctal(const std::string& digits) {
  std::uint32_t permissions = 0;
  for (const char digit : digits) permissions = permissions << 3U | (static_cast<std::uint32_t>(digit - '0') & 7U);
  return permissions;
}

Json jsonOf(const KeptFile& file) {
  Json json{{"path", file.path.native()}, {"part", nameOf(file.part)}, {"state", file.isPresent() ? "file" : kAbsent}};
  if (!file.isPresent()) return json;
  const platform::FileAttributes& attributes = file.attributes;
  json["copy"] = file.copy;
  json["size"] = attributes.size;
  json["sha256"] = file.contents;
  json["owner"] = attributes.owner;
  json["group"] = attributes.group;
  json["mode"] = octal(attributes.permissions);
  json["modified"] = {attributes.modifiedSeconds, attributes.modifiedNanoseconds};
  return json;
}

KeptFile fileFrom(const Json& json) {
  KeptFile file{.path = json.at("path").get<std::string>(),
                .part = partNamed(json.at("part")),
                .contents = kAbsent,
                .attributes = {},
                .copy = {}};
  if (json.at("state") == kAbsent) return file;
  file.copy = json.at("copy");
  file.contents = json.at("sha256");
  file.attributes = {.kind = platform::FileKind::file,
                     .size = json.at("size"),
                     .owner = json.at("owner"),
                     .group = json.at("group"),
                     .permissions = fromOctal(json.at("mode")),
                     .modifiedSeconds = json.at("modified").at(0),
                     .modifiedNanoseconds = json.at("modified").at(1)};
  return file;
}

Json jsonOf(const Manifest& manifest) {
  Json files = Json::array();
  for (const KeptFile& file : manifest.files) files.push_back(jsonOf(file));
  return {{"format", kFormat},
          {"id", manifest.id},
          {"taken", manifest.taken},
          {"release", manifest.release},
          {"reason", manifest.reason},
          {"root", manifest.device.root},
          {"home", manifest.device.home},
          {"lock", manifest.lockName},
          {"versionKey", manifest.versionKey},
          {"dataVersion", orNull(manifest.dataVersion)},
          {"outcome", orNull(manifest.outcome)},
          {"kept", manifest.isKept},
          {"files", std::move(files)}};
}

Manifest manifestFromJson(const Json& json) {
  Manifest manifest{.id = json.at("id"),
                    .taken = json.at("taken"),
                    .release = json.at("release"),
                    .reason = json.at("reason"),
                    .device = {.root = json.at("root"), .home = json.at("home")},
                    .lockName = json.at("lock"),
                    .versionKey = json.at("versionKey"),
                    .dataVersion = optionalAt<std::int64_t>(json, "dataVersion"),
                    .outcome = optionalAt<std::string>(json, "outcome"),
                    .isKept = json.at("kept"),
                    .files = {}};
  for (const Json& file : json.at("files")) manifest.files.push_back(fileFrom(file));
  return manifest;
}

}  // namespace

std::string nameOf(Part part) { return kParts.at(static_cast<std::size_t>(part)); }

std::string textOf(const Manifest& manifest) {
  try {
    Json json = jsonOf(manifest);
    const std::string sum = checksum(json.dump());
    return Json{{"manifest", std::move(json)}, {"sha256", sum}}.dump() + '\n';
  } catch (const Json::exception& thrown) {
    throw Problem{Problem::Kind::failed, std::string{"the manifest cannot be written: "} + thrown.what()};
  }
}

std::optional<Manifest> manifestFrom(std::string_view text) {
  try {
    const Json json = Json::parse(text);
    const Json& manifest = json.at("manifest");
    if (json.at("sha256") != checksum(manifest.dump()) || manifest.at("format") != kFormat) return std::nullopt;
    return manifestFromJson(manifest);
  } catch (const Json::exception&) {
    return std::nullopt;
  }
}

}  // namespace host::snapshots
