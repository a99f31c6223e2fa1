#pragma once

#include "accountsettings/product_values.h"
#include "platform/text.h"

// Names that earlier releases and other programs put into account records, beside the library's own vocabulary. Like
// the vocabulary they are part of the files' format and are compared exactly, case included.
namespace migrator {

using platform::StringConstant;

// Class names: the values of an account's "Class".
inline constexpr StringConstant kIMAPAccountClass{"IMAPAccount"};
inline constexpr StringConstant kPOPAccountClass{"POPAccount"};
inline constexpr StringConstant kGmailAccountClass{"GmailAccount"};
inline constexpr StringConstant kYahooAccountClass{"YahooAccount"};
inline constexpr StringConstant kAOLAccountClass{"AOLAccount"};
inline constexpr StringConstant kWexmoAccountClass{"WexmoAccount"};    // mail of the vendor's oldest hosted service
inline constexpr StringConstant kNimbraAccountClass{"NimbraAccount"};  // mail of the vendor's earlier hosted service
inline constexpr StringConstant kCloudAccountClass{"KQAccount"};       // the vendor's cloud account
inline constexpr StringConstant kCloudMailClass{"KeldorIMAPAccount"};  // mail of the cloud account
inline constexpr StringConstant kExchangeMailClass{"DAMailAccount"};   // the mail side of an Exchange account
inline constexpr StringConstant kDeliveryAccountClass{"DeliveryAccount"};
inline constexpr StringConstant kSMTPAccountClass{"SMTPAccount"};
inline constexpr StringConstant kGenericMailClass{"MailAccount"};  // mail of which no more was known
inline constexpr StringConstant kCalDAVAccountClass{"MobileCalDAVAccount"};

// Keys of an account.
inline constexpr StringConstant kIsActiveKey = accountsettings::kMailAccountIsActiveKey;  // boolean of mail accounts
inline constexpr StringConstant kUniqueIdKey{"uniqueId"};              // text: the identifier of the earliest releases
inline constexpr StringConstant kPrimaryAccountKey{"primaryAccount"};  // boolean of cloud accounts
inline constexpr StringConstant kCalDAVEnabledKey{"CalDAVEnabled"};    // boolean
inline constexpr StringConstant kSubscribedCalendarInfosKey{"DAExoSubscribedCalendarInfos"};  // array
inline constexpr StringConstant kCalDAVPrincipalKey{"CalDAVPrincipalConfiguration"};          // dictionary
inline constexpr StringConstant kCalDAVConfigurationKey{"CalDAVAccountConfiguration"};        // dictionary

// Keys inside the two dictionaries of a CalDAV account.
inline constexpr StringConstant kCalDAVLoginKey{"Login_Key"};
inline constexpr StringConstant kCalDAVServerKey{"CalDAV_Server_Key"};
inline constexpr StringConstant kCalDAVPrincipalPathKey{"CalDAV_PrincipalPath_Key"};

// Keys of the report's collected data.
inline constexpr StringConstant kOldExchangeAccountsKey{"OldExchangeAccount"};
inline constexpr StringConstant kOldMailAccountsKey{"OldMailAccounts"};
inline constexpr StringConstant kOldAccountSettingsKey{"OldAccountSettings"};
inline constexpr StringConstant kSavedSettingsKey{"NewAccounSettings"};  // readers of reports know this spelling

}  // namespace migrator
