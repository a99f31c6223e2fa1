#pragma once

#include <cstddef>
#include <string_view>

#include "accountsettings/accounts_manager.h"

// The version steps do for every account what they must, and some of that multiplies. No honest device comes near these
// bounds; a device beyond them is refused before it takes all time and memory. What is thrown (std::runtime_error) ends
// the run with a line on the console, while nothing has been saved and nothing is deleted.
namespace migrator {

// Accounts of one identifier: the steps that replace accounts by types double them, and each gets the children of all
// before it.
constexpr std::size_t kMaxOfOneIdentifier = 100;
// Pairs of a mail account and a calendar account that is folded into it.
constexpr std::size_t kMaxFolded = 10'000;
// Data classes that children read in their parents' lists.
constexpr std::size_t kMaxInherited = 1'000'000;

void refuseAbove(std::size_t limit, std::size_t count, std::string_view what);

// Refuses accounts that the steps would multiply, and those that, once the steps have put an account above each, could
// no longer be written.
void refuseHostileAccounts(const accountsettings::AccountsManager& store);

}  // namespace migrator
