#pragma once

#include <cstdint>
#include <memory>

namespace platform {

struct LibplistNodeDeleter {
  void operator()(void* node) const;
};

// A libplist tree without a parent, owned.
using LibplistNode = std::unique_ptr<void, LibplistNodeDeleter>;

// How deep containers may nest: libplist frees, copies and writes a tree recursively.
constexpr std::size_t kDeepestNesting = 256;

// Dates and integers above the signed range, exactly. The library's own calls cut a date to 32-bit seconds and make a
// negative number of such an integer, so these go through a binary property list that holds the one value.
[[nodiscard]] LibplistNode makeLibplistDate(double secondsSince2001);
[[nodiscard]] LibplistNode makeLibplistInteger(std::uint64_t aboveInt64);
[[nodiscard]] double secondsOfLibplistDate(void* node);
[[nodiscard]] bool isAboveInt64(void* integerNode, std::uint64_t bits);

}  // namespace platform
