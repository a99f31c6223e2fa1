#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/explanation.h"

namespace host {

// What a run came to: whether every account that the device had is still on it.
struct Verdict {
  enum class Kind : std::uint8_t { kept, lost, notSaved };

  Kind kind = Kind::kept;
  std::vector<records::Lost> lost{};  // what is on the device no longer; where the save failed, what went all the same
  std::string cause{};                // why the last save failed
};

// As machines and people read it: "kept", "lost", "not saved".
[[nodiscard]] std::string_view nameOf(Verdict::Kind kind);

// Judges by the facts alone. What is left out of the settings is lost once they are saved without it, what stands in a
// legacy file once that is deleted. `snapshot` says where what the run may change was kept before it; may be empty.
[[nodiscard]] Verdict verdictOf(const Explanation& explanation, std::string_view snapshot = {});

// What the verdict would name as lost from this file if the fact came next.
[[nodiscard]] std::vector<records::Lost> lossesFrom(const std::string& file, const Explanation& explanation,
                                                    const records::Fact& next);

// How many accounts went which way, accounts within accounts left out: the first four are all that the settings have.
struct Counts {
  std::size_t kept = 0;  // as they were
  std::size_t changed = 0;
  std::size_t added = 0;
  std::size_t converted = 0;
  std::size_t moved = 0;  // into other accounts
  std::size_t folded = 0;
  std::size_t dropped = 0;  // of the losses, the records that the required rules leave out
  std::size_t lost = 0;     // all losses

  // Each with its name, as people and machines read them, in this order.
  [[nodiscard]] std::array<std::pair<std::string_view, std::size_t>, 8> named() const;
};

[[nodiscard]] Counts countsOf(const Explanation& explanation, const Verdict& verdict);

}  // namespace host
