#include "platform/insertion_ordered_map.h"

#include <sys/random.h>

#include <cstdint>

#define XXH_INLINE_ALL
#include <xxhash.h>

namespace platform {
namespace {

// Where the kernel has no noise yet, the place of the program in memory is what nobody outside knows.
XXH64_hash_t makeSeed() {
  XXH64_hash_t seed = 0;
  if (::getrandom(&seed, sizeof seed, GRND_NONBLOCK) == sizeof seed) return seed;
  return reinterpret_cast<std::uintptr_t>(&makeSeed);
}

}  // namespace

std::size_t SeededHash::operator()(std::string_view text) const {
  static const XXH64_hash_t kSeed = makeSeed();
  return XXH3_64bits_withSeed(text.data(), text.size(), kSeed);
}

}  // namespace platform
