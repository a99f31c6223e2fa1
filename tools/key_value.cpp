#include "tools/key_value.h"

#include <nlohmann/json.hpp>

#include "tools/options.h"

namespace tools {
namespace {

using Json = nlohmann::ordered_json;
using platform::PropertyValue;

[[noreturn]] void refuseProperty(const std::string& problem, std::size_t position) {
  throw Failure{ExitStatus::wrongUse, "property " + std::to_string(position) + " " + problem};
}

// Property lists know every kind of JSON value but null.
PropertyValue valueOf(const Json& json, std::size_t position) {
  if (json.is_string()) return json.get<std::string>();
  if (json.is_boolean()) return json.get<bool>();
  if (json.is_number_unsigned()) return json.get<std::uint64_t>();
  if (json.is_number_integer()) return json.get<std::int64_t>();
  if (json.is_number()) return json.get<double>();
  if (json.is_array()) {
    platform::Array elements;
    for (const auto& element : json) elements.push_back(valueOf(element, position));
    return elements;
  }
  if (!json.is_object()) refuseProperty("holds null, which is no value", position);
  platform::Dictionary members;
  for (const auto& [key, member] : json.items()) members.set(key, valueOf(member, position));
  return members;
}

}  // namespace

KeyValue parseKeyValue(std::string_view argument, std::size_t position) {
  const auto equals = argument.find('=');
  if (equals == std::string_view::npos) refuseProperty("is not written KEY=VALUE or KEY:=JSON", position);
  const bool isJson = equals > 0 && argument[equals - 1] == ':';
  const auto key = argument.substr(0, isJson ? equals - 1 : equals);
  const auto value = argument.substr(equals + 1);
  if (key.empty()) refuseProperty("has no key", position);
  if (!isJson) return {std::string{key}, PropertyValue{value}};
  const auto json = Json::parse(value, nullptr, false);
  if (json.is_discarded()) refuseProperty("is no valid JSON after :=", position);
  return {std::string{key}, json.is_null() ? std::nullopt : std::optional{valueOf(json, position)}};
}

}  // namespace tools
