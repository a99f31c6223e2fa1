#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <vector>

#include "commandline/terminal.h"

namespace commandline {

enum class Emphasis : std::uint8_t { none, strong, faint };

// The text in that emphasis, where the page shows any.
[[nodiscard]] std::string emphasised(std::string_view text, Emphasis emphasis, const Page& page);

struct Row {
  Row(std::initializer_list<std::string> texts) : cells{texts} {}
  explicit Row(std::vector<std::string> texts, Emphasis whole = Emphasis::none)
      : cells{std::move(texts)}, emphasis{whole} {}

  std::vector<std::string> cells;
  Emphasis emphasis = Emphasis::none;
};

// Rows of cells, each column as wide as its widest cell, two blanks apart, nothing at a line's end. Cells are made
// printable. Where the page is too narrow, the widest columns give way: their cells are shortened in the middle, but
// never below a few columns, so that a very narrow page gets lines that are too long for it.
[[nodiscard]] std::string table(const std::vector<Row>& rows, const Page& page = {});

// A list of terms and what they mean: the second column's text goes on below itself where the page is too narrow.
struct Meaning {
  std::string term;
  std::string text;
};
[[nodiscard]] std::string meanings(const std::vector<Meaning>& list, const Page& page = {});

}  // namespace commandline
