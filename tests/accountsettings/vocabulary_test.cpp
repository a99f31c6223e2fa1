#include "accountsettings/vocabulary.h"

#include <gtest/gtest.h>

#include <vector>

#include "accountsettings/basic_account.h"

namespace accountsettings {
namespace {

struct Word {
  std::string_view constant;
  std::string_view value;
};

// Made before any initialisation runs, out of constants that must already have their values.
constinit const Word kWords[] = {
    {kSubscribedCalendarAccountType, "Subscribed Calendar"},
    {kCalDAVAccountType, "CalDAV"},
    {kCardDAVAccountType, "CardDAV"},
    {kBookmarkDAVAccountType, "BookmarkDAV"},
    {kSMTPAccountType, "SMTP"},
    {kExchangeAccountType, "Exchange"},
    {kLDAPAccountType, "LDAP"},
    {kMailAccountType, "Mail"},
    {kNimbraAccountType, "Nimbra"},
    {kGmailAccountType, "Gmail"},
    {kYahooAccountType, "Yahoo"},
    {kOnMyDeviceAccountType, "OnMyDevice"},
    {kIMAPNotesAccountType, "IMAPNotes"},
    {kVorlixAccountType, "VorlixAccount"},
    {kKeldorIMAPAccountType, "KeldorIMAP"},
    {kAccountDataclassMail, "com.vorlix.Dataclass.Mail"},
    {kAccountDataclassContacts, "com.vorlix.Dataclass.Contacts"},
    {kAccountDataclassCalendars, "com.vorlix.Dataclass.Calendars"},
    {kAccountDataclassReminders, "com.vorlix.Dataclass.Reminders"},
    {kAccountDataclassBookmarks, "com.vorlix.Dataclass.Bookmarks"},
    {kAccountDataclassNotes, "com.vorlix.Dataclass.Notes"},
    {kAccountDataclassContactsSearch, "com.vorlix.Dataclass.ContactsSearch"},
    {kAccountDataclassDeviceLocator, "com.vorlix.Dataclass.DeviceLocator"},
    {kAccountDataclassMediaStream, "com.vorlix.Dataclass.MediaStream"},
    {kAccountDataclassBackup, "com.vorlix.Dataclass.Backup"},
    {kAccountDataclassQuorvel, "com.vorlix.Dataclass.Quorvel"},
    {kAccountDataclassKeyValue, "com.vorlix.Dataclass.KeyValue"},
    {kAccountDataclassTickora, "com.vorlix.Dataclass.Tickora"},
    {kAccountDataclassSharedStreams, "com.vorlix.Dataclass.SharedStreams"},
    {kAccountIdentifier, "Identifier"},
    {kAccountSyncIdentifier, "Sync Identifier"},
    {kAccountType, "Type"},
    {kAccountClass, "Class"},
    {kAccountDisplayName, "DisplayName"},
    {kAccountEnabledDataclasses, "Enabled Dataclasses"},
    {kAccountSupportedDataclasses, "Supported Dataclasses"},
    {kAccountProvisionedDataclasses, "Provisioned Dataclasses"},
    {kAccountUsername, "Username"},
    {kAccountTypeString, "Type String"},
    {kAccountShortTypeString, "Short Type String"},
    {kAccountPreventRecentsSyncing, "Prevent Recents Syncing"},
    {kCalendarsAccountSubscribedCalendars, "Subscribed Calendars"},
    {kAccountCalendarsWereMigrated, "CalendarsWereMigrated"},
    {kAccountChildAccounts, "ChildAccounts"},
    {kPlistVersionKey, "Version"},
    {kPlistAccountsKey, "Accounts"},
    {kPropertiesSupportedDataclasses, "Supported Dataclasses"},
    {kPropertiesEnableDataclassActions, "Enable Actions"},
    {kPropertiesDisableDataclassActions, "Disable Actions"},
    {kPropertiesDeleteAccountActions, "Delete Account Actions"},
    {kPropertiesShowRemindersSeparately, "Show Reminders Separately"},
    {kDataclassSupportsMultipleStores, "Supports Multiple Stores"},
    {kDataclassDisplaySwitch, "Display Dataclass Switch"},
    {kDataclassRequiresUserConfirmation, "Requires User Confirmation"},
    {kDataclassToggleActionNone, "None"},
    {kDataclassToggleActionKeepLocalData, "Keep Local Data"},
    {kDataclassToggleActionMergeLocalData, "Merge Local Data"},
    {kDataclassToggleActionDeleteLocalData, "Delete Local Data"},
    {kDataclassToggleActionMergeSyncData, "Merge Sync Data"},
    {kDataclassToggleActionDeleteSyncData, "Delete Sync Data"},
    {kAccountDeleteActionMergeData, "Merge Data"},
    {kAccountDeleteActionDeleteData, "Delete Data"},
    {kASChangeAccountChangeTypeKey, "ChangeType"},
    {kASChangeAccountIdentifierKey, "AccountID"},
    {kASChangeAccountTypeKey, "AccountType"},
    {kASChangeAccountOriginallyEnabledDataclassesKey, "OriginalDataclasses"},
    {kAccountsFilename, "com.vorlix.accountsettings.plist"},
    {kAccountMigrationLockFilename, "/tmp/AccountMigrationInProgress"},
};

static_assert(kAccountSupportedDataclasses == kPropertiesSupportedDataclasses);
static_assert(kExchangeAccountType != std::string_view{"exchange"});

TEST(Vocabulary, SpellsEveryWordAsTheFilesDo) {
  EXPECT_EQ(std::size(kWords), 68U);
  for (const Word& word : kWords) EXPECT_EQ(word.constant, word.value);
}

TEST(Vocabulary, BecomesTextAndPropertyValueWithoutCopyingACharacter) {
  const Text text = kAccountIdentifier;
  const PropertyValue value = kAccountIdentifier;
  EXPECT_EQ(text.view().data(), kAccountIdentifier.view().data());
  EXPECT_EQ(value.asText()->view().data(), kAccountIdentifier.view().data());
}

TEST(Vocabulary, FindsTheDataclassListUnderEitherOfItsTwoNames) {
  const Dictionary section{{kPropertiesSupportedDataclasses, Array{kAccountDataclassMail}}};
  EXPECT_EQ(section.array(kAccountSupportedDataclasses), section.array(kPropertiesSupportedDataclasses));
  EXPECT_NE(section.array(kAccountSupportedDataclasses), nullptr);
}

TEST(Vocabulary, HasACanonicalOrderOfFourteenDataclassesWithMediaStreamBeforeDeviceLocatorAndContactsSearch) {
  const std::vector<Text> order{
      kAccountDataclassMail,        kAccountDataclassContacts,      kAccountDataclassCalendars,
      kAccountDataclassReminders,   kAccountDataclassBookmarks,     kAccountDataclassNotes,
      kAccountDataclassMediaStream, kAccountDataclassDeviceLocator, kAccountDataclassContactsSearch,
      kAccountDataclassBackup,      kAccountDataclassQuorvel,       kAccountDataclassKeyValue,
      kAccountDataclassTickora,     kAccountDataclassSharedStreams};
  EXPECT_EQ(BasicAccount::allSupportedDataclasses(), order);
  EXPECT_EQ(&BasicAccount::allSupportedDataclasses(), &BasicAccount::allSupportedDataclasses());
}

}  // namespace
}  // namespace accountsettings
