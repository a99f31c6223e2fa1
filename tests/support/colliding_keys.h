#pragma once

#include <cstdint>
#include <cstring>
#include <ctime>
#include <string>
#include <vector>

namespace tests {

// What anybody can compute who knows the standard library: keys that all have one std::hash. Each is two blocks of
// eight letters or other ASCII characters, the second of which takes back what the first does to the hash.
class CollidingKeys {
 public:
  [[nodiscard]] static std::vector<std::string> make(std::size_t count) {
    std::vector<std::string> keys;
    for (std::uint64_t number = 0; keys.size() < count; ++number) {
      const std::uint64_t first = lettersOf(number);
      const std::uint64_t hash = ((kSeed ^ 16 * kFactor) ^ mixed(first)) * kFactor;
      const std::uint64_t second = unmixed(hash ^ kGoal);
      if (isPlain(second)) keys.push_back(textOf(first) + textOf(second));
    }
    return keys;
  }

 private:
  static constexpr std::uint64_t kFactor = 0xC6A4A7935BD1E995;
  static constexpr std::uint64_t kSeed = 0xC70F6907;
  static constexpr std::uint64_t kGoal = 0x0123456789ABCDEF;
  static constexpr std::uint64_t kInverse = 0x5F7A0EA7E59B19BD;
  static_assert(kFactor * kInverse == 1);

  static std::uint64_t shifted(std::uint64_t bits) { return bits ^ bits >> 47U; }  // takes itself back
  static std::uint64_t mixed(std::uint64_t block) { return shifted(block * kFactor) * kFactor; }
  static std::uint64_t unmixed(std::uint64_t bits) { return shifted(bits * kInverse) * kInverse; }

  // Eight letters, one for every four bits.
  static std::uint64_t lettersOf(std::uint64_t number) {
    std::uint64_t block = 0;
    for (unsigned letter = 0; letter < 8; ++letter) {
      block |= ('a' + (number >> 4 * letter & 15U)) << 8 * letter;
    }
    return block;
  }
  // Whether all eight are ASCII and none is NUL.
  static bool isPlain(std::uint64_t block) {
    constexpr std::uint64_t kHighest = 0x8080808080808080;
    return (block & kHighest) == 0 && ((block + 0x7F7F7F7F7F7F7F7F) & kHighest) == kHighest;
  }
  static std::string textOf(std::uint64_t block) {
    std::string text(sizeof block, '\0');
    std::memcpy(text.data(), &block, sizeof block);
    return text;
  }
};

// As many keys of the same length, none of them chosen for its hash.
[[nodiscard]] inline std::vector<std::string> harmlessKeys(std::size_t count) {
  std::vector<std::string> keys;
  for (std::size_t number = 0; number < count; ++number) {
    const std::string digits = std::to_string(number * 2654435761U);
    keys.push_back(digits + std::string(16 - digits.size(), 'x'));
  }
  return keys;
}

// The processor's seconds that an action takes.
template <typename Action>
[[nodiscard]] double secondsFor(const Action& action) {
  const std::clock_t begin = std::clock();
  action();
  return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
}

}  // namespace tests
