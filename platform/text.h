#pragma once

#include <cstddef>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>

#include "platform/export.h"

namespace platform {

// A piece of literal text that lives as long as the process. The vocabulary's constants are of this type: they need no
// initialisation, compare as text, and become a Text or a PropertyValue without copying a character.
class StringConstant {
 public:
  template <std::size_t Size>
  consteval StringConstant(const char (&literal)[Size]) : _view{literal, Size - 1} {}

  [[nodiscard]] constexpr std::string_view view() const { return _view; }
  constexpr operator std::string_view() const { return _view; }

  friend constexpr bool operator==(StringConstant left, StringConstant right) { return left._view == right._view; }
  friend constexpr bool operator==(StringConstant left, std::string_view right) { return left._view == right; }

 private:
  std::string_view _view;
};

// Immutable text, shared between its copies. It is always well-formed UTF-8 without NUL, since that is what property
// lists can carry: construction replaces every malformed sequence and every NUL by U+FFFD, so no file and no caller can
// bring anything else into a value.
class ACCOUNT_EXPORT Text {
 public:
  Text() = default;
  Text(std::string_view characters);
  Text(const std::string& characters) : Text{std::string_view{characters}} {}
  Text(const char* characters) : Text{std::string_view{characters}} {}
  Text(StringConstant constant);

  [[nodiscard]] std::string_view view() const { return {_characters.get(), _size}; }
  operator std::string_view() const { return view(); }
  // The characters and a NUL behind them.
  [[nodiscard]] const char* cString() const { return _characters == nullptr ? "" : _characters.get(); }
  [[nodiscard]] std::string string() const { return std::string{view()}; }
  [[nodiscard]] std::size_t size() const { return _size; }
  [[nodiscard]] bool empty() const { return _size == 0; }

  friend bool operator==(const Text& left, const Text& right) { return isSame(left.view(), right.view()); }
  friend bool operator==(const Text& left, std::string_view right) { return isSame(left.view(), right); }
  friend bool operator==(const Text& left, StringConstant right) { return isSame(left.view(), right.view()); }
  friend std::ostream& operator<<(std::ostream& stream, const Text& text) { return stream << text.view(); }

 private:
  // Texts that share their characters, as copies and the keys of one file do, need not be read.
  static bool isSame(std::string_view left, std::string_view right) {
    return left.size() == right.size() && (left.data() == right.data() || left == right);
  }

  std::shared_ptr<const char> _characters;  // ends with a NUL; no owner where the text is a constant
  std::size_t _size = 0;
};

// Whether the bytes are well-formed UTF-8 (Unicode 15, table 3-7) without NUL, so that a Text keeps them as they are.
[[nodiscard]] ACCOUNT_EXPORT bool isWellFormedText(std::string_view bytes);

// The length of the part before the first byte that is NUL or not ASCII.
[[nodiscard]] ACCOUNT_EXPORT std::size_t plainPrefix(std::string_view bytes);

}  // namespace platform
