#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>

#include "platform/property_value.h"

namespace fuzz {

using Words = std::span<const std::string_view>;

// The bytes of one fuzzing input, taken off the front as the choices that make up something structured. Once they are
// used up every choice is the first one, so any bytes mean something, and a longer input only adds to what it makes.
class Input {
 public:
  Input(const std::uint8_t* data, std::size_t size) : _rest{data, size} {}

  [[nodiscard]] bool isAtEnd() const { return _rest.empty(); }
  std::uint8_t byte() {
    if (_rest.empty()) return 0;
    const std::uint8_t first = _rest.front();
    _rest = _rest.subspan(1);
    return first;
  }
  std::size_t below(std::size_t limit) { return byte() % limit; }
  bool yes() { return (byte() & 1U) != 0; }
  std::uint64_t bits() {
    std::uint64_t bits = 0;
    for (int count = 0; count < 8; ++count) bits = bits << 8U | byte();
    return bits;
  }
  std::string_view oneOf(Words words) { return words[below(words.size())]; }
  // Up to `limit` bytes, whatever they are.
  std::string bytes(std::size_t limit) {
    std::string taken;
    for (std::size_t length = below(limit + 1); length > 0; --length) taken.push_back(static_cast<char>(byte()));
    return taken;
  }
  std::string rest() {
    std::string taken{_rest.begin(), _rest.end()};
    _rest = {};
    return taken;
  }

 private:
  std::span<const std::uint8_t> _rest;
};

// A value that is no container. Texts come from the words, or are made up.
inline platform::PropertyValue scalarFrom(Input& input, Words words) {
  switch (input.below(12)) {
    case 0: return static_cast<std::int64_t>(input.bits());
    case 1: return input.bits();
    case 2: return std::bit_cast<double>(input.bits());
    case 3: return platform::Date{std::bit_cast<double>(input.bits())};
    case 4: return input.yes();
    case 5: return static_cast<int>(input.byte());
    case 6: return platform::Uid{input.byte()};
    case 7: return input.bytes(20);
    default: return input.oneOf(words);
  }
}

}  // namespace fuzz
