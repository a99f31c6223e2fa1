#include "host/fact_json.h"

#include <array>
#include <cmath>
#include <nlohmann/json.hpp>

#include "platform/description.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;
using platform::PropertyValue;
using platform::RecordChange;
using platform::RecordName;
using platform::RunFact;

// In the order of the kinds.
constexpr std::array<std::string_view, 16> kActions{
    "loaded",         "load-failed",     "added", "converted", "changed", "moved",       "folded",
    "dropped",        "repeated",        "kept",  "failed",    "saved",   "save-failed", "file-removed",
    "source-removed", "file-not-removed"};

Json jsonOfInteger(PropertyValue::Integer integer) {
  return integer.isAboveInt64 ? Json(integer.bits) : Json(static_cast<std::int64_t>(integer.bits));
}

Json jsonOfShown(const PropertyValue& value) {
  if (const auto* const text = value.asText()) return text->string();
  if (const auto integer = value.asInteger()) return jsonOfInteger(*integer);
  if (const auto* const real = value.asReal()) {
    return std::isfinite(*real) ? Json(*real) : Json(platform::description(value));
  }
  if (const auto* const boolean = value.asBoolean()) return *boolean;
  if (const auto* const array = value.asArray()) {
    Json elements = Json::array();
    for (const PropertyValue& element : *array) elements.push_back(jsonOfShown(element));
    return elements;
  }
  Json members = Json::object();
  if (const auto* const dictionary = value.asDictionary()) {
    for (const auto& [key, element] : *dictionary) members[key.string()] = jsonOfShown(element);
  }
  return members;
}

Json jsonOfName(const RecordName& name) {
  Json json{{"type", name.type}, {"name", name.name}, {"identifier", name.identifier}};
  if (!name.parent.empty()) json["parent"] = name.parent;
  return json;
}

Json jsonOfChange(const RecordChange& change) {
  Json json{{"key", change.key}};
  if (!change.oldKey.empty()) json["renamedFrom"] = change.oldKey;
  const std::string_view key = keyForShowing(change);
  if (change.from) json["from"] = jsonOfShown(platform::presentable(key, *change.from));
  if (change.to) json["to"] = jsonOfShown(platform::presentable(key, *change.to));
  return json;
}

template <typename Element>
Json jsonOfEach(const std::vector<Element>& elements, Json (*jsonOfOne)(const Element&)) {
  Json json = Json::array();
  for (const Element& element : elements) json.push_back(jsonOfOne(element));
  return json;
}

bool countsRecords(RunFact::Kind kind) {
  return kind == RunFact::Kind::loaded || kind == RunFact::Kind::saved || kind == RunFact::Kind::saveFailed;
}

}  // namespace

std::string_view actionOf(RunFact::Kind kind) { return kActions.at(static_cast<std::size_t>(kind)); }

std::string_view keyForShowing(const RecordChange& change) {
  return platform::namesCredential(change.oldKey) ? change.oldKey : change.key;
}

Json jsonOf(const RunFact& fact) {
  Json json{{"action", actionOf(fact.kind)}};
  if (fact.subject != RecordName{}) json["account"] = jsonOfName(fact.subject);
  if (!fact.changes.empty()) json["changes"] = jsonOfEach(fact.changes, &jsonOfChange);
  if (!fact.others.empty()) json["into"] = jsonOfEach(fact.others, &jsonOfName);
  if (!fact.reason.empty()) json["reason"] = fact.reason;
  if (!fact.path.empty()) json["file"] = fact.path;
  if (countsRecords(fact.kind)) {
    json["accounts"] = fact.count;
    json["version"] = fact.version;
  }
  return json;
}

}  // namespace host
