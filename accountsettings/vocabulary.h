#pragma once

#include "platform/text.h"

// The one vocabulary of account records, settings files and configuration. The values are part of the files' format:
// they are compared exactly, case included, and code refers to them by these names only. Every constant is a literal,
// usable before any initialisation has run, and becomes a text or a property value without copying a character.
namespace accountsettings {

using platform::StringConstant;

// Account types: the values of an account's `kAccountType`, and the top-level keys of the account-type configuration.
inline constexpr StringConstant kSubscribedCalendarAccountType{"Subscribed Calendar"};  // a calendar that is only read
inline constexpr StringConstant kCalDAVAccountType{"CalDAV"};                           // calendars (RFC 4791)
inline constexpr StringConstant kCardDAVAccountType{"CardDAV"};                         // contacts (RFC 6352)
inline constexpr StringConstant kBookmarkDAVAccountType{"BookmarkDAV"};  // bookmarks over WebDAV (RFC 4918)
inline constexpr StringConstant kSMTPAccountType{"SMTP"};                // an outgoing mail server
inline constexpr StringConstant kExchangeAccountType{"Exchange"};        // Exchange ActiveSync
inline constexpr StringConstant kLDAPAccountType{"LDAP"};                // a directory (RFC 4511)
inline constexpr StringConstant kMailAccountType{"Mail"};                // incoming mail, IMAP or POP
inline constexpr StringConstant kNimbraAccountType{"Nimbra"};  // the vendor's earlier hosted mail and sync service
inline constexpr StringConstant kGmailAccountType{"Gmail"};
inline constexpr StringConstant kYahooAccountType{"Yahoo"};
// The implicit account of what belongs to no service.
inline constexpr StringConstant kOnMyDeviceAccountType{"OnMyDevice"};
inline constexpr StringConstant kIMAPNotesAccountType{"IMAPNotes"};  // notes kept on an IMAP server
// The vendor's cloud account, parent of its hosted children.
inline constexpr StringConstant kVorlixAccountType{"VorlixAccount"};
inline constexpr StringConstant kKeldorIMAPAccountType{"KeldorIMAP"};  // the mail child of the cloud account

// Data classes: the kinds of user data that an account can carry.
inline constexpr StringConstant kAccountDataclassMail{"com.vorlix.Dataclass.Mail"};
inline constexpr StringConstant kAccountDataclassContacts{"com.vorlix.Dataclass.Contacts"};
inline constexpr StringConstant kAccountDataclassCalendars{"com.vorlix.Dataclass.Calendars"};
inline constexpr StringConstant kAccountDataclassReminders{"com.vorlix.Dataclass.Reminders"};
inline constexpr StringConstant kAccountDataclassBookmarks{"com.vorlix.Dataclass.Bookmarks"};
inline constexpr StringConstant kAccountDataclassNotes{"com.vorlix.Dataclass.Notes"};
inline constexpr StringConstant kAccountDataclassContactsSearch{"com.vorlix.Dataclass.ContactsSearch"};
inline constexpr StringConstant kAccountDataclassDeviceLocator{"com.vorlix.Dataclass.DeviceLocator"};
inline constexpr StringConstant kAccountDataclassMediaStream{"com.vorlix.Dataclass.MediaStream"};
inline constexpr StringConstant kAccountDataclassBackup{"com.vorlix.Dataclass.Backup"};
inline constexpr StringConstant kAccountDataclassQuorvel{"com.vorlix.Dataclass.Quorvel"};
inline constexpr StringConstant kAccountDataclassKeyValue{"com.vorlix.Dataclass.KeyValue"};
inline constexpr StringConstant kAccountDataclassTickora{"com.vorlix.Dataclass.Tickora"};
inline constexpr StringConstant kAccountDataclassSharedStreams{"com.vorlix.Dataclass.SharedStreams"};

// Keys of an account's properties, as they stand in the account settings file.
inline constexpr StringConstant kAccountIdentifier{"Identifier"};           // text: unique, a UUID for new accounts
inline constexpr StringConstant kAccountSyncIdentifier{"Sync Identifier"};  // text: names the account's sync store
inline constexpr StringConstant kAccountType{"Type"};                       // text: one of the types above
inline constexpr StringConstant kAccountClass{"Class"};  // text, required: the class of the full account object
inline constexpr StringConstant kAccountDisplayName{"DisplayName"};  // text: what the user calls the account
// Array of data classes that are switched on, in no order.
inline constexpr StringConstant kAccountEnabledDataclasses{"Enabled Dataclasses"};
// Array of data classes; the text of kPropertiesSupportedDataclasses, also in notifier entries.
inline constexpr StringConstant kAccountSupportedDataclasses{"Supported Dataclasses"};
// Array of data classes that the service grants; absent: all supported ones.
inline constexpr StringConstant kAccountProvisionedDataclasses{"Provisioned Dataclasses"};
inline constexpr StringConstant kAccountUsername{"Username"};                  // text: the name to sign in with
inline constexpr StringConstant kAccountTypeString{"Type String"};             // text: what people call the type
inline constexpr StringConstant kAccountShortTypeString{"Short Type String"};  // text: the same in short
// Boolean, for other users of the library.
inline constexpr StringConstant kAccountPreventRecentsSyncing{"Prevent Recents Syncing"};
// Array: calendars subscribed to inside the account.
inline constexpr StringConstant kCalendarsAccountSubscribedCalendars{"Subscribed Calendars"};
// Boolean, for other users of the library.
inline constexpr StringConstant kAccountCalendarsWereMigrated{"CalendarsWereMigrated"};
inline constexpr StringConstant kAccountChildAccounts{"ChildAccounts"};  // array of the child accounts' properties

// Keys of the account settings file's root.
inline constexpr StringConstant kPlistVersionKey{"Version"};    // integer: the data version
inline constexpr StringConstant kPlistAccountsKey{"Accounts"};  // array of the top-level accounts' properties

// Keys of one type's section in the account-type configuration.
inline constexpr StringConstant kPropertiesSupportedDataclasses{"Supported Dataclasses"};   // array of data classes
inline constexpr StringConstant kPropertiesEnableDataclassActions{"Enable Actions"};        // array of toggle actions
inline constexpr StringConstant kPropertiesDisableDataclassActions{"Disable Actions"};      // array of toggle actions
inline constexpr StringConstant kPropertiesDeleteAccountActions{"Delete Account Actions"};  // array of delete actions
inline constexpr StringConstant kPropertiesShowRemindersSeparately{"Show Reminders Separately"};  // boolean

// Keys of one data class's section in the data-class configuration; every value is a boolean, absent means false.
// Local data and each account can have a store of their own.
inline constexpr StringConstant kDataclassSupportsMultipleStores{"Supports Multiple Stores"};
inline constexpr StringConstant kDataclassDisplaySwitch{"Display Dataclass Switch"};  // the user sees a switch for it
// Switching it asks the user first.
inline constexpr StringConstant kDataclassRequiresUserConfirmation{"Requires User Confirmation"};

// Actions offered to the user when a data class is switched on or off.
inline constexpr StringConstant kDataclassToggleActionNone{"None"};
inline constexpr StringConstant kDataclassToggleActionKeepLocalData{"Keep Local Data"};
inline constexpr StringConstant kDataclassToggleActionMergeLocalData{"Merge Local Data"};
inline constexpr StringConstant kDataclassToggleActionDeleteLocalData{"Delete Local Data"};
inline constexpr StringConstant kDataclassToggleActionMergeSyncData{"Merge Sync Data"};
inline constexpr StringConstant kDataclassToggleActionDeleteSyncData{"Delete Sync Data"};

// Actions offered to the user when an account is deleted.
inline constexpr StringConstant kAccountDeleteActionMergeData{"Merge Data"};
inline constexpr StringConstant kAccountDeleteActionDeleteData{"Delete Data"};

// Keys of a change-notification entry.
inline constexpr StringConstant kASChangeAccountChangeTypeKey{"ChangeType"};
inline constexpr StringConstant kASChangeAccountIdentifierKey{"AccountID"};
inline constexpr StringConstant kASChangeAccountTypeKey{"AccountType"};
inline constexpr StringConstant kASChangeAccountOriginallyEnabledDataclassesKey{"OriginalDataclasses"};

// File names.
inline constexpr StringConstant kAccountsFilename{"com.vorlix.accountsettings.plist"};  // the account settings file

// The file on which the migration lock is taken, for other processes. A plain character string: it is a path, not a
// property value, and the library itself takes the lock by its name.
inline constexpr const char* kAccountMigrationLockFilename = "/tmp/AccountMigrationInProgress";

}  // namespace accountsettings
