"""What the tests of legacy devices share: a device of readable parts, and the statement of a whole end state."""

import os
import tempfile
import unittest
from pathlib import Path

from device import (
    CURRENT_VERSION,
    HOME,
    LEGACY_EXCHANGE,
    LEGACY_MAIL,
    PREFERENCES,
    SETTINGS,
    SETTINGS_COPY,
    Device,
    exactly,
)

HOST = Path(os.environ["MIGRATION_HOST"])
DEVICE_INFO = "etc/vorlix/device-info.plist"
RECORDS_SWITCH = PREFERENCES + "/com.vorlix.accountsettings-logging.plist"
REPORTS = HOME + "/Library/Logs/CrashReporter/AccountMigration"
SENTINEL = PREFERENCES + "/.removingOldAccounts"
AUTO_FETCH = HOME + "/Library/Mail/AutoFetchEnabled"

MAIL_NOTICE = {"event": "preferences-changed", "domain": "com.vorlix.mobilemail", "key": "MailAccounts"}
MIGRATING = "Migrating accounts"

DATACLASS = "com.vorlix.Dataclass."
CALENDARS, CONTACTS = DATACLASS + "Calendars", DATACLASS + "Contacts"
MAIL, CONTACTS_SEARCH = DATACLASS + "Mail", DATACLASS + "ContactsSearch"

# An account of a type that no conversion touches.
STANDING = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L1", "Port": 389}


def incoming(identifier, class_name="IMAPAccount", **more):
    return {"AccountType": class_name, "AccountName": "Home", "uniqueId": identifier, **more}


def delivery(identifier, **more):
    return {"uniqueId": identifier, "Hostname": "smtp.example.com", **more}


def exchange(identifier, **more):
    return {
        "DAAccountConfigurationClass": "ASAccount",
        "DAAccountDescription": "Work",
        "DAAccountConfigurationAccountID": identifier,
        **more,
    }


def mail_file(incoming_accounts, delivery_accounts=()):
    return {"DeliveryAccounts": list(delivery_accounts), "MailAccounts": list(incoming_accounts)}


def exchange_file(*accounts):
    return {"DAAccountsKey": list(accounts)}


def mail_record(identifier, class_name="IMAPAccount", kind="Mail", called="Account", **more):
    return {
        "Class": class_name,
        "DisplayName": "Home",
        "Identifier": identifier,
        "Type": kind,
        "Type String": called,
        "Short Type String": called,
        "Sync Identifier": identifier,
        **more,
    }


def delivery_record(identifier, **more):
    return {
        "Hostname": "smtp.example.com",
        "Identifier": identifier,
        "Class": "SMTPAccount",
        "Type": "SMTP",
        "Type String": "Account",
        "Short Type String": "Account",
        "Sync Identifier": identifier,
        **more,
    }


def exchange_record(identifier, enabled=(CALENDARS, CONTACTS, MAIL, CONTACTS_SEARCH), **more):
    return {
        "Class": "ASAccount",
        "DisplayName": "Work",
        "Identifier": identifier,
        "Enabled Dataclasses": list(enabled),
        "Type": "Exchange",
        "Type String": "Exchange",
        "Short Type String": "Exchange",
        "Sync Identifier": identifier,
        **more,
    }


def decision(mail, exchange_, settings):
    return (
        f"Accounts settings needs migration! oldMailAccountsPresent={mail}, "
        f"oldDAAccountsPresent={exchange_}, migrateNewAccountsInfo={settings}"
    )


def save_of(*types):
    """The heads of what one save logs, with accounts of these types in the store."""
    heads = ["Saving all accounts"]
    for each in types:
        heads += ["Merging inmem", "Merged to", f"Calculated Properties - Type: {each}, Properties:"]
    return heads


def conversion_failure(method, kind, description):
    return (
        f"-[AccountsDataMigrator(Internal) {method}:]. "
        f"Could not convert the description for the {kind} account {description}"
    )


class LegacyCase(unittest.TestCase):
    maxDiff = None

    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.scratch = Path(scratch.name).resolve()
        self.devices = 0

    def device(
        self, mail=None, exchange_=None, version=CURRENT_VERSION, accounts=(STANDING,), info=None, records=False
    ):
        """A device with these legacy files (dictionaries, or bytes as they are) beside its settings."""
        self.devices += 1
        device = Device(self.scratch / f"device{self.devices}")
        device.set_mobile(os.getuid(), os.getgid())
        for path, content in ((LEGACY_MAIL, mail), (LEGACY_EXCHANGE, exchange_), (DEVICE_INFO, info)):
            if isinstance(content, bytes):
                device.write(path, content)
            elif content is not None:
                device.write_plist(path, content)
        if version is not None:
            device.write_plist(SETTINGS, {"Accounts": list(accounts), "Version": version})
        if records:
            device.write_plist(RECORDS_SWITCH, {"ASSaveMigrationInformation": True})
        return device

    def assert_migrated(self, device, run, *, accounts, log, console=(MIGRATING,), files=(SETTINGS, SETTINGS_COPY)):
        """The whole end state of a run that succeeded."""
        self.assertEqual(0, run.status, run.errors)
        self.assertEqual(list(console), run.console())
        self.assertEqual(list(console), [line for line in run.errors if not line.startswith("migration-host: ")])
        self.assertEqual(log, [message.split(" {")[0] for message in run.messages()])
        self.assertEqual([MAIL_NOTICE], run.told("preferences-changed"))
        self.assertEqual([], run.told("cloud-tabs"))
        self.assert_files(device, files)
        expected = {"Accounts": list(accounts), "Version": CURRENT_VERSION}
        self.assertEqual(exactly(expected), exactly(device.read_plist(SETTINGS)))

    def assert_files(self, device, expected):
        """Exactly these files stand below the mobile user's home."""
        found = {path for path, entry in device.entries().items() if entry.kind != "directory"}
        self.assertEqual(sorted(expected), sorted(path for path in found if path.startswith(HOME)))
