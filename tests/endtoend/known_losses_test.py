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


class LossesTest(DeviceTest):
    def migrate(self, device):
        run = device.migrate(HOST)
        self.assertEqual(0, run.status, run.errors)
        return run

    def losses(self, device, *options):
        """Of each account that the verdict of a run names: its code, its identifier and the place of its data."""
        run = device.migrate(HOST, *options)
        result = run.result()
        self.assertEqual("lost", result["verdict"])
        return [(lost["code"], lost.get("identifier"), lost.get("where")) for lost in result["lost"]]

    def accounts(self, device, path=SETTINGS):
        return device.read_plist(path)["Accounts"]


class KnownLosses(LossesTest):
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


class Verdicts(LossesTest):
    """Of each kind of loss: that the verdict names it, and where the data still are."""

    def test_name_each_record_that_is_left_out(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[KEPT, UNFIXABLE, {"Identifier": "NO TYPE", "Class": "C"}, 7])
        copy = str(device.path(SETTINGS_COPY))
        self.assertEqual(
            [("dropped-unknown-class", "UNFIXABLE", copy), ("dropped-no-type", "NO TYPE", copy),
             ("dropped-no-record", None, copy)],
            self.losses(device))

    def test_name_a_record_that_another_one_of_its_identifier_replaces(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[{**KEPT, "Host": "first"}, {**KEPT, "Host": "second"}])
        self.assertEqual([("replaced-duplicate", "KEPT", str(device.path(SETTINGS_COPY)))], self.losses(device))

    def test_name_every_account_of_a_legacy_file_of_which_one_is_refused(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "GOOD"}, {"uniqueId": "BAD"}]})
        kept = str(device.path(LEGACY_MAIL + ".unconverted-1"))
        self.assertEqual([("refused-file", "GOOD", kept), ("refused-description", "BAD", kept)], self.losses(device))

    def test_name_an_account_that_makes_room_for_others_of_its_own_file(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"DeliveryAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "MISPLACED"}],
                                         "MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}]})
        kept = str(device.path(LEGACY_MAIL + ".unsaved-1"))
        self.assertEqual([("replaced-with-type", "MISPLACED", kept)], self.losses(device))

    def test_name_a_legacy_file_that_cannot_be_read(self):
        device = self.device()
        device.write(LEGACY_MAIL, "no property list")
        run = device.migrate(HOST)
        self.assertEqual([("unreadable-legacy-file", str(device.path(LEGACY_MAIL)))],
                         [(lost["code"], lost["file"]) for lost in run.result()["lost"]])

    def test_name_a_settings_file_that_cannot_be_read(self):
        device = self.device()
        device.write(SETTINGS, plistlib.dumps({"Version": CURRENT_VERSION, "Accounts": [KEPT]}, fmt=plistlib.FMT_BINARY)[:-20])
        self.assertEqual([("unreadable-settings-file", None, str(device.path(SETTINGS_COPY + ".unreadable-1")))], self.losses(device))

    def test_name_a_converted_account_that_its_parents_record_replaces(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[PARENT])
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "NimbraAccount", "uniqueId": "LEGACY"}]})
        self.assertEqual([("replaced-duplicate", "LEGACY", str(device.path(LEGACY_MAIL + ".unsaved-1")))], self.losses(device))

    def test_name_a_settings_file_of_a_newer_version(self):
        device = self.device(Version=99, Accounts=[KEPT], Further="key")
        self.assertEqual([("newer-settings-file", None, str(device.path(SETTINGS_COPY + ".newer-1")))], self.losses(device))

    def test_say_that_a_snapshot_has_the_data(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[UNFIXABLE])
        snapshots = self.scratch / "snapshots"
        [(_, _, where)] = self.losses(device, "--snapshots", snapshots)
        self.assertEqual([where], [str(path) for path in snapshots.iterdir() if path.is_dir()])

    def test_are_an_exit_status_where_the_command_line_is_strict(self):
        for accounts, status in (([KEPT], 0), ([UNFIXABLE], 7)):
            self.assertEqual(status, self.device(Version=CURRENT_VERSION, Accounts=accounts).migrate(HOST, "--strict").status)

    def test_name_each_account_that_went_with_its_file_and_was_not_saved(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}]})
        device.path(SETTINGS).mkdir()
        run = device.migrate(HOST)
        self.assertEqual((6, "not saved"), (run.status, run.result()["verdict"]))
        self.assertEqual([("not-saved", "M")], [(lost["code"], lost["identifier"]) for lost in run.result()["lost"]])


if __name__ == "__main__":
    unittest.main()
