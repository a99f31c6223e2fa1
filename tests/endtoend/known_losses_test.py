"""What a run takes away because it must, each as docs/RELIABILITY.md lists it, and where it can be had again."""

import plistlib
import unittest

from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from device_case import HOST, DeviceTest

KEPT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "KEPT"}
UNFIXABLE = {"Type": "Mail", "Class": "Unheard of", "Identifier": "UNFIXABLE", "AccountPath": "says nothing"}
CHILD = {"Type": "Nimbra", "Class": "NimbraAccount", "Identifier": "LEGACY", "Username": "ines"}
PARENT = {
    "Type": "VorlixAccount", "Class": "NimbraAccount", "Identifier": "PARENT", "Username": "ines@nimbra.com",
    "ChildAccounts": [CHILD],
}


class KnownLosses(DeviceTest):
    def migrate(self, device):
        run = device.migrate(HOST)
        self.assertEqual(0, run.status, run.errors)
        return run

    def accounts(self, device, path=SETTINGS):
        return device.read_plist(path)["Accounts"]

    def test_an_account_that_the_fixer_drops_is_named_in_the_log_and_stands_in_the_copy(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[KEPT, UNFIXABLE])
        run = self.migrate(device)
        self.assertEqual([KEPT], self.accounts(device))
        self.assertEqual([KEPT, UNFIXABLE], self.accounts(device, SETTINGS_COPY))
        named = [each for each in run.messages() if each.startswith("Could not fix the class of the mail account: ")]
        self.assertIn("UNFIXABLE", named[0])

    def test_a_file_that_cannot_be_read_is_replaced_and_stands_in_the_copy(self):
        device = self.device()
        content = plistlib.dumps({"Version": CURRENT_VERSION, "Accounts": [KEPT]}, fmt=plistlib.FMT_BINARY)[:-1]
        device.write(SETTINGS, content)
        self.migrate(device)
        self.assertEqual([], self.accounts(device))
        self.assertEqual(content, device.read(SETTINGS_COPY))

    def test_a_legacy_account_that_the_file_holds_as_a_child_becomes_its_parents_record(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[PARENT])
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [
            {"AccountType": "NimbraAccount", "uniqueId": "LEGACY", "Username": "ines", "Signature": "lost"}
        ]})
        self.migrate(device)
        parent, converted = self.accounts(device)
        self.assertEqual(PARENT, parent)
        self.assertEqual({**PARENT, "Sync Identifier": "LEGACY"}, converted)
        self.assertEqual([PARENT], self.accounts(device, SETTINGS_COPY))


if __name__ == "__main__":
    unittest.main()
