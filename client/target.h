#pragma once

#include <memory>
#include <optional>
#include <string_view>

#include "accountsettings/accounts_manager.h"

namespace accounts {

// Where an account stands in a store: a top-level record, or the place of a child's properties in its record. Nowhere
// where the record is null. The calls below are for one that stands somewhere.
struct Target {
  std::shared_ptr<accountsettings::BasicAccount> record;
  std::optional<std::size_t> child;
};

// Of several accounts with the identifier, the last.
[[nodiscard]] Target targetIn(const accountsettings::AccountsManager& store, std::string_view identifier);

// A record of the account's own, null where it could not be loaded as it was changed; and its own properties.
[[nodiscard]] std::shared_ptr<accountsettings::BasicAccount> recordOf(const Target& target);
[[nodiscard]] platform::Dictionary propertiesOf(const Target& target);

// Gives the account in the store these properties.
void put(accountsettings::AccountsManager& store, const Target& target, platform::Dictionary properties);

}  // namespace accounts
