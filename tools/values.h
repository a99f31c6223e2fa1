#pragma once

#include "accounts/account.h"
#include "accountsettings/accounts_manager.h"

namespace tools {

// Values of the interface for programs as those of a file, and back; exactly.
[[nodiscard]] platform::PropertyValue fileValueOf(const accounts::Value& value);
[[nodiscard]] accounts::Value valueOf(const platform::PropertyValue& value);
[[nodiscard]] accounts::Value::Dictionary entriesOf(const accountsettings::Dictionary& properties);

// What the account has by itself, as the record of a file.
[[nodiscard]] accountsettings::Dictionary recordOf(const accounts::Account& account);

}  // namespace tools
