#include "tools/account_view.h"

#include <cmath>
#include <nlohmann/json.hpp>

#include "accountsettings/device_local_account.h"
#include "platform/characters.h"
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

BasicAccount::Dataclasses enabledOf(const BasicAccount& account) {
  return account.enabledDataclasses().value_or(BasicAccount::Dataclasses{});
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

std::string textUnder(const Dictionary& properties, std::string_view key) {
  const Text* const text = properties.text(key);
  return text == nullptr ? std::string{} : text->string();
}

std::string ownText(const BasicAccount& account, std::string_view key) { return textUnder(account.properties(), key); }

std::string ownName(const BasicAccount& account) {
  return isDeviceLocal(account) ? nameOf(account) : ownText(account, accountsettings::kAccountDisplayName);
}

Names namesOf(const Dictionary& properties) {
  return {textUnder(properties, accountsettings::kAccountIdentifier),
          textUnder(properties, accountsettings::kAccountDisplayName),
          textUnder(properties, accountsettings::kAccountUsername), textUnder(properties, kAccountHost)};
}

Names namesOf(const BasicAccount& account) {
  Names names = namesOf(account.properties());
  names.identifier = account.identifier().value_or(Text{}).string();
  names.name = ownName(account);
  return names;
}

std::string serviceOf(const Dictionary& properties) {
  const Names names = namesOf(properties);
  if (names.user.empty()) return {};
  return names.user + (names.host.empty() ? "\n" + names.name : "@" + names.host);
}

bool Names::areMeantBy(const std::string& word) const {
  const std::string meant = platform::caseFolded(word);
  const auto isCalled = [&](const std::string& called) {
    return !called.empty() && platform::caseFolded(called) == meant;
  };
  return !meant.empty() && (platform::caseFolded(identifier).starts_with(meant) || isCalled(name) || isCalled(user) ||
                            (!user.empty() && isCalled(user + "@" + host)));
}

std::string Names::described() const {
  if (identifier.empty()) return name.empty() ? "an account without a name" : name;
  return identifier + (name.empty() ? "" : " (" + name + ")");
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
  const auto orNull = [](const std::string& text) { return text.empty() ? Json(nullptr) : Json(text); };
  return {{"identifier", jsonOf(account.identifier())},
          {"type", jsonOf(account.type())},
          {"class", jsonOf(account.accountClass())},
          {"name", orNull(nameOf(account))},
          {"user", orNull(ownText(account, accountsettings::kAccountUsername))},
          {"host", orNull(ownText(account, kAccountHost))},
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
