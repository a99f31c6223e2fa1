#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

namespace commandline {

// How wide and how colourful what is printed may be. As it stands, it is for a pipe or a file: everything, and nothing
// but text, whatever the terminal is like from which the program was started.
struct Page {
  std::optional<std::size_t> columns = std::nullopt;  // none: as many as it takes
  bool isEmphasised = false;                          // whether escape sequences make text bold or faint
};

enum class Colour : std::uint8_t { automatic, always, never };

// The page that the descriptor shows. Of a terminal it has the width that COLUMNS gives, else the terminal itself, else
// 80 columns. It is emphasised where that is wished for always; automatically, on a terminal unless the environment
// has NO_COLOR (not empty) or TERM=dumb.
[[nodiscard]] Page pageOn(int descriptor, Colour wish = Colour::automatic);

}  // namespace commandline
