#include "host/fact_json.h"

#include <cmath>
#include <nlohmann/json.hpp>

#include "records/description.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;
using namespace records;  // the facts

Json jsonOfInteger(PropertyValue::Integer integer) {
  return integer.isAboveInt64 ? Json(integer.bits) : Json(static_cast<std::int64_t>(integer.bits));
}

Json jsonOfShown(const PropertyValue& value) {
  if (const auto* const text = value.asText()) return text->string();
  if (const auto integer = value.asInteger()) return jsonOfInteger(*integer);
  if (const auto* const real = value.asReal()) {
    return std::isfinite(*real) ? Json(*real) : Json(records::description(value));
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

Json jsonOfName(const Name& name) {
  Json json{{"type", name.type}, {"name", name.name}, {"identifier", name.identifier}};
  if (!name.parent.empty()) json["parent"] = name.parent;
  return json;
}

Json jsonOfChanges(const std::vector<Change>& changes) {
  Json all = Json::array();
  for (const Change& change : changes) {
    Json json{{"key", change.key}};
    if (!change.oldKey.empty()) json["renamedFrom"] = change.oldKey;
    const std::string_view key = keyForShowing(change);
    if (change.from) json["from"] = jsonOfShown(presentable(key, *change.from));
    if (change.to) json["to"] = jsonOfShown(presentable(key, *change.to));
    all.push_back(std::move(json));
  }
  return all;
}

void addUnlessEmpty(const char* member, const std::string& text, Json& json) {
  if (!text.empty()) json[member] = text;
}

Json membersOf(const Lost& lost) {
  const LossMeaning& meaning = meaningOf(lost.code);
  Json json{{"code", meaning.name}, {"reason", meaning.text}};
  addUnlessEmpty("detail", lost.detail, json);
  if (lost.account != Name{}) json["account"] = jsonOfName(lost.account);
  addUnlessEmpty("file", lost.file, json);
  addUnlessEmpty("where", lost.where, json);
  return json;
}

Json ofAccount(const Name& account, const Json& members = Json::object()) {
  Json json{{"account", jsonOfName(account)}};
  json.update(members);
  return json;
}

Json ofConversion(const Converted& converted) {
  return ofAccount(converted.account, {{"from", converted.from},
                                       {"file", converted.file},
                                       {"replaces", converted.isReplacement},
                                       {"changes", jsonOfChanges(converted.changes)}});
}

Json ofMove(const Moved& moved) {
  return ofAccount(moved.account, moved.into ? Json{{"into", Json::array({jsonOfName(*moved.into)})}} : Json::object());
}

Json ofKeptFile(const KeptAside& kept) {
  Json json = Json::object();
  addUnlessEmpty("file", kept.file, json);
  json["where"] = kept.where;
  return json;
}

Json membersOf(const Fact& fact) {
  return std::visit(
      Visitor{[](const Loaded& it) {
                return Json{{"accounts", it.accounts}, {"version", it.version}};
              },
              [](const CopiedAside& it) {
                return Json{{"file", it.file}};
              },
              [](const KeptAside& it) { return ofKeptFile(it); },
              [](const Swept& it) {
                return Json{{"file", it.file}};
              },
              [](const Added& it) { return ofAccount(it.account); },
              [](const Converted& it) { return ofConversion(it); },
              [](const Changed& it) {
                return ofAccount(it.account, {{"changes", jsonOfChanges(it.changes)}});
              },
              [](const Moved& it) { return ofMove(it); },
              [](const Folded& it) {
                return ofAccount(it.account, {{"into", jsonOf(it.into)}, {"reason", it.reason}});
              },
              [](const Lost& it) { return membersOf(it); }, [](const Repeated& it) { return ofAccount(it.account); },
              [](const Unrepaired& it) {
                return ofAccount(it.account, {{"reason", it.reason}});
              },
              [](const Saved& it) {
                return Json{{"file", it.file}, {"accounts", it.accounts}, {"version", it.version}};
              },
              [](const SaveFailed& it) {
                return Json{{"file", it.file}, {"cause", it.cause}, {"accounts", it.accounts}, {"version", it.version}};
              },
              [](const FileRemoved& it) {
                return Json{{"file", it.file}};
              },
              [](const FileNotRemoved& it) {
                return Json{{"file", it.file}, {"cause", it.cause}};
              }},
      fact);
}

// An account that is lost, with its own members beside the code.
Json jsonOfLoss(const Lost& lost) {
  Json json = membersOf(lost);
  json.erase("account");
  if (lost.account == Name{}) return json;
  json.update(jsonOfName(lost.account));
  return json;
}

}  // namespace

std::string_view keyForShowing(const Change& change) {
  return namesCredential(change.oldKey) ? change.oldKey : change.key;
}

nlohmann::ordered_json jsonOf(const std::vector<Name>& accounts) {
  Json json = Json::array();
  for (const Name& account : accounts) json.push_back(jsonOfName(account));
  return json;
}

nlohmann::ordered_json jsonOf(const Fact& fact) {
  Json json{{"fact", nameOf(fact)}};
  json.update(membersOf(fact));
  return json;
}

void addVerdict(const Verdict& verdict, nlohmann::ordered_json& result) {
  result["verdict"] = nameOf(verdict.kind);
  if (verdict.kind == Verdict::Kind::notSaved) result["cause"] = verdict.cause;
  if (verdict.lost.empty()) return;
  result["lost"] = Json::array();
  for (const Lost& lost : verdict.lost) result["lost"].push_back(jsonOfLoss(lost));
}

}  // namespace host
