#pragma once

#include "platform/text.h"

// Fixed values of the product that are no vocabulary: names of hosts, domains and files that others decided.
namespace accountsettings {

using platform::StringConstant;

// Fragments of the paths under which the mail application kept the accounts of two providers: the host names of their
// published IMAP settings.
inline constexpr StringConstant kGmailAccountPathFragment{"gmail.com@imap.gmail.com"};
inline constexpr StringConstant kYahooAccountPathFragment{"@imap.mail.yahoo.com"};

// The CalDAV hosts of the same two.
inline constexpr StringConstant kGoogleCalDAVHost{"www.google.com"};
inline constexpr StringConstant kYahooCalDAVHost{"caldav.calendar.yahoo.com"};

// Mail domains of the vendor's hosted services: the oldest (class WexmoAccount) and the earlier one (class
// NimbraAccount).
inline constexpr StringConstant kWexmoMailDomain{"wexmo.com"};
inline constexpr StringConstant kNimbraMailDomain{"nimbra.com"};

// The account that owns the settings files, and its group.
inline constexpr StringConstant kSettingsOwner{"mobile"};

// Keys that the mail application keeps in its accounts: the directory of the account's mail, and whether the account is
// switched on.
inline constexpr StringConstant kMailAccountPathKey{"AccountPath"};
inline constexpr StringConstant kMailAccountIsActiveKey{"IsActive"};

// The mail application's preferences, announced whenever its accounts change.
inline constexpr StringConstant kMailPreferencesDomain{"com.vorlix.mobilemail"};
inline constexpr StringConstant kMailPreferencesAccountsKey{"MailAccounts"};

}  // namespace accountsettings
