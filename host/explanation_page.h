#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "records/fact.h"

namespace host {

// The accounts that a settings file's contents have, those within accounts right behind them, named as facts name them;
// whatever is no record has no name.
[[nodiscard]] std::vector<records::Name> accountsIn(const platform::Dictionary& settings);

// The page that shows an explanation, whole and on its own; see docs/EXPLAIN.md. `explanation` is the document for
// machines, and `accounts` are those that stand on the device now, so that the page also has those that no fact names;
// it may be empty. No text of either can become markup. Throws where memory runs out, or the document is none.
[[nodiscard]] std::string pageOf(std::string_view explanation, const std::vector<records::Name>& accounts);

}  // namespace host
