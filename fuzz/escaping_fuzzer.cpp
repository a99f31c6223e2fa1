// Whatever turns one text into another, each undone or described by a model: percent escapes, the description of
// values, lines for logs and terminals, tables, properties on a command line.
#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include "commandline/table.h"
#include "fuzz/input.h"
#include "fuzz/require.h"
#include "migrator/accounts_data_migrator.h"
#include "platform/characters.h"
#include "platform/text.h"
#include "records/description.h"
#include "records/message.h"
#include "tools/key_value.h"
#include "tools/options.h"

namespace {

using fuzz::Input;
using fuzz::require;
using platform::PropertyValue;
using platform::Text;

int digitOf(char character, std::string_view digits) {
  const std::size_t place = digits.find(character);
  require(place != std::string_view::npos, "no digit");
  return static_cast<int>(place);
}

char byteOf(std::string_view twoDigits, std::string_view digits) {
  return static_cast<char>(digitOf(twoDigits[0], digits) * 16 + digitOf(twoDigits[1], digits));
}

void checkPercentEscapes(const std::string& text) {
  constexpr std::string_view kSafe = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_.!~*'();:&=+$,";
  const std::string whole = migrator::AccountsDataMigrator::_urlSafeUsername(text);
  std::string undone;
  for (std::string_view escaped = whole; !escaped.empty(); escaped.remove_prefix(1)) {
    if (escaped.front() != '%') {
      require(kSafe.find(escaped.front()) != std::string_view::npos, "an unsafe character");
      undone += escaped.front();
      continue;
    }
    require(escaped.size() >= 3, "half an escape");
    const char byte = byteOf(escaped.substr(1), "0123456789ABCDEF");
    require(kSafe.find(byte) == std::string_view::npos, "a safe character escaped");
    undone += byte;
    escaped.remove_prefix(2);
  }
  require(undone == text, "percent escapes do not give the text back");
}

std::string unquoted(std::string_view quoted) {
  require(quoted.size() >= 2 && quoted.front() == '"' && quoted.back() == '"', "no quotes");
  quoted = quoted.substr(1, quoted.size() - 2);
  std::string undone;
  for (; !quoted.empty(); quoted.remove_prefix(1)) {
    require(static_cast<unsigned char>(quoted.front()) >= 0x20 && quoted.front() != 0x7F, "a control character");
    require(quoted.front() != '"', "the text ends within");
    if (quoted.front() != '\\') {
      undone += quoted.front();
    } else if (quoted.substr(1).starts_with('x')) {
      undone += byteOf(quoted.substr(2), "0123456789abcdef");
      quoted.remove_prefix(3);
    } else {
      undone += quoted.substr(1).front();
      quoted.remove_prefix(1);
    }
  }
  return undone;
}

void checkDescription(const Text& text) {
  const std::string described = records::description(platform::Dictionary{{"k", text}});
  require(described.starts_with("{k = ") && described.ends_with("}"), "no dictionary");
  require(unquoted(std::string_view{described}.substr(5, described.size() - 6)) == text.view(),
          "the description does not give the text back");
  const std::string hidden = records::description(platform::Dictionary{{"my Pass-Word", text}});
  require(hidden == "{\"my Pass-Word\" = <hidden>}", "a credential is shown");
}

bool isClean(std::string_view text) {
  if (!platform::isWellFormedText(text)) return text.empty();
  for (std::size_t place = 0; place < text.size(); ++place) {
    const auto byte = static_cast<unsigned char>(text[place]);
    if ((byte < 0x20 && byte != '\t') || byte == 0x7F) return false;
    const std::string_view character = text.substr(place, 3);
    if (character >= "\u0080" && character.substr(0, 2) <= "\u009F") return false;
    if (character >= "\u2028" && character <= "\u202E") return false;
    if (character >= "\u2066" && character <= "\u2069") return false;
  }
  return true;
}

void checkLines(const std::string& text) {
  const std::string line = platform::singleLine(text);
  require(isClean(line), "a line that is none");
  require(!isClean(text) || line == text, "a clean line is changed");
  require(line.size() >= text.size(), "something is lost");
}

void checkTables(const Text& text) {
  const std::string shown = platform::printable(text);
  require(isClean(shown) && shown.find('\t') == std::string::npos, "an unprintable character");
  require(platform::printable(shown) == shown, "printable text is changed");
  const std::string lines = commandline::table({{text.string(), "x", text.string()}, {"", text.string()}});
  require(std::ranges::count(lines, '\n') == 2, "not one line a row");
}

void checkKeyValue(const std::string& argument) {
  const std::size_t equals = argument.find('=');
  try {
    const tools::KeyValue read = tools::parseKeyValue(argument, 1);
    require(equals != std::string::npos && argument.starts_with(read.key), "another key");
    if (argument[equals - 1] == ':') return;
    require(read.value == PropertyValue{argument.substr(equals + 1)}, "another value");
  } catch (const tools::Failure&) {
    const bool isText = equals != std::string::npos && equals > 0 && argument[equals - 1] != ':';
    require(!isText, "a text is refused");
  }
}

void checkMessage(const std::string& format, const std::string& text) {
  const std::array<records::MessageArgument, 1> arguments{text};
  const std::string message = records::message(format, arguments);
  // Only the first placeholder is replaced, and what replaces it is not looked at again.
  std::size_t first = std::string::npos;
  std::size_t length = 0;
  for (const std::string_view placeholder : {"%@", "%s", "%d", "%ld"}) {
    const std::size_t place = format.find(placeholder);
    if (place >= first) continue;
    first = place;
    length = placeholder.size();
  }
  const std::string expected =
      first == std::string::npos ? format : format.substr(0, first) + text + format.substr(first + length);
  require(message == expected, "another message");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Input input{data, size};
  const std::string format = input.bytes(12);
  const std::string raw = input.rest();
  const Text text{raw};
  checkPercentEscapes(raw);
  checkDescription(text);
  checkLines(raw);
  checkLines(text.string());
  checkTables(text);
  checkKeyValue(raw);
  checkMessage(format, raw);
  return 0;
}
