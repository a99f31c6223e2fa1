#include "platform/linux/logs/single_line.h"

#include <array>
#include <cstdio>

namespace platform {
namespace {

std::string escapedByte(unsigned char byte) {
  if (byte == '\n') return "\\n";
  if (byte == '\r') return "\\r";
  std::array<char, 8> text{};
  std::snprintf(text.data(), text.size(), "\\x%02x", byte);
  return text.data();
}

bool isControl(unsigned char byte) { return (byte < 0x20 && byte != '\t') || byte == 0x7f; }

// The UTF-8 forms of the second block of control characters (a next-line among them).
bool beginsUpperControl(std::string_view text) {
  if (text.size() < 2 || text[0] != '\xc2') return false;
  const auto second = static_cast<unsigned char>(text[1]);
  return second >= 0x80 && second < 0xa0;
}

}  // namespace

std::string singleLine(std::string_view text) {
  std::string line;
  line.reserve(text.size());
  while (!text.empty()) {
    const auto first = static_cast<unsigned char>(text.front());
    std::size_t taken = 1;
    if (isControl(first)) {
      line += escapedByte(first);
    } else if (beginsUpperControl(text)) {
      line += escapedByte(static_cast<unsigned char>(text[1]));
      taken = 2;
    } else if (text.starts_with("\u2028") || text.starts_with("\u2029")) {
      line += text.starts_with("\u2028") ? "\\u2028" : "\\u2029";
      taken = 3;
    } else {
      line += text.front();
    }
    text.remove_prefix(taken);
  }
  return line;
}

}  // namespace platform
