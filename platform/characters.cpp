#include "platform/characters.h"

#include <utf8proc.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>

namespace platform {
namespace {

using Code = utf8proc_int32_t;

constexpr Code kNoCharacter = -1;

struct Character {
  std::string_view bytes;
  Code code;  // kNoCharacter for a byte that is no character
};

const utf8proc_uint8_t* bytesOf(std::string_view text) {
  return reinterpret_cast<const utf8proc_uint8_t*>(text.data());
}

// Takes the character off the front of a text that is not empty.
Character takeFirst(std::string_view& text) {
  Code code = kNoCharacter;
  const auto length = ::utf8proc_iterate(bytesOf(text), static_cast<utf8proc_ssize_t>(text.size()), &code);
  const std::size_t taken = length > 0 ? static_cast<std::size_t>(length) : 1;
  const Character first{text.substr(0, taken), length > 0 ? code : kNoCharacter};
  text.remove_prefix(taken);
  return first;
}

bool isWithin(Code code, Code first, Code last) { return code >= first && code <= last; }

bool isUnsafe(Code code) {
  return code < 0x20 || isWithin(code, 0x7F, 0x9F) || isWithin(code, 0x2028, 0x202E) || isWithin(code, 0x2066, 0x2069);
}

// The text with what `shownFor` answers in place of each character that is unsafe.
template <typename ShownFor>
std::string madeSafe(std::string_view text, const ShownFor& shownFor) {
  std::string safe;
  safe.reserve(text.size());
  const auto isPlain = [](unsigned char byte) { return byte >= 0x20 && byte < 0x7F; };  // safe whatever follows it
  while (!text.empty()) {
    const auto plain = static_cast<std::size_t>(std::ranges::find_if_not(text, isPlain) - text.begin());
    safe += text.substr(0, plain);
    text.remove_prefix(plain);
    if (text.empty()) break;
    const Character next = takeFirst(text);
    if (isUnsafe(next.code)) {
      safe += shownFor(next);
    } else {
      safe += next.bytes;
    }
  }
  return safe;
}

void append(std::string& text, Code code) {
  std::array<utf8proc_uint8_t, 4> bytes{};
  const auto size = ::utf8proc_encode_char(code, bytes.data());
  text.append(bytes.begin(), bytes.begin() + size);
}

// Only folding takes apart a letter that has several capitals; each part of it has at most one.
void appendUpperCased(std::string& text, Code code) {
  std::array<Code, 4> folded{};
  int ignored = 0;
  const auto count = static_cast<std::size_t>(
      ::utf8proc_decompose_char(code, folded.data(), folded.size(), UTF8PROC_CASEFOLD, &ignored));
  if (count == 1 || ::utf8proc_isupper(code) != 0) return append(text, ::utf8proc_toupper(code));
  for (std::size_t part = 0; part < count; ++part) append(text, ::utf8proc_toupper(folded.at(part)));
}

struct Freed {
  void operator()(utf8proc_uint8_t* bytes) const { std::free(bytes); }
};

}  // namespace

std::string singleLine(std::string_view text) {
  return madeSafe(text, [](const Character& character) -> std::string {
    if (character.code == '\t') return "\t";
    if (character.code == '\n') return "\\n";
    if (character.code == '\r') return "\\r";
    const bool isByte = character.code == kNoCharacter;
    const auto number =
        isByte ? static_cast<unsigned char>(character.bytes.front()) : static_cast<unsigned>(character.code);
    std::array<char, 16> spelt{};
    std::snprintf(spelt.data(), spelt.size(), number < 0x100 ? "\\x%02x" : "\\u%04x", number);
    return spelt.data();
  });
}

std::string printable(std::string_view text) {
  return madeSafe(text, [](const Character&) { return "\uFFFD"; });
}

std::string upperCased(std::string_view text) {
  std::string upper;
  while (!text.empty()) {
    const Character next = takeFirst(text);
    if (next.code == kNoCharacter) {
      upper += next.bytes;
    } else {
      appendUpperCased(upper, next.code);
    }
  }
  return upper;
}

std::string caseFolded(std::string_view text) {
  constexpr auto kForm = static_cast<utf8proc_option_t>(UTF8PROC_STABLE | UTF8PROC_COMPOSE | UTF8PROC_CASEFOLD);
  utf8proc_uint8_t* mapped = nullptr;
  const auto size = ::utf8proc_map(bytesOf(text), static_cast<utf8proc_ssize_t>(text.size()), &mapped, kForm);
  const std::unique_ptr<utf8proc_uint8_t, Freed> folded{mapped};
  return size < 0 ? std::string{text} : std::string{mapped, mapped + size};
}

}  // namespace platform
