#include "platform/text.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace platform {
namespace {

constexpr std::string_view kReplacementCharacter = "\xEF\xBF\xBD";

bool isContinuation(char byte) { return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U; }

// The smallest and largest second byte that may follow a lead byte, and the length of the whole sequence; length 0 for
// a byte that leads nothing.
struct Sequence {
  std::size_t length;
  std::uint8_t secondFrom;
  std::uint8_t secondTo;
};

Sequence sequenceLedBy(char lead) {
  const auto byte = static_cast<std::uint8_t>(lead);
  if (byte >= 0x01 && byte <= 0x7F) return {1, 0, 0};
  if (byte >= 0xC2 && byte <= 0xDF) return {2, 0x80, 0xBF};
  if (byte == 0xE0) return {3, 0xA0, 0xBF};
  if (byte == 0xED) return {3, 0x80, 0x9F};
  if (byte >= 0xE1 && byte <= 0xEF) return {3, 0x80, 0xBF};
  if (byte == 0xF0) return {4, 0x90, 0xBF};
  if (byte >= 0xF1 && byte <= 0xF3) return {4, 0x80, 0xBF};
  if (byte == 0xF4) return {4, 0x80, 0x8F};
  return {0, 0, 0};
}

// The length of the well-formed character at the front; 0 where there is none.
std::size_t characterLength(std::string_view bytes) {
  const Sequence sequence = sequenceLedBy(bytes.front());
  if (sequence.length == 0 || sequence.length > bytes.size()) return 0;
  if (sequence.length == 1) return 1;
  const auto second = static_cast<std::uint8_t>(bytes[1]);
  if (second < sequence.secondFrom || second > sequence.secondTo) return 0;
  for (std::size_t index = 2; index < sequence.length; ++index) {
    if (!isContinuation(bytes[index])) return 0;
  }
  return sequence.length;
}

// Whether eight bytes are all ASCII and none of them is NUL.
bool arePlain(std::uint64_t bytes) {
  constexpr std::uint64_t kOnes = 0x0101010101010101U;
  constexpr std::uint64_t kHighBits = 0x8080808080808080U;
  return ((bytes | (bytes - kOnes)) & kHighBits) == 0;
}

std::string repaired(std::string_view bytes) {
  std::string text;
  text.reserve(bytes.size());
  while (!bytes.empty()) {
    const std::size_t length = characterLength(bytes);
    text.append(length == 0 ? kReplacementCharacter : bytes.substr(0, length));
    bytes.remove_prefix(std::max<std::size_t>(length, 1));
  }
  return text;
}

std::shared_ptr<const char> copyOf(std::string_view bytes) {
  const std::shared_ptr<char[]> copy = std::make_shared_for_overwrite<char[]>(bytes.size() + 1);
  std::memcpy(copy.get(), bytes.data(), bytes.size());
  copy[static_cast<std::ptrdiff_t>(bytes.size())] = '\0';
  return {copy, copy.get()};
}

}  // namespace

std::size_t plainPrefix(std::string_view bytes) {
  std::size_t length = 0;
  for (std::uint64_t eight = 0; bytes.size() - length >= sizeof eight; length += sizeof eight) {
    std::memcpy(&eight, bytes.data() + length, sizeof eight);
    if (!arePlain(eight)) break;
  }
  while (length < bytes.size() && bytes[length] > 0) ++length;
  return length;
}

bool isWellFormedText(std::string_view bytes) {
  for (bytes.remove_prefix(plainPrefix(bytes)); !bytes.empty();) {
    const std::size_t length = characterLength(bytes);
    if (length == 0) return false;
    bytes.remove_prefix(length);
  }
  return true;
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
