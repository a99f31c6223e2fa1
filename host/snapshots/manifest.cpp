#include "host/snapshots/manifest.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <nlohmann/json.hpp>
#include <stdexcept>

#include "host/snapshots/problem.h"

namespace host::snapshots {
namespace {

using Json = nlohmann::ordered_json;

constexpr int kFormat = 1;
constexpr std::array<const char*, 5> kParts{"settings", "legacy", "sentinel", "marker", "other"};
constexpr std::uint32_t kOrdinaryPermissions = 0777;
constexpr const char* kFile = "file";
constexpr const char* kKeptByAnEarlierRelease = "an earlier release of the host kept it";

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
  Json json{
      {"path", file.path.native()}, {"part", nameOf(file.part)}, {"state", file.hasCopy() ? kFile : file.contents}};
  if (!file.isPresent()) return json;
  const platform::FileAttributes& attributes = file.attributes;
  if (file.hasCopy()) {
    json["copy"] = file.copy;
    json["size"] = attributes.size;
    json["sha256"] = file.contents;
  }
  json["owner"] = attributes.owner;
  json["group"] = attributes.group;
  json["mode"] = octal(attributes.permissions);
  json["modified"] = {attributes.modifiedSeconds, attributes.modifiedNanoseconds};
  return json;
}

KeptFile fileFrom(const Json& json) {
  const auto* const part = std::ranges::find(kParts, json.at("part").get<std::string>());
  KeptFile file{.path = json.at("path").get<std::string>(),
                .part = part == kParts.end() ? Part::other : static_cast<Part>(part - kParts.begin()),
                .contents = json.at("state"),
                .attributes = {},
                .copy = {}};
  if (file.contents == kFile) {
    file.copy = json.at("copy");
    const bool isWithin = !file.copy.empty() && file.copy.find_first_not_of("0123456789") == std::string::npos;
    if (!isWithin) throw std::invalid_argument{"a copy outside of the snapshot"};
    file.contents = json.at("sha256");
    file.attributes.size = json.at("size");
  }
  if (!file.isPresent()) return file;
  file.attributes.owner = json.at("owner");
  file.attributes.group = json.at("group");
  file.attributes.permissions = fromOctal(json.at("mode")) & kOrdinaryPermissions;
  file.attributes.modifiedSeconds = json.at("modified").at(0);
  file.attributes.modifiedNanoseconds = json.at("modified").at(1);
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
          {"kept", manifest.isKept()},
          {"keptFor", manifest.keptFor},
          {"files", std::move(files)}};
}

}  // namespace

// By the calendar alone: no table of time zones is read for it.
std::string universalTime(std::chrono::system_clock::time_point time) {
  const auto day = std::chrono::floor<std::chrono::days>(time);
  const std::chrono::year_month_day date{day};
  const std::chrono::hh_mm_ss clock{std::chrono::floor<std::chrono::seconds>(time - day)};
  std::array<char, 40> text{};
  std::snprintf(text.data(), text.size(), "%04d-%02u-%02uT%02d:%02d:%02dZ", static_cast<int>(date.year()),
                static_cast<unsigned>(date.month()), static_cast<unsigned>(date.day()),
                static_cast<int>(clock.hours().count()), static_cast<int>(clock.minutes().count()),
                static_cast<int>(clock.seconds().count()));
  return text.data();
}

std::string nameOf(Part part) { return kParts.at(static_cast<std::size_t>(part)); }

std::string textOf(const Manifest& manifest) {
  try {
    Json json = jsonOf(manifest);
    const std::string sum = checksum(json.dump());
    return Json{{"manifest", std::move(json)}, {"sha256", sum}}.dump() + '\n';
  } catch (const Json::exception& thrown) {
    fail(std::string{"the manifest cannot be written: "} + thrown.what());
  }
}

std::optional<Manifest> manifestFrom(std::string_view text) {
  try {
    const Json whole = Json::parse(text);
    const Json& json = whole.at("manifest");
    if (whole.at("sha256") != checksum(json.dump()) || json.at("format") != kFormat) return std::nullopt;
    Manifest manifest{.id = json.at("id"),
                      .taken = json.at("taken"),
                      .release = json.at("release"),
                      .reason = json.at("reason"),
                      .device = {.root = json.at("root"), .home = json.at("home")},
                      .lockName = json.at("lock"),
                      .versionKey = json.at("versionKey"),
                      .dataVersion = optionalAt<std::int64_t>(json, "dataVersion"),
                      .outcome = optionalAt<std::string>(json, "outcome"),
                      .keptFor = json.value("keptFor", std::vector<std::string>{}),
                      .files = {}};
    if (json.at("kept") && !manifest.isKept()) manifest.keptFor.emplace_back(kKeptByAnEarlierRelease);
    for (const Json& file : json.at("files")) manifest.files.push_back(fileFrom(file));
    return manifest;
  } catch (const Json::exception&) {
    return std::nullopt;
  } catch (const std::invalid_argument&) {
    return std::nullopt;
  }
}

}  // namespace host::snapshots
