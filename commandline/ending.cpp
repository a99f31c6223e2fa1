#include "commandline/ending.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <numeric>
#include <vector>

#include "platform/characters.h"

namespace commandline {
namespace {

using Row = std::vector<std::size_t>;

// How many bytes must be put in, taken out, replaced, or swapped with their neighbour, to get from one to the other.
std::size_t distance(std::string_view left, std::string_view right) {
  std::array<Row, 3> rows;  // that before the last, the last, and this one
  rows.fill(Row(right.size() + 1));
  std::iota(rows[1].begin(), rows[1].end(), std::size_t{0});
  for (std::size_t row = 1; row <= left.size(); ++row) {
    rows[2][0] = row;
    for (std::size_t column = 1; column <= right.size(); ++column) {
      const std::size_t replaced = rows[1][column - 1] + (left[row - 1] == right[column - 1] ? 0 : 1);
      rows[2][column] = std::min({replaced, rows[1][column] + 1, rows[2][column - 1] + 1});
      const bool areSwapped =
          row > 1 && column > 1 && left[row - 1] == right[column - 2] && left[row - 2] == right[column - 1];
      if (areSwapped) rows[2][column] = std::min(rows[2][column], rows[0][column - 2] + 1);
    }
    std::ranges::rotate(rows, rows.begin() + 1);
  }
  return rows[1].back();
}

}  // namespace

std::string hintFor(std::string_view word, std::span<const std::string> candidates) {
  const std::string folded = platform::caseFolded(word);
  const auto distanceTo = [&](const std::string& each) { return distance(folded, platform::caseFolded(each)); };
  const auto closest = std::ranges::min_element(candidates, {}, distanceTo);
  // One mistake in a short word, one more for each three letters of a longer one.
  const std::size_t allowed = 1 + word.size() / 4;
  if (word.size() < 2 || closest == candidates.end() || distanceTo(*closest) > allowed) return {};
  return "did you mean " + *closest + "?";
}

}  // namespace commandline
