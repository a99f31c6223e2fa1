#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace tools {

// The text on one line that shows as it is: what would move a terminal's cursor or change its state is replaced.
[[nodiscard]] std::string printable(std::string_view text);

// Rows of cells, each column as wide as its widest cell, two blanks apart, nothing at a line's end. Cells are made
// printable.
[[nodiscard]] std::string table(const std::vector<std::vector<std::string>>& rows);

}  // namespace tools
