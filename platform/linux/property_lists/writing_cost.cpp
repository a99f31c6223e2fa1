#include "platform/linux/property_lists/writing_cost.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/insertion_ordered_map.h"

namespace platform {
namespace {

constexpr std::size_t kTableSize = 4096;
constexpr std::size_t kSmall =
    512;  // keys and values of which no choice takes long: those of most files but the accounts
constexpr std::uint64_t kCheap = std::uint64_t{1} << 25U;  // comparisons: a fraction of a second
constexpr std::uint64_t kMaxUnevenness = 8;                // times what evenly spread ones take

// What the library makes of a kind before it looks at the characters or the eight bytes.
enum class Kind : std::uint32_t { integer = 1, real = 2, text = 3, date = 6, key = 8, uid = 9 };

bool isText(Kind kind) { return kind == Kind::text || kind == Kind::key; }

std::uint32_t tablePlaceOf(Kind kind, std::string_view bytes) {
  std::uint32_t hash = 5381 + static_cast<std::uint32_t>(kind);
  for (const char byte : bytes) hash = hash * 33 + static_cast<std::uint32_t>(byte);
  return hash % kTableSize;
}

// The value that a place of the table was asked for last: a number, or a text by where its characters lie.
class Latest {
 public:
  // Takes it for the latest.
  [[nodiscard]] bool isOther(Kind kind, std::string_view bytes) {
    const std::uint64_t before = _value;
    _value = isText(kind) ? reinterpret_cast<std::uintptr_t>(bytes.data()) : numberIn(bytes);
    return !std::exchange(_isAny, true) || _value != before;
  }

 private:
  static std::uint64_t numberIn(std::string_view bytes) {
    std::uint64_t number = 0;
    for (const char byte : bytes) number = number << 8U | static_cast<unsigned char>(byte);
    return number;
  }

  std::uint64_t _value = 0;
  bool _isAny = false;
};

// Hands every text, key and number to the visitor, with its kind.
template <typename Visitor>
class Walk {
 public:
  explicit Walk(Visitor& visitor) : _visitor{visitor} {}

  void visit(const Dictionary& dictionary) {
    for (const auto& [key, value] : dictionary) {
      _visitor.see(Kind::key, key.view());
      visit(value);
    }
  }

 private:
  void visit(const PropertyValue& value) {
    if (const Text* const text = value.asText()) return _visitor.see(Kind::text, text->view());
    if (const Dictionary* const dictionary = value.asDictionary()) return visit(*dictionary);
    if (const Array* const array = value.asArray()) {
      for (const PropertyValue& element : *array) visit(element);
    } else if (const auto integer = value.asInteger()) {
      seeNumber(Kind::integer, integer->bits);
    } else if (const double* const real = value.asReal()) {
      seeNumber(Kind::real, *real);
    } else if (const Date* const date = value.asDate()) {
      seeNumber(Kind::date, date->secondsSince2001);
    } else if (const Uid* const uid = value.asUid()) {
      seeNumber(Kind::uid, uid->number);
    }
  }

  template <typename Number>
  void seeNumber(Kind kind, Number number) {
    const auto bytes = std::bit_cast<std::array<char, sizeof number>>(number);
    _visitor.see(kind, {bytes.data(), bytes.size()});
  }

  Visitor& _visitor;
};

// How often each place is looked into.
class Uses {
 public:
  void see(Kind kind, std::string_view bytes) {
    ++_total;
    Place& place = _places[placeOf(kind, bytes)];
    ++place.uses;
    if (place.latest.isOther(kind, bytes)) ++place.different;
  }
  // Where the library looks for the value in its table.
  [[nodiscard]] std::uint32_t placeOf(Kind kind, std::string_view bytes) {
    return isText(kind) ? placeOfText(kind, bytes) : tablePlaceOf(kind, bytes);
  }
  [[nodiscard]] std::uint64_t total() const { return _total; }
  [[nodiscard]] std::uint64_t of(std::size_t place) const { return _places[place].uses; }
  // No fewer comparisons than there are: with all that are different in the place, for each use of it.
  [[nodiscard]] std::uint64_t mostComparisons() const {
    std::uint64_t sum = 0;
    for (const Place& place : _places) sum += std::uint64_t{place.uses} * place.different;
    return sum;
  }

 private:
  struct Place {
    Latest latest;
    std::uint32_t uses = 0;
    std::uint32_t different = 0;  // at most: what comes back after another value counts anew
  };
  struct Known {
    const char* characters = nullptr;
    Kind kind = Kind::integer;
    std::uint32_t place = 0;
  };

  // The keys and most texts of one file share their characters, so where those lie tells them.
  std::uint32_t placeOfText(Kind kind, std::string_view text) {
    Known& known = _known[reinterpret_cast<std::uintptr_t>(text.data()) / kAlignment % _known.size()];
    if (known.characters != text.data() || known.kind != kind) known = {text.data(), kind, tablePlaceOf(kind, text)};
    return known.place;
  }

  static constexpr std::size_t kAlignment = 16;  // of what an allocator hands out

  std::uint64_t _total = 0;
  std::vector<Place> _places = std::vector<Place>(kTableSize);
  std::array<Known, 256> _known{};
};

// Sums up the comparisons, telling equal values from different ones: by their place, which the same bytes of two kinds
// never share, and by a digest for which nobody can choose values.
class Comparisons {
 public:
  explicit Comparisons(Uses& uses) : _uses{uses} {}

  void see(Kind kind, std::string_view bytes) {
    const std::uint32_t place = _uses.placeOf(kind, bytes);
    if (_latest[place].isOther(kind, bytes)) _seen.push_back(SeededHash{}(bytes) / kTableSize * kTableSize + place);
  }
  [[nodiscard]] bool areUneven() {
    std::ranges::sort(_seen);
    _seen.erase(std::unique(_seen.begin(), _seen.end()), _seen.end());
    std::uint64_t sum = 0;
    for (const std::uint64_t value : _seen) sum += _uses.of(value % kTableSize);
    const std::uint64_t evenly = _uses.total() * (_seen.size() / kTableSize + 1);
    return sum > kCheap + kMaxUnevenness * evenly;
  }

 private:
  Uses& _uses;
  std::vector<Latest> _latest = std::vector<Latest>(kTableSize);
  std::vector<std::uint64_t> _seen;  // digests, the last digits of which are replaced by the place
};

}  // namespace

bool isDearToWrite(const Dictionary& dictionary, std::size_t size) {
  if (size <= kSmall) return false;
  Uses uses;
  Walk{uses}.visit(dictionary);
  if (uses.mostComparisons() <= kCheap) return false;
  Comparisons comparisons{uses};
  Walk{comparisons}.visit(dictionary);
  return comparisons.areUneven();
}

}  // namespace platform
