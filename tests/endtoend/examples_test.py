"""The example devices, migrated: what stands on each device afterwards, whole."""

import os
import unittest

from device import CURRENT_VERSION, HOME, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY, TEMPORARY, exactly
from device_case import HOST, DeviceTest

MOBILE = 501


class Examples(DeviceTest):
    def migrated(self, name, notices=1):
        """The device, what stood on it before, and the run. Its mobile user is another than root, for root can tell."""
        device = self.example(name)
        self.owner = (MOBILE, MOBILE) if os.getuid() == 0 else (os.getuid(), os.getgid())
        device.set_mobile(*self.owner)
        before = device.entries()
        run = device.migrate(HOST)
        self.assertEqual(0, run.status, run.errors)
        self.assertEqual({"dataClass": "accounts", "success": True, "verdict": "kept"}, run.result())
        self.assertEqual(
            [{"event": "preferences-changed", "domain": "com.vorlix.mobilemail", "key": "MailAccounts"}] * notices,
            run.told("preferences-changed"),
        )
        return device, before, run

    def assert_left(self, device, before, *, gone=(), new=()):
        """Only what is named came or went, the settings file is as it must be, and nothing else was touched."""
        after = device.entries()
        expected = set(before) - set(gone) | {SETTINGS, TEMPORARY} | set(new)
        self.assertEqual(sorted(expected), sorted(after))
        for path in set(before) & set(after) - {SETTINGS, HOME}:
            if before[path].kind == "file":
                self.assertEqual(before[path], after[path], path)
        self.assertEqual(("file", 0o600, self.owner), after[SETTINGS][:3])
        self.assertEqual(("directory", 0o700, self.owner), after[TEMPORARY][:3])
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])
        self.assertTrue(device.read(SETTINGS).startswith(b"bplist00"))

    def accounts(self, device):
        return device.read_plist(SETTINGS)["Accounts"]

    def by_name(self, device):
        return {account.get("DisplayName", account["Type"]): account for account in self.accounts(device)}

    def test_a_current_device_keeps_every_value(self):
        device, before, run = self.migrated("current")
        self.assert_left(device, before, new=[SETTINGS_COPY])
        kept = self.example("current").read_plist(SETTINGS)
        self.assertEqual(exactly(kept), exactly(device.read_plist(SETTINGS)))
        self.assertEqual(before[SETTINGS].content, device.read(SETTINGS_COPY))
        self.assertEqual([], run.console())

    def test_a_first_generation_device(self):
        device, before, run = self.migrated("first-generation")
        self.assert_left(device, before, new=[SETTINGS_COPY])
        self.assertEqual(before[SETTINGS].content, device.read(SETTINGS_COPY))
        self.assertEqual("Migrating accounts", run.console()[0])
        accounts = self.by_name(device)
        self.assertEqual("Gmail", accounts["June at Gmail"]["Type"])
        self.assertIn("com.vorlix.Dataclass.Calendars", accounts["June at Gmail"]["Enabled Dataclasses"])
        self.assertNotIn("June's Google Calendar", accounts)
        self.assertIn("Allotment Society", accounts)
        self.assertEqual("IMAP-june@imap.hollis.example", accounts["Hollis & Daughters"]["Sync Identifier"])
        self.assertEqual("0B6C2A51-3A0E-4B7D-9B1C-6E0C6B1D7A01", accounts["Hollis & Daughters"]["Identifier"])
        self.assertEqual(18446744073709551615, accounts["County Council"]["PolicyKey"])
        self.assertEqual("jhollis@wexmo.com", accounts["Wexmo"]["Username"])
        self.assertEqual(["WexmoAccount"], [child["Class"] for child in accounts["Wexmo"]["ChildAccounts"]])

    def test_a_device_with_legacy_files(self):
        device, before, run = self.migrated("legacy-files", notices=2)  # one for the repaired class, one for the run
        self.assert_left(device, before, gone=[LEGACY_MAIL, LEGACY_EXCHANGE, HOME + "/Library/Mail/AutoFetchEnabled"])
        self.assertRegex(run.console()[0], "^Error trying to save an accountsettings plist copy: ")
        accounts = self.by_name(device)
        self.assertEqual("Google Mail", accounts["Ivo"]["Type String"])
        self.assertEqual("IMAPAccount", accounts["Tern Boatyard"]["Class"])
        self.assertEqual("POPAccount", accounts["Harbour office"]["Class"])
        self.assertEqual("Exchange", accounts["Coastguard"]["Type"])
        self.assertNotIn("com.vorlix.Dataclass.Mail", accounts["Coastguard"]["Enabled Dataclasses"])

    def test_a_second_run_finds_nothing_to_migrate(self):
        device, _, _ = self.migrated("first-generation")
        settled = device.read_plist(SETTINGS)
        run = device.migrate(HOST)
        self.assertEqual((0, []), (run.status, run.console()))
        self.assertEqual(exactly(settled), exactly(device.read_plist(SETTINGS)))


if __name__ == "__main__":
    unittest.main()
