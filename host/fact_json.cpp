#include "host/fact_json.h"

#include <cmath>
#include <nlohmann/json.hpp>

#include "records/description.h"

namespace host {
namespace {

using Json = nlohmann::ordered_json;
using namespace records;  // the facts

Json jsonOfShown(const PropertyValue& value) {
  if (const auto* const text = value.asText()) return text->string();
  if (const auto integer = value.asInteger()) {
    return integer->isAboveInt64 ? Json(integer->bits) : Json(static_cast<std::int64_t>(integer->bits));
  }
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

Json ofAccount(const Name& account, const Json& members = Json::object()) {
  Json json{{"account", jsonOfName(account)}};
  json.update(members);
  return json;
}

// What each fact has beside its name.
Json membersOf(const Loaded& it) { return Json{{"accounts", it.accounts}, {"version", it.version}}; }
Json membersOf(const CopiedAside& it) { return Json{{"file", it.file}}; }
Json membersOf(const KeptAside& it) {
  Json json = Json::object();
  addUnlessEmpty("file", it.file, json);
  json["where"] = it.where;
  return json;
}
Json membersOf(const Swept& it) { return Json{{"file", it.file}}; }
Json membersOf(const Added& it) { return ofAccount(it.account); }
Json membersOf(const Converted& it) {
  return ofAccount(
      it.account,
      {{"from", it.from}, {"file", it.file}, {"replaces", it.isReplacement}, {"changes", jsonOfChanges(it.changes)}});
}
Json membersOf(const Changed& it) { return ofAccount(it.account, {{"changes", jsonOfChanges(it.changes)}}); }
Json membersOf(const Moved& it) {
  return ofAccount(it.account, it.into ? Json{{"into", Json::array({jsonOfName(*it.into)})}} : Json::object());
}
Json membersOf(const Folded& it) { return ofAccount(it.account, {{"into", jsonOf(it.into)}, {"reason", it.reason}}); }
Json membersOf(const Lost& it) {
  const LossMeaning& meaning = meaningOf(it.code);
  Json json{{"code", meaning.name}, {"reason", meaning.text}};
  addUnlessEmpty("detail", it.detail, json);
  if (it.account != Name{}) json["account"] = jsonOfName(it.account);
  addUnlessEmpty("file", it.file, json);
  addUnlessEmpty("where", it.where, json);
  return json;
}
Json membersOf(const Repeated& it) { return ofAccount(it.account); }
Json membersOf(const Unrepaired& it) { return ofAccount(it.account, {{"reason", it.reason}}); }
Json membersOf(const Saved& it) { return Json{{"file", it.file}, {"accounts", it.accounts}, {"version", it.version}}; }
Json membersOf(const SaveFailed& it) {
  return Json{{"file", it.file}, {"cause", it.cause}, {"accounts", it.accounts}, {"version", it.version}};
}
Json membersOf(const FileRemoved& it) { return Json{{"file", it.file}}; }
Json membersOf(const FileNotRemoved& it) { return Json{{"file", it.file}, {"cause", it.cause}}; }

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
  json.update(std::visit([](const auto& each) { return membersOf(each); }, fact));
  return json;
}

void addVerdict(const Verdict& verdict, nlohmann::ordered_json& result) {
  result["verdict"] = nameOf(verdict.kind);
  if (verdict.kind == Verdict::Kind::notSaved) result["cause"] = verdict.cause;
  if (verdict.lost.empty()) return;
  result["lost"] = Json::array();
  for (const Lost& lost : verdict.lost) {
    Json json = membersOf(lost);
    json.erase("account");  // its members stand beside the code
    if (lost.account != Name{}) json.update(jsonOfName(lost.account));
    result["lost"].push_back(std::move(json));
  }
}

}  // namespace host
