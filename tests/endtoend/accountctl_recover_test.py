"""accountctl recover: accounts come back whole, none twice, and none that would not last."""

import json
import os
import plistlib
import stat
import unittest

from accountctl_case import CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS
from device_case import HOST

WORK = {
    "Type": "Mail",
    "Class": "IMAPAccount",
    "Identifier": "W1",
    "Sync Identifier": "S-W1",
    "DisplayName": "Work",
    "Username": "ines",
    "Hostname": "imap.work.example",
    "Password": "mangrove",
    "Unknown": {"Kept": [1, True, 2.5, b"\x00\x01"]},
}
PIGEON = changed(WORK, Class="Pigeon")
NO_CLASS = {"uniqueId": "Q1", "AccountName": "Quay", "Username": "ola", "Password": "mangrove"}
WHARF = {"AccountType": "IMAPAccount", "uniqueId": "W1", "AccountName": "Wharf", "Username": "mara"}


class Recovering(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, DIRECTORY)

    def file(self, *accounts, version=CURRENT_VERSION):
        path = self.scratch / "copy.plist"
        path.write_bytes(plistlib.dumps({"Version": version, "Accounts": list(accounts)}, sort_keys=False))
        return path

    def recover(self, *words, **more):
        return self.done("recover", *words, **more)

    def assert_left(self, *accounts):
        self.assertEqual({"Accounts": list(accounts), "Version": CURRENT_VERSION}, self.tree.read_plist(SETTINGS))

    def refused(self, *words):
        """The message of a recovery that changes nothing."""
        before = self.standing()
        run = self.accountctl("recover", *words)
        self.assertEqual(([], 1), (run.output, len(run.errors)))
        self.assertNotEqual(0, run.status)
        self.assert_unchanged(before)
        return run.errors[0]


class Records(Recovering):
    def test_come_back_with_all_their_keys_and_credentials(self):
        self.assertEqual(["brought back: Accounts[1], W1 (Work)"], self.recover(self.file(HOME_MAIL, WORK), "W1"))
        self.assert_left(HOME_MAIL, DIRECTORY, WORK)
        self.assertEqual(list(WORK), list(self.accounts()[2]))

    def test_come_back_all_where_none_is_named(self):
        other = changed(WORK, **{"Identifier": "W2", "Sync Identifier": "S-W2", "Hostname": "other.example"})
        lines = self.recover(self.file(WORK, HOME_MAIL, other))
        self.assert_left(HOME_MAIL, DIRECTORY, WORK, other)
        self.assertEqual("already there: Accounts[1], M1 (Home): it is there as M1 (Home), with the same identifier", lines[1])

    def test_are_not_doubled_whatever_tells_that_they_are_there(self):
        self.put(WORK)
        for more, why in (
            ({}, "identifier"),
            ({"Identifier": "X"}, "sync identifier"),
            ({"Identifier": "S-W1", "Sync Identifier": "S-X"}, "identifier to sync by"),
            ({"Identifier": "X", "Sync Identifier": "S-X"}, "user name and server"),
            ({"Identifier": "X", "Sync Identifier": "S-X", "Type": "Gmail"}, "user name and server"),
        ):
            (line,) = self.recover(self.file(changed(WORK, **more)))
            self.assertTrue(line.endswith(f": it is there as W1 (Work), with the same {why}"), line)
            self.assert_left(WORK)

    def test_are_not_doubled_within_one_file_either(self):
        self.recover(self.file(WORK, changed(WORK, Identifier="W2")))
        self.assert_left(HOME_MAIL, DIRECTORY, WORK)

    def test_that_would_be_dropped_come_back_repaired(self):
        copy = self.file(PIGEON)
        why = "the next load would drop it: its class is unknown and no directory tells a better one"
        message = f"accountctl: Accounts[0], W1 (Work) cannot be brought back: {why}; --set KEY=VALUE repairs it"
        self.assertEqual(message, self.refused(copy, "W1"))
        self.recover(copy, "Accounts[0]", "--set", "Class=IMAPAccount", "--set", "DisplayName=Again")
        self.assert_left(HOME_MAIL, DIRECTORY, changed(WORK, DisplayName="Again"))

    def test_that_would_be_dropped_stay_behind_the_others_and_are_told(self):
        run = self.accountctl("recover", self.file(changed(PIGEON, Identifier="P1"), WORK))
        self.assertEqual(1, run.status)
        self.assertTrue(run.output[0].startswith("left: Accounts[0], P1 (Work): the next load would drop it"), run.output)
        self.assert_left(HOME_MAIL, DIRECTORY, WORK)

    def test_whose_identifier_another_account_has_come_back_under_a_new_one(self):
        taken = changed(WORK, Identifier="M1")
        copy = self.file(taken)
        self.assertIn("another account that is there, M1 (Home), has its identifier", self.refused(copy, "M1"))
        self.recover(copy, "M1", "--set", "Identifier:=null")
        back = self.accounts()[2]
        self.assertEqual({**taken, "Identifier": back["Identifier"]}, back)
        self.assertNotEqual("M1", back["Identifier"])

    def test_bring_their_children(self):
        self.recover(self.file(CLOUD), "Cirrant")
        self.assert_left(HOME_MAIL, DIRECTORY, CLOUD)

    def test_leave_a_child_that_has_found_another_parent(self):
        calendar, mail = CLOUD["ChildAccounts"]
        other = changed(CLOUD, Identifier="V2", DisplayName="Other", ChildAccounts=[changed(calendar, ParentID="V2")])
        self.put(other)
        (line,) = self.recover(self.file(CLOUD))
        self.assertEqual("brought back: Accounts[0], V1 (Cirrant): without C1, which is there already", line)
        self.assert_left(other, changed(CLOUD, ChildAccounts=[mail]))

    def test_of_children_come_back_into_their_parent(self):
        self.put(changed(CLOUD, ChildAccounts=CLOUD["ChildAccounts"][:1]))
        self.recover(self.file(CLOUD))
        self.assert_left(CLOUD)

    def test_of_children_need_their_parent(self):
        message = self.refused(self.file(CLOUD), "K1")
        self.assertIn("the account that it belongs to, V1, is not there", message)

    def test_of_an_earlier_release_are_named_and_told(self):
        copy = self.file(HOME_MAIL, WORK, version=7)
        self.assertTrue(self.refused(copy).endswith("name what is to come back of: Accounts[1], W1 (Work)"))
        (line,) = self.recover(copy, "W1")
        self.assertIn("what a migration from data version 7 does to such an account was not done", line)
        self.assert_left(HOME_MAIL, DIRECTORY, WORK)

    def test_come_back_from_a_device_and_from_a_snapshot(self):
        self.put(HOME_MAIL, WORK, version=11)
        snapshots = self.scratch / "snapshots"
        self.assertEqual(0, self.tree.migrate(HOST, "--snapshots", snapshots).status)
        for words in (["latest", "--snapshots", snapshots], [next(snapshots.glob("0*"))]):
            self.done("remove", "W1")
            self.recover(*words, "W1")
            self.assert_left(HOME_MAIL, WORK)

    def test_are_told_for_machines(self):
        report = json.loads("\n".join(self.done("--json", "recover", self.file(WORK, HOME_MAIL))))
        outcomes = [(each["outcome"], each["identifier"]) for each in report["accounts"]]
        self.assertEqual((1, False, [("recovered", "W1"), ("present", "M1")]), (report["schema"], report["dryRun"], outcomes))

    def test_are_rehearsed_without_a_trace(self):
        before = self.tree.entries(with_lock=True)
        self.assertEqual(["would bring back: Accounts[0], W1 (Work)"], self.recover("--dry-run", self.file(WORK)))
        self.assertEqual(before, self.tree.entries(with_lock=True))

    def test_wait_until_the_device_is_migrated(self):
        self.put(HOME_MAIL, version=7)
        self.assertIn("must be migrated before they are changed", self.refused(self.file(WORK)))

    def test_are_repaired_only_where_they_are_named(self):
        self.assert_refused(2, "--set is for accounts that are named", "recover", self.file(WORK), "--set", "Class=A")


class FilesOfTheFirstReleases(Recovering):
    def setUp(self):
        super().setUp()
        self.tree.path(SETTINGS).unlink()
        self.copy = self.scratch / "Accounts.plist"

    def write(self, *descriptions):
        self.copy.write_bytes(plistlib.dumps({"MailAccounts": list(descriptions), "LastMailbox": "INBOX"}))
        return self.copy

    def test_come_back_whole_and_the_next_migration_converts_them(self):
        (line,) = self.recover(self.write(WHARF))
        place = self.tree.path(LEGACY_MAIL)
        self.assertEqual(f"brought back: {place}, with 1 accounts; the next migration converts them", line)
        self.assertEqual(plistlib.loads(self.copy.read_bytes()), self.tree.read_plist(LEGACY_MAIL))
        self.assertEqual((0o600, os.getuid()), (stat.S_IMODE(place.stat().st_mode), place.stat().st_uid))
        self.tree.migrate(HOST)
        self.assertIn(("W1", "Wharf"), [(each["Identifier"], each.get("DisplayName")) for each in self.accounts()])

    def test_come_back_repaired_in_the_words_of_either_release(self):
        self.write(WHARF, NO_CLASS)
        self.assertIn("MailAccounts[1], Q1 (Quay): its description has no class", self.refused(self.copy))
        for setting in ("Class=POPAccount", "AccountType=POPAccount"):
            self.recover(self.copy, "Quay", "--set", setting)
            self.assertEqual({**NO_CLASS, "AccountType": "POPAccount"}, self.tree.read_plist(LEGACY_MAIL)["MailAccounts"][1])
            self.tree.path(LEGACY_MAIL).unlink()

    def test_that_hold_exchange_accounts_come_back_to_their_own_place(self):
        contents = {"DAAccountsKey": [{"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": "E1"}]}
        self.copy.write_bytes(plistlib.dumps(contents))
        self.recover(self.copy)
        self.assertEqual(contents, self.tree.read_plist(LEGACY_EXCHANGE))

    def test_take_the_place_of_settings_without_accounts(self):
        self.put()
        self.recover(self.write(WHARF))
        self.assertFalse(self.tree.path(SETTINGS).exists())

    def test_do_not_come_beside_migrated_accounts(self):
        self.put(DIRECTORY)
        self.assertIn("go back first (migration-host --undo)", self.refused(self.write(WHARF)))

    def test_do_not_come_beside_migrated_records_that_cannot_be_loaded(self):
        self.put(PIGEON)
        self.assertIn("the device has migrated accounts", self.refused(self.write(WHARF)))

    def test_do_not_take_the_place_of_another(self):
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": [NO_CLASS]})
        self.assertIn("another file stands there", self.refused(self.write(WHARF)))

    def test_are_repaired_where_they_stand(self):
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": [NO_CLASS]})
        self.recover(self.tree.path(LEGACY_MAIL), "Q1", "--set", "Class=POPAccount")
        self.assertEqual("POPAccount", self.tree.read_plist(LEGACY_MAIL)["MailAccounts"][0]["AccountType"])

    def test_do_not_come_where_a_migration_would_delete_them(self):
        self.tree.write(PREFERENCES + "/.removingOldAccounts", "")
        self.assertIn("run it first", self.refused(self.write(WHARF)))

    def test_are_rehearsed_without_a_trace(self):
        before = self.tree.entries(with_lock=True)
        self.assertIn("would bring back: ", self.recover("--dry-run", self.write(WHARF))[0])
        self.assertEqual(before, self.tree.entries(with_lock=True))


if __name__ == "__main__":
    unittest.main()
