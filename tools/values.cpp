// Values as a file has them and as the interface for programs has them.

#include "tools/account_view.h"

namespace tools {

using accounts::Value;
using accountsettings::Dictionary;
using platform::PropertyValue;

namespace {

Dictionary recordOf(const Value::Dictionary& entries) {
  Dictionary record;
  for (const auto& [key, value] : entries) record.set(key, fileValueOf(value));
  return record;
}

}  // namespace

PropertyValue fileValueOf(const Value& value) {
  switch (value.kind()) {
    case Value::Kind::text: return *value.text();
    case Value::Kind::integer:
      return value.integer() ? PropertyValue{*value.integer()} : PropertyValue{*value.unsignedInteger()};
    case Value::Kind::real: return *value.real();
    case Value::Kind::boolean: return *value.boolean();
    case Value::Kind::date: return platform::Date{value.date()->secondsSince2001};
    case Value::Kind::data: return *value.data();
    case Value::Kind::dictionary: return recordOf(*value.dictionary());
    case Value::Kind::other: return platform::Uid{value.reference()->number};
    case Value::Kind::list: break;
  }
  platform::Array elements;
  const Value::List list = *value.list();
  for (const Value& element : list) elements.push_back(fileValueOf(element));
  return elements;
}

Value valueOf(const PropertyValue& value) {
  switch (value.kind()) {
    case PropertyValue::Kind::string: return value.asText()->view();
    case PropertyValue::Kind::integer: {
      const auto [bits, isAboveInt64] = *value.asInteger();
      return isAboveInt64 ? Value{bits} : Value{static_cast<std::int64_t>(bits)};
    }
    case PropertyValue::Kind::real: return *value.asReal();
    case PropertyValue::Kind::boolean: return *value.asBoolean();
    case PropertyValue::Kind::date: return accounts::Date{value.asDate()->secondsSince2001};
    case PropertyValue::Kind::data: return *value.asData();
    case PropertyValue::Kind::dictionary: return entriesOf(*value.asDictionary());
    case PropertyValue::Kind::uid: return accounts::Reference{value.asUid()->number};
    case PropertyValue::Kind::array: break;
  }
  Value::List elements;
  for (const PropertyValue& element : *value.asArray()) elements.push_back(valueOf(element));
  return elements;
}

Value::Dictionary entriesOf(const Dictionary& properties) {
  Value::Dictionary entries;
  for (const auto& [key, value] : properties) entries.emplace_back(key.string(), valueOf(value));
  return entries;
}

Dictionary recordOf(const accounts::Account& account) { return recordOf(account.ownProperties()); }

}  // namespace tools
