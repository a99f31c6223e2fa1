#pragma once

#include <string>
#include <vector>

#include "client/contents.h"

namespace accounts {

// The top-level accounts' properties, in the file's order.
using Records = std::vector<platform::Dictionary>;

// As they stand in the store. Those that the file gives no identifier are left out: who they are changes at each load.
[[nodiscard]] Records identifiedRecords(const accountsettings::AccountsManager& store);

// The children of one account; null has none.
[[nodiscard]] Records childrenOf(const platform::Dictionary* account);

// One account before and after; the pointer is null where it was not there. Points into the records.
struct Pair {
  const platform::Dictionary* before;
  const platform::Dictionary* after;
};

// Those that differ, by identifier; of several with one identifier the last counts. What went comes first, in the order
// that it had, then the others in the order that they have.
[[nodiscard]] std::vector<Pair> differingPairs(const Records& before, const Records& after);

// The keys that came, changed or went; null has none.
[[nodiscard]] std::vector<std::string> differingKeys(const Pair& pair);

// Of accounts and their children.
[[nodiscard]] std::vector<Change> changesBetween(const Records& before, const Records& after,
                                                 const std::shared_ptr<const Device>& device);

}  // namespace accounts
