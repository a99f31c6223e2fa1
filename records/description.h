#pragma once

#include <string>
#include <string_view>

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
// `namesCredential`) appears as <hidden>, as does the user part of a URL wherever one stands in a text, and data as its
// size, <data: 20 bytes>. This is the one place where values become text; whatever else prints them prints what
// `presentable` leaves of them.
[[nodiscard]] ACCOUNT_EXPORT std::string description(const PropertyValue& value);
[[nodiscard]] ACCOUNT_EXPORT std::string description(const Dictionary& dictionary);

// The same of a value that stands under the key, which may itself name a credential.
[[nodiscard]] ACCOUNT_EXPORT std::string descriptionUnder(std::string_view key, const PropertyValue& value);
// The value that stands under the key, as far as it may be shown: with credentials, data, dates and UIDs replaced by
// the text that `description` shows of them, so that texts, numbers, booleans, arrays and dictionaries are left.
[[nodiscard]] ACCOUNT_EXPORT PropertyValue presentable(std::string_view key, const PropertyValue& value);

// Whether a key's value is a credential. Either the key contains, in any letter case and whatever blanks, hyphens and
// underscores stand in between, one of the words that name passwords, tokens, secrets, cookies, keys and the like; or
// one of the words that it consists of ("IMAPPass" of two, "user_pw" of two) is a short name for one: pass, pin, pw,
// pwd, and whatever begins with otp or session. The lists, and what is called a key and is none, stand in
// description.cpp.
[[nodiscard]] ACCOUNT_EXPORT bool namesCredential(std::string_view key);

// The text with the user part of every URL in it hidden: "https://<hidden>@host/path".
[[nodiscard]] ACCOUNT_EXPORT std::string withoutUserParts(std::string_view text);

}  // namespace records
