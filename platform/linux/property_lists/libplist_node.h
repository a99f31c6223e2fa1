#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string_view>

#include "platform/property_value.h"

namespace platform {

struct LibplistNodeDeleter {
  void operator()(void* node) const;
};

struct LibplistMemoryDeleter {
  void operator()(void* memory) const;
};

// A libplist tree without a parent, owned.
using LibplistNode = std::unique_ptr<void, LibplistNodeDeleter>;

// Characters that the library allocated, up to a NUL.
using LibplistText = std::unique_ptr<char, LibplistMemoryDeleter>;

// Throws std::bad_alloc where this much memory is not to be had. libplist ends the process, or gives up without a word,
// where an allocation of its own fails; so whoever hands it something large asks beforehand.
void requireMemory(std::size_t bytes);

// Dates and integers above the signed range, exactly. The library's own calls cut a date to 32-bit seconds and make a
// negative number of such an integer, so these go through a binary property list that holds the one value.
[[nodiscard]] LibplistNode makeLibplistDate(double secondsSince2001);
[[nodiscard]] LibplistNode makeLibplistInteger(std::uint64_t aboveInt64);
[[nodiscard]] double secondsOfLibplistDate(void* node);
[[nodiscard]] bool isAboveInt64(void* integerNode, std::uint64_t bits);

// What a node holds, without a copy; good until the node is changed or goes.
[[nodiscard]] std::string_view textOfLibplist(void* stringNode);
[[nodiscard]] std::span<const std::uint8_t> dataOfLibplist(void* dataNode);
// The value of a node that is neither text nor data nor a container; an empty text for what no value is made of.
[[nodiscard]] PropertyValue scalarOfLibplist(void* node);

// Walks the items of an array node, each step at the same cost.
class LibplistArrayItems {
 public:
  explicit LibplistArrayItems(void* array);
  // The next item; null at the end.
  [[nodiscard]] void* next();

 private:
  void* _array;
  std::unique_ptr<void, LibplistMemoryDeleter> _iterator;
};

// The same for the entries of a dictionary node.
class LibplistEntries {
 public:
  explicit LibplistEntries(void* dictionary);
  // Moves to the next entry; false at the end.
  [[nodiscard]] bool advance();
  [[nodiscard]] LibplistText key() const;
  [[nodiscard]] bool hasKey(const char* key) const;  // without a copy
  [[nodiscard]] void* item() const { return _item; }

 private:
  void* _dictionary;
  std::unique_ptr<void, LibplistMemoryDeleter> _iterator;
  void* _item = nullptr;
};

}  // namespace platform
