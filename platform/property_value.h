#pragma once

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "platform/export.h"
#include "platform/text.h"

namespace platform {

class Dictionary;
class PropertyValue;

ACCOUNT_EXPORT bool operator==(const Dictionary& left, const Dictionary& right);
ACCOUNT_EXPORT bool operator==(const PropertyValue& left, const PropertyValue& right);

using Bytes = std::vector<std::uint8_t>;
using Array = std::vector<PropertyValue>;

// A point in time as property lists keep it: seconds since 2001-01-01 00:00:00 UTC, fractions and earlier times
// included.
struct Date {
  double secondsSince2001 = 0;
};

// A keyed-archive reference. Nothing here makes or reads one; files may hold them and they pass through unharmed.
struct Uid {
  std::uint64_t number = 0;
  friend bool operator==(Uid, Uid) = default;
};

// A dictionary from text to value that keeps the order in which keys first came; overwriting a key keeps its place.
// Copies share their contents until one of them is edited. Small dictionaries are searched directly, large ones through
// an index that is made when it is first needed, so that no number of keys makes a look-up slow.
class ACCOUNT_EXPORT Dictionary {
 public:
  struct Entry;  // key and value
  using const_iterator = const Entry*;

  Dictionary() = default;
  Dictionary(std::initializer_list<Entry> entries);
  Dictionary(const Dictionary& other) noexcept;
  Dictionary(Dictionary&& other) noexcept : _contents{std::exchange(other._contents, nullptr)} {}
  Dictionary& operator=(const Dictionary& other) noexcept { return *this = Dictionary(other); }
  Dictionary& operator=(Dictionary&& other) noexcept {
    Dictionary moved(std::move(other));
    std::swap(_contents, moved._contents);
    return *this;
  }
  ~Dictionary();
  // Of entries whose keys all differ; nobody looks whether they do.
  explicit Dictionary(std::vector<Entry> entries);

  [[nodiscard]] std::size_t size() const;
  [[nodiscard]] bool empty() const { return size() == 0; }
  [[nodiscard]] const_iterator begin() const;
  [[nodiscard]] const_iterator end() const;

  // The value under the key, or null. The pointer is good until this dictionary is next edited or goes.
  [[nodiscard]] const PropertyValue* find(std::string_view key) const;
  [[nodiscard]] bool contains(std::string_view key) const { return find(key) != nullptr; }

  // Typed reads of one key; nothing where the key is absent or its value is of another kind.
  [[nodiscard]] const Text* text(std::string_view key) const;
  [[nodiscard]] const Array* array(std::string_view key) const;
  [[nodiscard]] const Dictionary* dictionary(std::string_view key) const;

  void reserve(std::size_t count);
  void set(Text key, PropertyValue value);
  // Takes the key out and answers the value it had; nothing where it was absent.
  std::optional<PropertyValue> remove(std::string_view key);
  void clear() { *this = Dictionary{}; }

  // Whether both are the same contents in memory, which is what copies are until one is edited.
  [[nodiscard]] bool isIdenticalTo(const Dictionary& other) const { return _contents == other._contents; }

  friend bool operator==(const Dictionary& left, const Dictionary& right);

 private:
  struct Contents;
  Contents& editable();

  Contents* _contents = nullptr;  // shared with the copies; null while there never was an entry
};

// The one value type of files and accounts. It is a value: a copy costs one reference count, and a copy that is edited
// leaves the others as they were, so a deep snapshot is simply a copy. Values may be read from several threads at once;
// one object is written by one thread.
//
// Equality is deep and exact: kind and value must agree, so 1, 1.0 and true are three different values. Reals and dates
// are compared by their bits (0.0 and -0.0 differ), except that not-a-number equals itself. Arrays are equal element by
// element, dictionaries whatever their order.
//
// Typed reads are total: they answer nothing (an empty optional or a null pointer) for a value of another kind.
class ACCOUNT_EXPORT PropertyValue {
 public:
  enum class Kind : std::uint8_t { string, integer, real, boolean, date, data, array, dictionary, uid };

  PropertyValue() : PropertyValue{Text{}} {}
  PropertyValue(Text text) : _storage{std::move(text)} {}
  PropertyValue(std::string_view text) : _storage{Text{text}} {}
  PropertyValue(const std::string& text) : _storage{Text{text}} {}
  PropertyValue(const char* text) : _storage{Text{text}} {}
  PropertyValue(StringConstant text) : _storage{Text{text}} {}
  PropertyValue(bool value) : _storage{value} {}
  PropertyValue(int value) : _storage{std::int64_t{value}} {}
  PropertyValue(std::int64_t value) : _storage{value} {}
  PropertyValue(std::uint64_t value);
  PropertyValue(double value) : _storage{value} {}
  PropertyValue(Date value) : _storage{value} {}
  PropertyValue(Uid value) : _storage{value} {}
  PropertyValue(Bytes value);
  PropertyValue(Array value);
  PropertyValue(Dictionary value) : _storage{std::move(value)} {}
  PropertyValue(const void*) = delete;

  [[nodiscard]] Kind kind() const;

  [[nodiscard]] const Text* asText() const { return std::get_if<Text>(&_storage); }
  [[nodiscard]] const double* asReal() const { return std::get_if<double>(&_storage); }
  [[nodiscard]] const bool* asBoolean() const { return std::get_if<bool>(&_storage); }
  [[nodiscard]] const Date* asDate() const { return std::get_if<Date>(&_storage); }
  [[nodiscard]] const Uid* asUid() const { return std::get_if<Uid>(&_storage); }
  [[nodiscard]] const Bytes* asData() const;
  [[nodiscard]] const Array* asArray() const;
  [[nodiscard]] const Dictionary* asDictionary() const { return std::get_if<Dictionary>(&_storage); }

  // An integer of the file: its 64 bits, and whether it lies above the signed range.
  struct Integer {
    std::uint64_t bits;
    bool isAboveInt64;
  };
  [[nodiscard]] std::optional<Integer> asInteger() const;

  // The integer that a number or a text gives: an integer itself (one above the signed range by its 64 bits), a real
  // truncated towards zero (held to the signed range, not-a-number gives 0), a text the decimal integer it begins with
  // (an optional sign and digits, held to the signed range; 0 where there is none). Nothing for any other kind,
  // booleans included.
  [[nodiscard]] std::optional<std::int64_t> integerValue() const;

  // The boolean that a boolean, a number (not zero) or a text gives: "yes" or "true" in any case, or a leading decimal
  // integer that is not zero, are true, every other text is false. Nothing for any other kind.
  [[nodiscard]] std::optional<bool> booleanValue() const;

  friend bool operator==(const PropertyValue& left, const PropertyValue& right);

 private:
  // Integers up to INT64_MAX are held signed, so that equal numbers have one form.
  std::variant<Text, std::int64_t, std::uint64_t, double, bool, Date, Uid, std::shared_ptr<const Bytes>,
               std::shared_ptr<const Array>, Dictionary>
      _storage;
};

struct Dictionary::Entry {
  Text key;
  PropertyValue value;
};

}  // namespace platform
