#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "platform/characters.h"

namespace commandline {

using platform::printable;

// A text of several lines, each of them made printable.
[[nodiscard]] std::string printableLines(std::string_view text);

// How many columns of a terminal a printable text takes. What a reader sees as one character is measured as one: a
// letter with its marks, a flag of two letters, a family of several faces.
[[nodiscard]] std::size_t columnsOf(std::string_view text);

// The printable text in at most so many columns, at least one: of one that is longer, what fits of its beginning and
// its end, with "…" between them. No character is torn apart.
[[nodiscard]] std::string shortened(std::string_view text, std::size_t columns);

// The words of a text in lines of at most so many columns; a word that is longer has a line of its own.
[[nodiscard]] std::vector<std::string> wrapped(std::string_view text, std::size_t columns);

}  // namespace commandline
