"""The words that the migration knows, and that say nothing of anybody: they stay as they are when a device is anonymised."""

import re

TYPES = (
    "Subscribed Calendar", "CalDAV", "CardDAV", "BookmarkDAV", "SMTP", "Exchange", "LDAP", "Mail", "Nimbra", "Gmail",
    "Yahoo", "OnMyDevice", "IMAPNotes", "VorlixAccount", "KeldorIMAP",
)
CLASSES = (
    "GmailAccount", "WexmoAccount", "KeldorIMAPAccount", "YahooAccount", "DAMailAccount", "NimbraAccount", "DeliveryAccount",
    "SMTPAccount", "MailAccount", "POPAccount", "IMAPAccount", "AOLAccount", "LocalAccount", "KQAccount",
    "MobileCalDAVAccount", "MobileCardDAVAccount", "ASAccount", "LDAPAccount", "DeviceLocalAccount", "BasicAccount",
)
DATACLASSES = tuple("com.vorlix.Dataclass." + name for name in (
    "Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "MediaStream", "DeviceLocator", "ContactsSearch",
    "Backup", "Quorvel", "KeyValue", "Tickora", "SharedStreams",
))
TEXTS = frozenset((
    "", *TYPES, *CLASSES, *DATACLASSES,
    "Account", "Google Mail", "Yahoo!\u200e", "Exchange ActiveSync", "Cirrant", "Ferrox", "Drevan", "Windows",
    "DenyTethered", "armv6", "armv6l", "armv7", "arm64", "aarch64", "x86_64", "i386",
))

# Fragments of texts that are looked for, or appended: hosts, domains, and the beginnings of directories.
FRAGMENTS = re.compile(
    r"Mail/(?:Lumo-|Nimbra-|AOL-|Mailboxes|POP-|IMAP-)|gmail\.com@imap\.gmail\.com|@imap\.mail\.yahoo\.com"
    r"|^www\.google\.com$|^caldav\.calendar\.yahoo\.com$|(?<=@)(?:wexmo\.com|nimbra\.com|gmail\.com)(?=/|$)"
    r"|^/calendar/dav/(?=.*/user$)|(?<=/)user$|^/principals/users/")

KEYS = frozenset((
    "Identifier", "Sync Identifier", "Type", "Class", "DisplayName", "Enabled Dataclasses", "Supported Dataclasses",
    "Provisioned Dataclasses", "Username", "Type String", "Short Type String", "Prevent Recents Syncing",
    "Subscribed Calendars", "CalendarsWereMigrated", "ChildAccounts", "Version", "Accounts", "AccountPath", "IsActive",
    "hostedServiceStatus", "primaryAccount", "CalDAVEnabled", "DAExoSubscribedCalendarInfos",
    "CalDAVPrincipalConfiguration", "CalDAVAccountConfiguration", "Login_Key", "CalDAV_Server_Key",
    "CalDAV_PrincipalPath_Key",
    "DeliveryAccounts", "MailAccounts", "AccountType", "AccountName", "uniqueId",
    "DAAccountsKey", "DAAccountConfigurationClass", "DAAccountDescription", "DAAccountConfigurationAccountID",
    "DAAccountEnabledForCalendar", "DAAccountEnabledForContacts", "DAAccountEnabledForEmail",
    "DAAccountEnabledForContactsSearch", "ASSaveMigrationInformation",
    "CPUArchitecture", "DeviceClass", "RegionalBehaviorGoogleMail",
    "CloudDocumentSync", "MediaStream", "SharedStreams", "CloudBackup", "CardsWhileLocked",
    "Mail Accounts", "Contacts", "Calendars", "Bookmarks", "Notes", "SyncingOS", "Sources", "Error",
    # What accounts of every kind have beside; it says nothing of anybody, and helps whoever reads.
    "Hostname", "Host", "Port", "PortNumber", "SSLEnabled", "Password", "EmailAddresses", "FullUserName", "Signature",
))
# What is read as a number or as yes and no, and so is what it says.
READ_KEYS = frozenset((
    "Version", "IsActive", "hostedServiceStatus", "primaryAccount", "CalDAVEnabled", "ASSaveMigrationInformation",
    "RegionalBehaviorGoogleMail", "CloudDocumentSync", "MediaStream", "SharedStreams", "CloudBackup", "CardsWhileLocked",
    "DAAccountEnabledForCalendar", "DAAccountEnabledForContacts", "DAAccountEnabledForEmail",
    "DAAccountEnabledForContactsSearch",
))
CREDENTIAL = re.compile(
    "password|passwd|passphrase|passcode|token|secret|cookie|credential|key|pincode|authorization|oauth|bearer|session|otp"
    "|^pw$|^pass$|^pin$")
PLAIN_KEYS = frozenset(("loginkey", "caldavserverkey", "caldavprincipalpathkey", "daaccountskey"))


def names_credential(key):
    """Whether what stands under this key is a secret."""
    folded = re.sub("[ _-]", "", key).lower()
    return folded not in PLAIN_KEYS and CREDENTIAL.search(folded) is not None
