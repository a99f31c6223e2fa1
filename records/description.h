#pragma once

#include <string>

#include "platform/export.h"
#include "platform/property_value.h"

namespace records {

using platform::Dictionary;
using platform::PropertyValue;

// The textual description of a value for people: logs, console lines, traces, reports. One line, keys in their order:
//
//   {Identifier = "4F1C…"; "Enabled Dataclasses" = ("com.vorlix.Dataclass.Mail"); Port = 993; IsActive = true}
//
// Credentials are never shown, only that they are there: whatever stands under a key that names one (see
// `namesCredential`) appears as <hidden>, and data as its size, <data: 20 bytes>. This is the one place where values
// become text; whatever else prints them prints what `presentable` leaves of them.
[[nodiscard]] ACCOUNT_EXPORT std::string description(const PropertyValue& value);
[[nodiscard]] ACCOUNT_EXPORT std::string description(const Dictionary& dictionary);

// The same of a value that stands under the key, which may itself name a credential.
[[nodiscard]] ACCOUNT_EXPORT std::string descriptionUnder(std::string_view key, const PropertyValue& value);
// The value that stands under the key, as far as it may be shown: with credentials, data, dates and UIDs replaced by
// the text that `description` shows of them, so that texts, numbers, booleans, arrays and dictionaries are left.
[[nodiscard]] ACCOUNT_EXPORT PropertyValue presentable(std::string_view key, const PropertyValue& value);

// Whether a key's value is a credential: the key contains, in any letter case, one of the words that name passwords,
// tokens, secrets, cookies, keys, and the like (the list, and what is called a key and is none, stands in
// description.cpp).
[[nodiscard]] ACCOUNT_EXPORT bool namesCredential(std::string_view key);

}  // namespace records
