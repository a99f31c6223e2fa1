#pragma once

#include <string>

#include "platform/export.h"
#include "platform/property_value.h"

namespace platform {

// The textual description of a value for people: logs, console lines, traces, reports. One line, keys in their order:
//
//   {Identifier = "4F1C…"; "Enabled Dataclasses" = ("com.vorlix.Dataclass.Mail"); Port = 993; IsActive = true}
//
// Credentials are never shown, only that they are there: whatever stands under a key that names one (see
// `namesCredential`) appears as <hidden>, and data as its size, <data: 20 bytes>. This is the one place where values
// become text; nothing else may print them.
[[nodiscard]] ACCOUNT_EXPORT std::string description(const PropertyValue& value);
[[nodiscard]] ACCOUNT_EXPORT std::string description(const Dictionary& dictionary);

// Whether a key's value is a credential: the key contains, in any letter case, one of the words that name passwords,
// tokens, secrets, cookies, keys for signing or encrypting, and the like (the list stands in description.cpp).
[[nodiscard]] ACCOUNT_EXPORT bool namesCredential(std::string_view key);

}  // namespace platform
