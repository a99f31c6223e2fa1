#include "platform/linux/property_lists/xml_text_repair.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <string_view>
#include <system_error>

namespace platform {
namespace {

constexpr char kNoUtf8 = '\xFF';  // becomes U+FFFD where the text is taken
constexpr std::size_t kMaxReferenceSize = 8;
constexpr std::uint64_t kMinMagnitude = std::uint64_t{1} << 63U;
constexpr std::string_view kMinDigits = "9223372036854775808";

bool isDigit(char character) { return character >= '0' && character <= '9'; }

// What follows the "#" of a numerical character reference.
bool isCharacterNumber(std::string_view digits) {
  const bool isHexadecimal = digits.starts_with('x') || digits.starts_with('X');
  if (isHexadecimal) digits.remove_prefix(1);
  std::uint32_t number = 0;
  const char* const end = digits.data() + digits.size();
  const auto [parsed, error] = std::from_chars(digits.data(), end, number, isHexadecimal ? 16 : 10);
  return error == std::errc{} && parsed == end && number != 0 && number <= 0x10FFFF;
}

bool isEntity(std::string_view name) {
  static constexpr std::array<std::string_view, 5> kNames{"amp", "apos", "quot", "lt", "gt"};
  if (name.starts_with('#')) return name.size() <= kMaxReferenceSize && isCharacterNumber(name.substr(1));
  return std::ranges::find(kNames, name) != kNames.end();
}

// Blanks, with the digits at their end.
void rewrite(std::span<char> text, std::string_view digits) {
  std::ranges::fill(text, ' ');
  std::ranges::copy(digits, text.last(digits.size()).begin());
}

}  // namespace

std::size_t repairXmlText(std::span<char> text) {
  constexpr std::size_t kMaxEntitySize = kMaxReferenceSize + 1;
  std::size_t entities = 0;
  for (std::size_t index = 0; index < text.size(); ++index) {
    if (text[index] != '&') continue;
    const std::string_view rest{text.data() + index + 1, std::min(text.size() - index - 1, kMaxEntitySize)};
    const std::size_t length = rest.find(';');
    if (length != std::string_view::npos && isEntity(rest.substr(0, length))) {
      ++entities;
    } else {
      text[index] = kNoUtf8;
    }
  }
  return entities;
}

void repairXmlInteger(std::span<char> text) {
  if (text.empty()) return;
  const bool isNegative = text.front() == '-';
  if (isNegative || text.front() == '+') text = text.subspan(1);
  if (text.empty() || !isDigit(text.front())) return rewrite(text, {});
  while (text.size() > 1 && text[0] == '0' && isDigit(text[1])) {
    text.front() = ' ';
    text = text.subspan(1);
  }
  if (!isNegative) return;
  std::uint64_t magnitude = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), magnitude);
  if (error == std::errc::result_out_of_range || magnitude > kMinMagnitude) rewrite(text, kMinDigits);
}

}  // namespace platform
