#pragma once

#include <optional>
#include <string_view>

#include "accountsettings/basic_account.h"

// What the version steps read of an account by a key of their own. Every read is total: a value of another kind counts
// as absent. Like the record's getters they answer the parent's value where the account has none.
namespace migrator {

[[nodiscard]] std::optional<accountsettings::Text> textForKey(const accountsettings::BasicAccount& account,
                                                              std::string_view key);
// Also of a number or a text. What an absent one means is for each step to say.
[[nodiscard]] std::optional<bool> booleanForKey(const accountsettings::BasicAccount& account, std::string_view key);
[[nodiscard]] std::optional<accountsettings::Array> arrayForKey(const accountsettings::BasicAccount& account,
                                                                std::string_view key);
[[nodiscard]] std::optional<accountsettings::Dictionary> dictionaryForKey(const accountsettings::BasicAccount& account,
                                                                          std::string_view key);

// Whether the account's stored class name is one of the names.
[[nodiscard]] bool hasClassAmong(const accountsettings::BasicAccount& account,
                                 std::initializer_list<std::string_view> classNames);

// Whether a mail account is active. One that does not say so was made before there was a switch, and counts as active.
[[nodiscard]] bool isActiveUnlessSaidOtherwise(const accountsettings::BasicAccount& account);

// The data classes as a property stores them.
[[nodiscard]] accountsettings::Array arrayOf(const accountsettings::BasicAccount::Dataclasses& dataclasses);

}  // namespace migrator
