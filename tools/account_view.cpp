#include "tools/account_view.h"

#include <cmath>
#include <nlohmann/json.hpp>

#include "accountsettings/device_local_account.h"
#include "records/description.h"

namespace tools {
namespace {

using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;
using Json = nlohmann::ordered_json;

constexpr std::string_view kDataclassPrefix = "com.vorlix.Dataclass.";
constexpr const char* kHidden = "<hidden>";

Json jsonOf(const std::optional<Text>& text) { return text ? Json(text->string()) : Json(nullptr); }

bool isDeviceLocal(const BasicAccount& account) {
  const auto type = account.type();
  return type && *type == accountsettings::kOnMyDeviceAccountType;
}

Json numberOf(const PropertyValue& value) {
  const auto integer = value.asInteger();
  if (!integer) return *value.asReal();
  return integer->isAboveInt64 ? Json(integer->bits) : Json(static_cast<std::int64_t>(integer->bits));
}

}  // namespace

std::string shortDataclass(std::string_view dataclass) {
  if (dataclass.starts_with(kDataclassPrefix)) dataclass.remove_prefix(kDataclassPrefix.size());
  return std::string{dataclass};
}

std::string fullDataclass(std::string_view name) {
  return std::string{name.starts_with(kDataclassPrefix) ? std::string_view{} : kDataclassPrefix} + std::string{name};
}

std::string joinedDataclasses(const BasicAccount::Dataclasses& dataclasses) {
  std::string joined;
  for (const Text& dataclass : dataclasses) joined += (joined.empty() ? "" : ", ") + shortDataclass(dataclass);
  return joined;
}

std::string nameOf(const BasicAccount& account) {
  if (isDeviceLocal(account)) return accountsettings::DeviceLocalAccount::class_typeString();
  return account.displayName().value_or(Text{}).string();
}

std::string ownText(const BasicAccount& account, std::string_view key) {
  const Text* const text = account.properties().text(key);
  return text == nullptr ? std::string{} : text->string();
}

std::string ownName(const BasicAccount& account) {
  return isDeviceLocal(account) ? nameOf(account) : ownText(account, accountsettings::kAccountDisplayName);
}

ChildrenByParent childrenByParent(const AccountsManager& accounts) {
  ChildrenByParent children;
  for (const auto& account : accounts.allBasicSyncableAccounts()) {
    if (const auto& parent = account->parentAccount()) children[parent.get()].push_back(account);
  }
  return children;
}

Json jsonOf(const PropertyValue& value) {
  using Kind = PropertyValue::Kind;
  switch (value.kind()) {
    case Kind::string: return records::withoutUserParts(*value.asText());
    case Kind::boolean: return *value.asBoolean();
    case Kind::integer:
    case Kind::real: return numberOf(value);
    case Kind::dictionary: return jsonOf(*value.asDictionary());
    case Kind::array: {
      auto elements = Json::array();
      for (const PropertyValue& element : *value.asArray()) elements.push_back(jsonOf(element));
      return elements;
    }
    case Kind::date:
    case Kind::data:
    case Kind::uid: break;
  }
  return records::description(value);
}

Json jsonOf(const Dictionary& properties) {
  auto members = Json::object();
  for (const auto& [key, value] : properties) {
    members[key.string()] = records::namesCredential(key) ? Json(kHidden) : jsonOf(value);
  }
  return members;
}

Json jsonOf(const BasicAccount::Dataclasses& dataclasses) {
  auto elements = Json::array();
  for (const Text& dataclass : dataclasses) elements.push_back(dataclass.string());
  return elements;
}

Json jsonOf(const BasicAccount& account) {
  const auto enabled = account.enabledDataclasses();
  return {{"identifier", jsonOf(account.identifier())},
          {"type", jsonOf(account.type())},
          {"class", jsonOf(account.accountClass())},
          {"name", nameOf(account)},
          {"parent", jsonOf(account.parentAccountIdentifier())},
          {"enabled", enabled ? jsonOf(*enabled) : Json(nullptr)},
          {"supported", jsonOf(account.supportedDataclasses())}};
}

std::string lineOf(const PropertyValue& value, std::string_view key) {
  if (records::namesCredential(key)) return kHidden;
  const auto* const text = value.asText();
  return text == nullptr ? records::description(value) : records::withoutUserParts(*text);
}

}  // namespace tools
