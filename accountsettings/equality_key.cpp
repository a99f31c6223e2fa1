#include "accountsettings/equality_key.h"

#include <array>
#include <bit>
#include <map>
#include <string_view>

namespace accountsettings {
namespace {

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Text;

void write(std::string& key, const PropertyValue& value);

template <typename Number>
void writeNumber(std::string& key, Number number) {
  const auto bytes = std::bit_cast<std::array<char, sizeof number>>(number);
  key.append(bytes.data(), bytes.size());
}

void writeSized(std::string& key, std::string_view bytes) {
  writeNumber(key, bytes.size());
  key += bytes;
}

void writeEach(std::string& key, const Array& array) {
  writeNumber(key, array.size());
  for (const PropertyValue& element : array) write(key, element);
}

// Dictionaries are equal whatever their order.
void writeEach(std::string& key, const Dictionary& dictionary) {
  std::map<std::string_view, const PropertyValue*> sorted;
  for (const auto& [name, held] : dictionary) sorted.emplace(name.view(), &held);
  writeNumber(key, sorted.size());
  for (const auto& [name, held] : sorted) {
    writeSized(key, name);
    write(key, *held);
  }
}

// Equal values, and only they, write the same bytes.
void write(std::string& key, const PropertyValue& value) {
  key.push_back(static_cast<char>(value.kind()));
  if (const Text* const text = value.asText()) return writeSized(key, text->view());
  if (const auto integer = value.asInteger()) {
    writeNumber(key, integer->isAboveInt64);
    return writeNumber(key, integer->bits);
  }
  if (const double* const real = value.asReal()) return writeNumber(key, *real);
  if (const bool* const boolean = value.asBoolean()) return writeNumber(key, *boolean);
  if (const platform::Date* const date = value.asDate()) return writeNumber(key, date->secondsSince2001);
  if (const platform::Uid* const uid = value.asUid()) return writeNumber(key, uid->number);
  if (const platform::Bytes* const data = value.asData()) {
    return writeSized(key, {reinterpret_cast<const char*>(data->data()), data->size()});
  }
  if (const Array* const array = value.asArray()) return writeEach(key, *array);
  if (const Dictionary* const dictionary = value.asDictionary()) writeEach(key, *dictionary);
}

}  // namespace

std::string equalityKey(const PropertyValue& value) {
  std::string key;
  write(key, value);
  return key;
}

}  // namespace accountsettings
