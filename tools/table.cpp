#include "tools/table.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace tools {
namespace {

constexpr std::string_view kReplacement = "\uFFFD";
constexpr std::string_view kGap = "  ";

// The length in bytes of the character at the front of well-formed UTF-8.
std::size_t lengthOfFirst(std::string_view text) {
  std::size_t length = 1;
  while (length < text.size() && (static_cast<unsigned char>(text[length]) & 0xC0U) == 0x80U) ++length;
  return length;
}

bool isBetween(std::string_view character, std::string_view first, std::string_view last) {
  return character.size() == first.size() && character >= first && character <= last;
}

// Controls, and marks that reorder the text around them.
bool isUnprintable(std::string_view character) {
  const auto byte = static_cast<unsigned char>(character.front());
  return byte < 0x20 || byte == 0x7F || isBetween(character, "\u0080", "\u009F") ||
         isBetween(character, "\u2028", "\u202E") || isBetween(character, "\u2066", "\u2069");
}

// Marks that take no place of their own.
bool hasNoWidth(std::string_view character) {
  return isBetween(character, "\u0300", "\u036F") || isBetween(character, "\u200B", "\u200F") || character == "\uFEFF";
}

// Characters of East Asian scripts and pictographs, which terminals show in two columns.
bool isWide(std::string_view character) {
  return isBetween(character, "\u1100", "\u115F") || isBetween(character, "\u2E80", "\uA4CF") ||
         isBetween(character, "\uAC00", "\uD7A3") || isBetween(character, "\uF900", "\uFAFF") ||
         isBetween(character, "\uFE30", "\uFE6F") || isBetween(character, "\uFF00", "\uFF60") ||
         isBetween(character, "\uFFE0", "\uFFE6") || isBetween(character, "\U0001F300", "\U0001F64F") ||
         isBetween(character, "\U0001F900", "\U0001F9FF") || isBetween(character, "\U00020000", "\U0003FFFD");
}

std::size_t columnsOf(std::string_view character) {
  if (hasNoWidth(character)) return 0;
  return isWide(character) ? 2 : 1;
}

std::size_t widthOf(std::string_view text) {
  std::size_t width = 0;
  while (!text.empty()) {
    const auto character = text.substr(0, lengthOfFirst(text));
    width += columnsOf(character);
    text.remove_prefix(character.size());
  }
  return width;
}

std::vector<std::size_t> columnWidths(const std::vector<std::vector<std::string>>& rows) {
  std::vector<std::size_t> widths;
  for (const auto& row : rows) {
    widths.resize(std::max(widths.size(), row.size()));
    for (std::size_t column = 0; column < row.size(); ++column) {
      widths[column] = std::max(widths[column], widthOf(printable(row[column])));
    }
  }
  return widths;
}

}  // namespace

std::string printable(std::string_view text) {
  std::string shown;
  while (!text.empty()) {
    const auto character = text.substr(0, lengthOfFirst(text));
    shown += isUnprintable(character) ? kReplacement : character;
    text.remove_prefix(character.size());
  }
  return shown;
}

std::string table(const std::vector<std::vector<std::string>>& rows) {
  const auto widths = columnWidths(rows);
  std::string lines;
  for (const auto& row : rows) {
    std::string line;
    std::size_t missing = 0;
    for (std::size_t column = 0; column < row.size(); ++column) {
      const auto cell = printable(row[column]);
      if (!cell.empty()) {
        line += std::string(missing, ' ') + cell;
        missing = 0;
      }
      missing += widths[column] - widthOf(cell) + kGap.size();
    }
    lines += line + "\n";
  }
  return lines;
}

}  // namespace tools
