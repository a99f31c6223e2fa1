#include "accounts/value.h"

#include <utility>

#include "client/contents.h"

namespace accounts {
namespace {

using platform::PropertyValue;

template <typename Content>
std::shared_ptr<const Value::Content> holding(Content&& content) {
  return std::make_shared<const Value::Content>(Value::Content{PropertyValue{std::forward<Content>(content)}});
}

platform::Array arrayOf(const Value::List& list) {
  platform::Array array;
  array.reserve(list.size());
  for (const Value& element : list) array.push_back(element.content().value);
  return array;
}

platform::Dictionary dictionaryOf(const Value::Dictionary& entries) {
  platform::Dictionary dictionary;
  for (const auto& [key, value] : entries) dictionary.set(key, value.content().value);
  return dictionary;
}

template <typename Given>
std::optional<Given> copied(const Given* value) {
  return value == nullptr ? std::nullopt : std::optional{*value};
}

}  // namespace

Value::Value() : _content{holding(platform::Text{})} {}
Value::Value(const char* text) : _content{holding(text)} {}
Value::Value(std::string_view text) : _content{holding(text)} {}
Value::Value(const std::string& text) : _content{holding(text)} {}
Value::Value(bool boolean) : _content{holding(boolean)} {}
Value::Value(int integer) : _content{holding(integer)} {}
Value::Value(unsigned integer) : _content{holding(std::uint64_t{integer})} {}
Value::Value(long integer) : _content{holding(std::int64_t{integer})} {}
Value::Value(unsigned long integer) : _content{holding(std::uint64_t{integer})} {}
Value::Value(long long integer) : _content{holding(std::int64_t{integer})} {}
Value::Value(unsigned long long integer) : _content{holding(std::uint64_t{integer})} {}
Value::Value(double real) : _content{holding(real)} {}
Value::Value(Date date) : _content{holding(platform::Date{date.secondsSince2001})} {}
Value::Value(Data data) : _content{holding(std::move(data))} {}
Value::Value(Reference reference) : _content{holding(platform::Uid{reference.number})} {}
Value::Value(const List& list) : _content{holding(arrayOf(list))} {}
Value::Value(const Dictionary& dictionary) : _content{holding(dictionaryOf(dictionary))} {}
Value::Value(std::shared_ptr<const Content> content) : _content{std::move(content)} {}

Value::Kind Value::kind() const {
  switch (content().value.kind()) {
    case PropertyValue::Kind::string: return Kind::text;
    case PropertyValue::Kind::integer: return Kind::integer;
    case PropertyValue::Kind::real: return Kind::real;
    case PropertyValue::Kind::boolean: return Kind::boolean;
    case PropertyValue::Kind::date: return Kind::date;
    case PropertyValue::Kind::data: return Kind::data;
    case PropertyValue::Kind::array: return Kind::list;
    case PropertyValue::Kind::dictionary: return Kind::dictionary;
    case PropertyValue::Kind::uid: return Kind::other;
  }
  return Kind::other;
}

std::optional<std::string> Value::text() const {
  const platform::Text* const text = content().value.asText();
  return text == nullptr ? std::nullopt : std::optional{text->string()};
}

std::optional<std::int64_t> Value::integer() const {
  const auto integer = content().value.asInteger();
  if (!integer || integer->isAboveInt64) return std::nullopt;
  return static_cast<std::int64_t>(integer->bits);
}

std::optional<std::uint64_t> Value::unsignedInteger() const {
  const auto integer = content().value.asInteger();
  if (!integer) return std::nullopt;
  const bool isNegative = !integer->isAboveInt64 && static_cast<std::int64_t>(integer->bits) < 0;
  return isNegative ? std::nullopt : std::optional{integer->bits};
}

std::optional<double> Value::real() const { return copied(content().value.asReal()); }
std::optional<bool> Value::boolean() const { return copied(content().value.asBoolean()); }
std::optional<Value::Data> Value::data() const { return copied(content().value.asData()); }

std::optional<Reference> Value::reference() const {
  const platform::Uid* const uid = content().value.asUid();
  return uid == nullptr ? std::nullopt : std::optional{Reference{uid->number}};
}

std::optional<Date> Value::date() const {
  const platform::Date* const date = content().value.asDate();
  return date == nullptr ? std::nullopt : std::optional{Date{date->secondsSince2001}};
}

std::optional<Value::List> Value::list() const {
  const platform::Array* const array = content().value.asArray();
  if (array == nullptr) return std::nullopt;
  List list;
  list.reserve(array->size());
  for (const PropertyValue& element : *array) list.push_back(valueOf(element));
  return list;
}

std::optional<Value::Dictionary> Value::dictionary() const {
  const platform::Dictionary* const dictionary = content().value.asDictionary();
  if (dictionary == nullptr) return std::nullopt;
  Dictionary entries;
  for (const auto& [key, value] : *dictionary) entries.emplace_back(key.string(), valueOf(value));
  return entries;
}

bool operator==(const Value& left, const Value& right) { return left.content().value == right.content().value; }

}  // namespace accounts
