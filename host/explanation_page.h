#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "records/fact.h"

namespace host {

// The accounts that a settings file's contents have, those within accounts right behind them, named as facts name them:
// by what its user calls it, else by what it signs in with, and with the one that it lies in, at any depth. Whatever is
// no record is passed over.
[[nodiscard]] std::vector<records::Name> accountsIn(const platform::Dictionary& settings);

// The page that shows an explanation, whole and on its own; see docs/EXPLAIN.md.
//
//   explanation  the document for machines, of this run or as a snapshot keeps it
//   accounts     those that stand on the device now, so that the page also has those that no fact names; may be empty
//
// Both are packed, by zlib and in base64: a page of a thousand accounts stays below a megabyte, and no text of either
// can become markup. Throws where memory runs out, or the document is none.
[[nodiscard]] std::string pageOf(std::string_view explanation, const std::vector<records::Name>& accounts);

}  // namespace host
