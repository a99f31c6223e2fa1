"""Devices as odd as they come, each the same for the same seed."""

import plistlib
import random
from pathlib import Path

from device import CURRENT_VERSION, HOME, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS, SETTINGS_COPY

TYPES = ["Mail", "Mail", "Nimbra", "Nimbra", "VorlixAccount", "CalDAV", "Exchange", "SMTP", "Gmail", "Yahoo",
         "OnMyDevice", "LDAP", "IMAPNotes", "Unheard of"]
CLASSES = ["IMAPAccount", "POPAccount", "GmailAccount", "YahooAccount", "AOLAccount", "WexmoAccount", "NimbraAccount",
           "KQAccount", "KQAccount", "MobileCalDAVAccount", "MailAccount", "OtherAccount"]
DATACLASSES = ["Mail", "Contacts", "Calendars", "Reminders", "Bookmarks", "Notes", "DeviceLocator", "Quorvel",
               "KeyValue", "Tickora", "Unheard of"]
PATHS = ["Mail/IMAP-x", "Mail/POP-x", "Mail/Lumo-x", "elsewhere", ""]
# What the version steps beyond the third generation name, by release: each key with the values that it is to have.
STEP_KEYS = plistlib.loads((Path(__file__).parent.parent / "support" / "step_keys.plist").read_bytes())
SENTINEL = PREFERENCES + "/.removingOldAccounts"
RECORDS_SWITCH = PREFERENCES + "/com.vorlix.accountsettings-logging.plist"


class RandomDevice:
    """Fills a device's file tree."""

    def __init__(self, seed):
        self.random = random.Random(seed)
        self.made = 0

    def maybe(self, chance=0.5):
        return self.random.random() < chance

    def one_of(self, values):
        return self.random.choice(values)

    def anything(self):
        return self.one_of([0, 2, 1.5, True, "", "yes", "jane@example", b"\x01\x02", [1, "a"], {"Inner": "x"}])

    def odd(self, usual):
        return self.anything() if self.maybe(0.06) else usual

    def identifier(self):
        self.made += 1
        return f"Identifier {self.random.randrange(4) if self.maybe(0.1) else self.made + 4}"

    def dataclasses(self):
        return [self.odd("com.vorlix.Dataclass." + self.one_of(DATACLASSES)) for _ in range(self.random.randrange(6))]

    def account(self, depth=0):
        candidates = {
            "Type": (0.97, lambda: self.one_of(TYPES)),
            "Class": (0.97, lambda: self.one_of(CLASSES)),
            "Identifier": (0.9, self.identifier),
            "uniqueId": (0.3, self.identifier),
            "Sync Identifier": (0.3, lambda: "sync"),
            "Username": (0.6, lambda: self.one_of(["jane", "jane@example"])),
            "DisplayName": (0.6, lambda: self.one_of(["Nimbra", "Mine", "Höhe \u2014 two"])),
            "Password": (0.5, lambda: "never shown"),
            "IsActive": (0.4, self.maybe),
            "AccountPath": (0.5, lambda: self.one_of(PATHS)),
            "Enabled Dataclasses": (0.5, self.dataclasses),
            "Provisioned Dataclasses": (0.3, self.dataclasses),
            "hostedServiceStatus": (0.4, lambda: self.random.randrange(4)),
            "primaryAccount": (0.2, self.maybe),
            "Subscribed Calendars": (0.2, self.anything),
            "CalDAVPrincipalConfiguration": (0.4, lambda: {
                "Login_Key": self.one_of(["jane", "jane@example"]), "CalDAV_Server_Key": "www.google.com"}),
            "CalDAVAccountConfiguration": (0.4, lambda: {"CalDAV_PrincipalPath_Key": "/calendar/dav/jane/user"}),
            "ChildAccounts": (0.3 if depth < 2 else 0, lambda: [
                self.odd(self.account(depth + 1)) for _ in range(self.random.randrange(3))]),
        }
        for keys in STEP_KEYS.values():
            candidates.update((key, (0.5, lambda values=values: self.one_of(values))) for key, values in keys.items())
        return {key: self.odd(make()) for key, (chance, make) in candidates.items() if self.maybe(chance)}

    def accounts(self):
        return [self.odd(self.account()) for _ in range(self.random.randrange(8))]

    def description(self, class_key, class_chance):
        keys = {"AccountName": "Mine", "DAAccountDescription": "Work", "uniqueId": self.identifier(),
                "DAAccountConfigurationAccountID": self.identifier(), "Username": "jane@wexmo.com",
                "AccountPath": self.one_of(PATHS), "DAAccountEnabledForEmail": self.maybe(), "Password": "never shown"}
        description = {key: self.odd(value) for key, value in keys.items() if self.maybe(0.7)}
        if self.maybe(class_chance):
            description[class_key] = self.one_of(CLASSES)
        return description

    def descriptions(self, class_key, class_chance=0.97):
        return [self.odd(self.description(class_key, class_chance)) for _ in range(self.random.randrange(4))]

    def settings(self):
        root = {"Accounts": self.odd(self.accounts()), "Version": self.odd(self.random.randrange(CURRENT_VERSION + 2))}
        return plistlib.dumps(root, fmt=plistlib.FMT_BINARY, sort_keys=False)

    def fill(self, device):
        """Writes what the device holds; whatever it may lack, it sometimes does."""
        device.write_plist("etc/vorlix/device-info.plist", {"CPUArchitecture": self.one_of(["armv6", "arm64"])})
        if self.maybe(0.85):
            device.write(SETTINGS, self.settings() if self.maybe(0.95) else b"no property list")
        if self.maybe(0.4):
            device.write_plist(LEGACY_MAIL, {"MailAccounts": self.descriptions("AccountType"),
                                             "DeliveryAccounts": self.descriptions("AccountType", 0.5)})
        if self.maybe(0.4):
            device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": self.descriptions("DAAccountConfigurationClass")})
        for path, chance in ((SETTINGS_COPY, 0.3), (LEGACY_MAIL + ".original", 0.2), (SENTINEL, 0.05),
                             (HOME + "/Library/Mail/AutoFetchEnabled", 0.3), (HOME + "/tmp/left over", 0.3)):
            if self.maybe(chance):
                device.write(path, "left over")
        if self.maybe(0.2):
            device.write_plist(RECORDS_SWITCH, {"ASSaveMigrationInformation": True})
        self.spoil(device)

    def spoil(self, device):
        """What keeps a save or a copy from succeeding."""
        if self.maybe(0.08):
            device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        if self.maybe(0.05):
            device.write(HOME + "/Library/Logs/CrashReporter/AccountMigration", "no directory")
        if self.maybe(0.05) and not device.path(HOME + "/tmp").exists():
            device.write(HOME + "/tmp", "no directory")
