#include "tools/account_view.h"

#include <cmath>
#include <nlohmann/json.hpp>

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

}  // namespace

std::string shortDataclass(std::string_view dataclass) {
  if (dataclass.starts_with(kDataclassPrefix)) dataclass.remove_prefix(kDataclassPrefix.size());
  return std::string{dataclass};
}

std::string fullDataclass(std::string_view name) {
  return std::string{name.starts_with(kDataclassPrefix) ? std::string_view{} : kDataclassPrefix} + std::string{name};
}

std::string joinedDataclasses(const Dataclasses& dataclasses) {
  std::string joined;
  for (const std::string& dataclass : dataclasses) joined += (joined.empty() ? "" : ", ") + shortDataclass(dataclass);
  return joined;
}

std::string textUnder(const Dictionary& properties, std::string_view key) {
  const Text* const text = properties.text(key);
  return text == nullptr ? std::string{} : text->string();
}

Names namesOf(const Dictionary& properties) {
  return {textUnder(properties, accountsettings::kAccountIdentifier),
          textUnder(properties, accountsettings::kAccountDisplayName),
          textUnder(properties, accountsettings::kAccountUsername), textUnder(properties, kAccountHost)};
}

Names namesOf(const Account& account) {
  const auto own = [&account](std::string_view key) { return account.ownText(key).value_or(""); };
  const bool isDevicesOwn = account.type() == accountsettings::kOnMyDeviceAccountType;
  return {account.identifier(),
          isDevicesOwn ? account.displayName().value_or("") : own(accountsettings::kAccountDisplayName),
          own(accountsettings::kAccountUsername), own(kAccountHost)};
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

Json jsonOf(const PropertyValue& value) {
  using Kind = PropertyValue::Kind;
  switch (value.kind()) {
    case Kind::string: return records::withoutUserParts(*value.asText());
    case Kind::boolean: return *value.asBoolean();
    case Kind::real: return *value.asReal();
    case Kind::integer: {
      const auto [bits, isAboveInt64] = *value.asInteger();
      return isAboveInt64 ? Json(bits) : Json(static_cast<std::int64_t>(bits));
    }
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

Json jsonOf(const Account& account) {
  const auto orNull = [](const std::string& text) { return text.empty() ? Json(nullptr) : Json(text); };
  const Names names = namesOf(account);
  return {{"identifier", orNull(names.identifier)},
          {"type", orNull(account.type())},
          {"class", orNull(account.accountClass())},
          {"name", orNull(account.displayName().value_or(""))},
          {"user", orNull(names.user)},
          {"host", orNull(names.host)},
          {"parent", orNull(account.parentIdentifier())},
          {"enabled", account.listsDataclasses() ? Json(account.enabledDataclasses()) : Json(nullptr)},
          {"supported", account.supportedDataclasses()}};
}

std::string lineOf(const PropertyValue& value, std::string_view key) {
  if (records::namesCredential(key)) return kHidden;
  const auto* const text = value.asText();
  return text == nullptr ? records::description(value) : records::withoutUserParts(*text);
}

}  // namespace tools
