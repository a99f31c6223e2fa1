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

// Wherever they stand in the name of a key, in lower case and without blanks, hyphens and underscores.
constexpr auto kCredentialWords =
    std::to_array<std::string_view>({"password", "passwd", "passphrase", "passcode", "pincode", "token", "secret",
                                     "cookie", "oauth", "bearer", "authorization", "key", "credential", "sessionid"});

// Short ones, which are found in harmless words, too: one of the words that a name consists of. "Compass" is none of
// them, "IMAPPass", "user_pw" and "PIN" each have one.
constexpr std::array<std::string_view, 6> kShortCredentialWords{"pass", "pin", "pw", "pwd", "otp", "session"};
// A word that goes on without a new one being begun: "sessionid", "otpauth"; but "sessions" are a number of them.
constexpr std::array<std::string_view, 2> kCredentialBeginnings{"otp", "session"};
constexpr std::array<std::string_view, 2> kCredentialEndings{"pw", "pwd"};
constexpr std::string_view kNumberOfSessions = "sessions";

// Harmless settings that are called keys by an old custom of calendars. What else is called a key is taken for one.
constexpr std::array<std::string_view, 3> kPlainKeys{"loginkey", "caldavserverkey", "caldavprincipalpathkey"};

constexpr std::string_view kHidden = "<hidden>";

bool isLower(char character) { return std::islower(static_cast<unsigned char>(character)) != 0; }
bool isAlphabetic(char character) { return std::isalpha(static_cast<unsigned char>(character)) != 0; }
char lower(char character) { return static_cast<char>(std::tolower(static_cast<unsigned char>(character))); }

// Whether a new word begins at the place: "userPass", "IMAPPass", "user_pass".
bool beginsWord(std::string_view key, std::size_t place) {
  if (!isAlphabetic(key[place])) return false;
  if (place == 0 || !isAlphabetic(key[place - 1])) return true;
  if (std::isupper(static_cast<unsigned char>(key[place])) == 0) return false;
  return isLower(key[place - 1]) || (place + 1 < key.size() && isLower(key[place + 1]));
}

bool isShortCredentialWord(std::string_view word) {
  const auto begins = [word](std::string_view beginning) { return word.starts_with(beginning); };
  const auto ends = [word](std::string_view ending) { return word.ends_with(ending); };
  if (word == kNumberOfSessions) return false;
  return std::ranges::find(kShortCredentialWords, word) != kShortCredentialWords.end() ||
         std::ranges::any_of(kCredentialBeginnings, begins) || std::ranges::any_of(kCredentialEndings, ends);
}

bool hasShortCredentialWord(std::string_view key) {
  for (std::size_t place = 0; place < key.size(); ++place) {
    if (!beginsWord(key, place)) continue;
    std::string word{lower(key[place])};
    for (std::size_t next = place + 1; next < key.size() && isAlphabetic(key[next]) && !beginsWord(key, next); ++next) {
      word.push_back(lower(key[next]));
    }
    if (isShortCredentialWord(word)) return true;
  }
  return false;
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
      const bool isWord = !key.empty() && std::ranges::all_of(key.view(), [](unsigned char character) {
        return std::isalnum(character) != 0;
      });
      isWord ? append(key) : writeText(key);
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
    for (const char character : withoutUserParts(text)) writeCharacter(character);
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

}  // namespace

std::string withoutUserParts(std::string_view text) {
  static constexpr std::string_view kScheme = "://";
  static constexpr std::string_view kAfterHost = "/?#\\\"'<> \t\r\n";
  std::string shown;
  for (std::size_t scheme = text.find(kScheme); scheme != std::string_view::npos; scheme = text.find(kScheme)) {
    shown += text.substr(0, scheme + kScheme.size());
    text.remove_prefix(scheme + kScheme.size());
    const std::size_t at = text.substr(0, text.find_first_of(kAfterHost)).rfind('@');
    if (at == std::string_view::npos) continue;
    shown += kHidden;
    text.remove_prefix(at);
  }
  return shown.append(text);
}

bool namesCredential(std::string_view key) {
  std::string folded;
  folded.reserve(key.size());
  for (const char character : key) {
    if (character != ' ' && character != '-' && character != '_') folded.push_back(lower(character));
  }
  if (std::ranges::find(kPlainKeys, folded) != kPlainKeys.end()) return false;
  const auto isPart = [&folded](std::string_view word) { return folded.find(word) != std::string::npos; };
  return std::ranges::any_of(kCredentialWords, isPart) ||
         (std::ranges::any_of(kShortCredentialWords, isPart) && hasShortCredentialWord(key));
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
  if (const Array* const array = value.asArray()) {
    Array shown;
    shown.reserve(array->size());
    for (const PropertyValue& element : *array) shown.push_back(presentable({}, element));
    return shown;
  }
  if (const Dictionary* const dictionary = value.asDictionary()) {
    Dictionary shown;
    shown.reserve(dictionary->size());
    for (const auto& [name, part] : *dictionary) shown.set(name, presentable(name, part));
    return shown;
  }
  switch (value.kind()) {
    case PropertyValue::Kind::data:
    case PropertyValue::Kind::date:
    case PropertyValue::Kind::uid: return description(value);
    case PropertyValue::Kind::string: return withoutUserParts(*value.asText());
    default: return value;
  }
}

std::string description(const Dictionary& dictionary) {
  Writer writer;
  writer.writeDictionary(dictionary);
  return writer.take();
}

}  // namespace records
