#include "records/description.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <cmath>

namespace records {

using platform::Array;
using platform::Date;

namespace {

// Words in names of keys that carry credentials, in lower case and without blanks, hyphens and underscores.
constexpr std::array<std::string_view, 11> kCredentialWords{"password", "passwd",  "passphrase",   "passcode",
                                                            "token",    "secret",  "cookie",       "credential",
                                                            "key",      "pincode", "authorization"};

// Harmless settings that are called keys by an old custom of calendars. What else is called a key is taken for one.
constexpr std::array<std::string_view, 3> kPlainKeys{"loginkey", "caldavserverkey", "caldavprincipalpathkey"};

constexpr std::string_view kHidden = "<hidden>";

std::string foldedKey(std::string_view key) {
  std::string folded;
  folded.reserve(key.size());
  for (const char character : key) {
    if (character == ' ' || character == '-' || character == '_') continue;
    folded.push_back(static_cast<char>(std::tolower(static_cast<unsigned char>(character))));
  }
  return folded;
}

bool isPlainWord(std::string_view text) {
  return !text.empty() &&
         std::ranges::all_of(text, [](unsigned char character) { return std::isalnum(character) != 0; });
}

class Writer {
 public:
  void write(const PropertyValue& value) {
    switch (value.kind()) {
      case PropertyValue::Kind::string: return writeText(*value.asText());
      case PropertyValue::Kind::integer: return writeInteger(*value.asInteger());
      case PropertyValue::Kind::real: return writeReal(*value.asReal());
      case PropertyValue::Kind::boolean: return append(*value.asBoolean() ? "true" : "false");
      case PropertyValue::Kind::date: return writeDate(*value.asDate());
      case PropertyValue::Kind::data: return append("<data: " + std::to_string(value.asData()->size()) + " bytes>");
      case PropertyValue::Kind::array: return writeArray(*value.asArray());
      case PropertyValue::Kind::dictionary: return writeDictionary(*value.asDictionary());
      case PropertyValue::Kind::uid: return append("<uid: " + std::to_string(value.asUid()->number) + ">");
    }
  }

  void writeDictionary(const Dictionary& dictionary) {
    append("{");
    std::string_view separator;
    for (const auto& [key, value] : dictionary) {
      append(separator);
      isPlainWord(key) ? append(key) : writeText(key);
      append(" = ");
      namesCredential(key) ? append(kHidden) : write(value);
      separator = "; ";
    }
    append("}");
  }

  [[nodiscard]] std::string take() { return std::move(_text); }

 private:
  void append(std::string_view text) { _text.append(text); }

  void writeText(std::string_view text) {
    append("\"");
    for (const char character : text) writeCharacter(character);
    append("\"");
  }
  void writeCharacter(char character) {
    static constexpr std::string_view kDigits = "0123456789abcdef";
    const auto code = static_cast<unsigned char>(character);
    if (character == '"' || character == '\\') {
      _text.push_back('\\');
      _text.push_back(character);
    } else if (code < 0x20 || code == 0x7F) {
      append("\\x");
      _text.push_back(kDigits[code >> 4U]);
      _text.push_back(kDigits[code & 0xFU]);
    } else {
      _text.push_back(character);
    }
  }
  void writeInteger(PropertyValue::Integer integer) {
    append(integer.isAboveInt64 ? std::to_string(integer.bits)
                                : std::to_string(static_cast<std::int64_t>(integer.bits)));
  }
  void writeReal(double real) {
    std::array<char, 32> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), real).ptr;
    const std::string_view shortest{digits.data(), static_cast<std::size_t>(end - digits.data())};
    append(shortest);
    if (std::isfinite(real) && shortest.find_first_of(".e") == std::string_view::npos) append(".0");
  }
  void writeDate(Date date) {
    append("<date: ");
    writeReal(date.secondsSince2001);
    append(" s since 2001>");
  }
  void writeArray(const Array& array) {
    append("(");
    std::string_view separator;
    for (const PropertyValue& element : array) {
      append(separator);
      write(element);
      separator = ", ";
    }
    append(")");
  }

  std::string _text;
};

PropertyValue presentableArray(const Array& array) {
  Array shown;
  shown.reserve(array.size());
  for (const PropertyValue& element : array) shown.push_back(presentable({}, element));
  return shown;
}

PropertyValue presentableDictionary(const Dictionary& dictionary) {
  Dictionary shown;
  shown.reserve(dictionary.size());
  for (const auto& [key, value] : dictionary) shown.set(key, presentable(key, value));
  return shown;
}

}  // namespace

bool namesCredential(std::string_view key) {
  const std::string folded = foldedKey(key);
  if (std::ranges::find(kPlainKeys, folded) != kPlainKeys.end()) return false;
  return std::ranges::any_of(kCredentialWords,
                             [&folded](std::string_view word) { return folded.find(word) != std::string::npos; });
}

std::string description(const PropertyValue& value) {
  Writer writer;
  writer.write(value);
  return writer.take();
}

std::string descriptionUnder(std::string_view key, const PropertyValue& value) {
  return namesCredential(key) ? std::string{kHidden} : description(value);
}

PropertyValue presentable(std::string_view key, const PropertyValue& value) {
  if (namesCredential(key)) return kHidden;
  switch (value.kind()) {
    case PropertyValue::Kind::array: return presentableArray(*value.asArray());
    case PropertyValue::Kind::dictionary: return presentableDictionary(*value.asDictionary());
    case PropertyValue::Kind::data:
    case PropertyValue::Kind::date:
    case PropertyValue::Kind::uid: return description(value);
    default: return value;
  }
}

std::string description(const Dictionary& dictionary) {
  Writer writer;
  writer.writeDictionary(dictionary);
  return writer.take();
}

}  // namespace records
