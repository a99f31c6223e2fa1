#include "commandline/table.h"

#include <algorithm>
#include <cstddef>
#include <limits>
#include <numeric>
#include <utility>

#include "commandline/text.h"

namespace commandline {
namespace {

using Widths = std::vector<std::size_t>;

constexpr std::size_t kGap = 2;
constexpr std::size_t kMinCell = 8;  // what a column keeps of its cells on the narrowest page
constexpr std::size_t kMinMeaning = 20;
constexpr std::size_t kUnlimited = std::numeric_limits<std::size_t>::max();

// The widest columns give way, one column of the page at a time.
Widths fittedTo(Widths widths, const Page& page) {
  if (!page.columns || widths.empty()) return widths;
  const std::size_t gaps = kGap * (widths.size() - 1);
  while (std::accumulate(widths.begin(), widths.end(), gaps) > *page.columns) {
    const auto widest = std::ranges::max_element(widths);
    if (*widest <= kMinCell) break;
    --*widest;
  }
  return widths;
}

std::string lineOf(const Row& row, const Widths& widths) {
  std::string line;
  std::size_t missing = 0;
  for (std::size_t column = 0; column < row.cells.size(); ++column) {
    const std::string cell = shortened(row.cells[column], std::max<std::size_t>(widths[column], 1));
    if (!cell.empty()) line += std::string(std::exchange(missing, 0), ' ') + cell;
    missing += widths[column] - columnsOf(cell) + kGap;
  }
  return line;
}

}  // namespace

std::string emphasised(std::string_view text, Emphasis emphasis, const Page& page) {
  if (!page.isEmphasised || emphasis == Emphasis::none || text.empty()) return std::string{text};
  return std::string{emphasis == Emphasis::strong ? "\x1b[1m" : "\x1b[2m"} + std::string{text} + "\x1b[0m";
}

std::string table(const std::vector<Row>& rows, const Page& page) {
  std::vector<Row> shown = rows;
  for (Row& row : shown) std::ranges::transform(row.cells, row.cells.begin(), printable);
  Widths widths;
  for (const Row& row : shown) {
    widths.resize(std::max(widths.size(), row.cells.size()));
    for (std::size_t column = 0; column < row.cells.size(); ++column) {
      widths[column] = std::max(widths[column], columnsOf(row.cells[column]));
    }
  }
  widths = fittedTo(std::move(widths), page);
  std::string lines;
  for (const Row& row : shown) lines += emphasised(lineOf(row, widths), row.emphasis, page) + "\n";
  return lines;
}

std::string meanings(const std::vector<Meaning>& list, const Page& page) {
  std::size_t indent = 0;
  for (const Meaning& each : list) indent = std::max(indent, columnsOf(each.term) + 2 * kGap);
  const std::size_t left = page.columns ? std::max(*page.columns, indent + kMinMeaning) - indent : kUnlimited;
  std::vector<Row> rows;
  for (const Meaning& each : list) {
    std::string term = each.term;
    for (const std::string& line : wrapped(each.text, left)) rows.push_back({"  " + std::exchange(term, ""), line});
  }
  return table(rows);
}

}  // namespace commandline
