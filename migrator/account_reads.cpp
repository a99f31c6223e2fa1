#include "migrator/account_reads.h"

#include <algorithm>

#include "migrator/stored_names.h"

namespace migrator {

using accountsettings::Array;
using accountsettings::BasicAccount;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;

namespace {

template <typename Value>
std::optional<Value> valueOrNothing(const Value* value) {
  return value != nullptr ? std::optional{*value} : std::nullopt;
}

}  // namespace

std::optional<Text> textForKey(const BasicAccount& account, std::string_view key) {
  const std::optional<PropertyValue> value = account.accountPropertyForKey(key);
  return value ? valueOrNothing(value->asText()) : std::nullopt;
}

std::optional<bool> booleanForKey(const BasicAccount& account, std::string_view key) {
  const std::optional<PropertyValue> value = account.accountPropertyForKey(key);
  return value ? value->booleanValue() : std::nullopt;
}

std::optional<Array> arrayForKey(const BasicAccount& account, std::string_view key) {
  const std::optional<PropertyValue> value = account.accountPropertyForKey(key);
  return value ? valueOrNothing(value->asArray()) : std::nullopt;
}

std::optional<Dictionary> dictionaryForKey(const BasicAccount& account, std::string_view key) {
  const std::optional<PropertyValue> value = account.accountPropertyForKey(key);
  return value ? valueOrNothing(value->asDictionary()) : std::nullopt;
}

bool hasClassAmong(const BasicAccount& account, std::initializer_list<std::string_view> classNames) {
  const std::optional<Text> className = account.accountClass();
  return className && std::ranges::find(classNames, className->view()) != classNames.end();
}

bool isActiveUnlessSaidOtherwise(const BasicAccount& account) {
  return booleanForKey(account, kIsActiveKey).value_or(true);
}

Array arrayOf(const BasicAccount::Dataclasses& dataclasses) { return {dataclasses.begin(), dataclasses.end()}; }

}  // namespace migrator
