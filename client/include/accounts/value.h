#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "accounts/result.h"

namespace accounts {

// A point in time: seconds since 2001-01-01 00:00:00 UTC, fractions and earlier times included.
struct Date {
  double secondsSince2001 = 0;  // negative before that
};

// A number by which one part of an archived object names another.
struct Reference {
  std::uint64_t number = 0;  // in that archive
};

// The value of a property. It never changes, copies share what they hold, and any thread may read it.
//
// Reads are total: they answer nothing for a value of another kind. Text is UTF-8; what is malformed, and NUL, is
// replaced by U+FFFD.
class ACCOUNTS_API Value {
 public:
  // `other` is a kind that files may hold and hardly anybody reads: a reference.
  enum class Kind : std::int32_t { text, integer, real, boolean, date, data, list, dictionary, other };
  using Data = std::vector<std::uint8_t>;
  using List = std::vector<Value>;
  using Dictionary = std::vector<std::pair<std::string, Value>>;  // in the file's order; of one key the last counts

  // An empty text, or a value of the kind that the argument has.
  Value();
  Value(const char* text);
  Value(std::string_view text);
  Value(const std::string& text);
  Value(bool boolean);
  Value(int integer);
  Value(unsigned integer);
  Value(long integer);
  Value(unsigned long integer);
  Value(long long integer);
  Value(unsigned long long integer);
  Value(double real);
  Value(Date date);
  Value(Data data);
  Value(Reference reference);
  Value(const List& list);
  Value(const Dictionary& dictionary);
  Value(const void*) = delete;

  // Of which kind it is, and what it is; nothing of another kind.
  [[nodiscard]] Kind kind() const;
  [[nodiscard]] std::optional<std::string> text() const;
  [[nodiscard]] std::optional<std::int64_t> integer() const;           // nothing above the signed range
  [[nodiscard]] std::optional<std::uint64_t> unsignedInteger() const;  // nothing below zero
  [[nodiscard]] std::optional<double> real() const;
  [[nodiscard]] std::optional<bool> boolean() const;
  [[nodiscard]] std::optional<Date> date() const;
  [[nodiscard]] std::optional<Data> data() const;
  [[nodiscard]] std::optional<Reference> reference() const;
  [[nodiscard]] std::optional<List> list() const;
  [[nodiscard]] std::optional<Dictionary> dictionary() const;

  // Deep and exact: 1, 1.0 and true are three different values; a dictionary's order does not count.
  friend ACCOUNTS_API bool operator==(const Value& left, const Value& right);
  friend bool operator!=(const Value& left, const Value& right) { return !(left == right); }

  struct Content;  // internal
  explicit Value(std::shared_ptr<const Content> content);
  [[nodiscard]] const Content& content() const { return *_content; }

 private:
  std::shared_ptr<const Content> _content;
};

}  // namespace accounts
