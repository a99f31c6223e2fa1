#pragma once

#include <memory>
#include <string_view>
#include <vector>

#include "accountsettings/basic_account.h"
#include "platform/export.h"
#include "records/fact.h"

namespace accountsettings {

// The top-level accounts of a store at one moment, in their order, each with its properties as they were then.
struct RecordState {
  std::shared_ptr<const BasicAccount> account;
  Dictionary properties;
};
using StoreState = std::vector<RecordState>;

// What became of one record, and of which account of the store it tells; no account for a child.
struct Difference {
  records::Fact fact;
  const BasicAccount* account = nullptr;
  bool isReplacement = false;  // another object in the place of the one with its identifier; perhaps nothing else
};

[[nodiscard]] ACCOUNT_EXPORT records::Name nameOf(const Dictionary& properties, std::string_view parent = {});

// The keys that differ, in the order of `after`, then those that went. Children that can be told apart are records of
// their own, so "ChildAccounts" is a key like others only where it holds something else.
[[nodiscard]] std::vector<records::Change> changesOf(const Dictionary& before, const Dictionary& after);

// What became of the accounts and their children: first what is there afterwards, in its order, then what went. A
// top-level account is itself as long as it is the same object, whatever its identifier; a child is the one with its
// identifier, wherever it lies. Records that went are told of as lost, by the little that can be seen: why is for those
// to say who know it. Takes time in proportion to the records, and hardly any where nothing changed.
[[nodiscard]] ACCOUNT_EXPORT std::vector<Difference> differencesBetween(const StoreState& before,
                                                                        const StoreState& after);

}  // namespace accountsettings
