#include "platform/text.h"

#include <utf8.h>

#include <cstdint>
#include <cstring>

namespace platform {
namespace {

constexpr std::string_view kReplacementCharacter = "\xEF\xBF\xBD";

// Adds the bytes, none of which is NUL, with U+FFFD for each byte that is part of no character.
void appendRepaired(std::string& text, std::string_view bytes) {
  while (true) {
    const auto* const end = utf8::find_invalid(bytes.begin(), bytes.end());
    text.append(bytes.begin(), end);
    if (end == bytes.end()) return;
    text += kReplacementCharacter;
    bytes.remove_prefix(static_cast<std::size_t>(end - bytes.begin()) + 1);
  }
}

std::string repaired(std::string_view bytes) {
  std::string text;
  text.reserve(bytes.size());
  while (true) {
    const std::string_view piece = bytes.substr(0, bytes.find('\0'));
    appendRepaired(text, piece);
    if (piece.size() == bytes.size()) return text;
    text += kReplacementCharacter;
    bytes.remove_prefix(piece.size() + 1);
  }
}

std::shared_ptr<const char> copyOf(std::string_view bytes) {
  const std::shared_ptr<char[]> copy = std::make_shared_for_overwrite<char[]>(bytes.size() + 1);
  std::memcpy(copy.get(), bytes.data(), bytes.size());
  copy[static_cast<std::ptrdiff_t>(bytes.size())] = '\0';
  return {copy, copy.get()};
}

}  // namespace

std::size_t plainPrefix(std::string_view bytes) {
  constexpr std::uint64_t kOnes = 0x0101010101010101U;
  constexpr std::uint64_t kHighBits = 0x8080808080808080U;
  std::size_t length = 0;
  for (std::uint64_t eight = 0; bytes.size() - length >= sizeof eight; length += sizeof eight) {
    std::memcpy(&eight, bytes.data() + length, sizeof eight);
    const bool arePlain = ((eight | (eight - kOnes)) & kHighBits) == 0;
    if (!arePlain) break;
  }
  while (length < bytes.size() && bytes[length] > 0) ++length;
  return length;
}

bool isWellFormedText(std::string_view bytes) {
  bytes.remove_prefix(plainPrefix(bytes));
  return bytes.find('\0') == std::string_view::npos && utf8::is_valid(bytes.begin(), bytes.end());
}

Text::Text(std::string_view characters) {
  if (characters.empty()) return;
  if (isWellFormedText(characters)) {
    _characters = copyOf(characters);
    _size = characters.size();
    return;
  }
  const std::string text = repaired(characters);
  _characters = copyOf(text);
  _size = text.size();
}

Text::Text(StringConstant constant)
    : _characters{std::shared_ptr<const void>{}, constant.view().data()}, _size{constant.view().size()} {}

}  // namespace platform
