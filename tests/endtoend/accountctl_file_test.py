"""What accountctl tells of files that are not the device's own: copies, snapshots, other devices, the first releases'."""

import hashlib
import json
import plistlib
import shutil
import unittest

from accountctl_case import CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, Device
from device_case import HOST

UNKNOWN_TYPE = {"Type": "Telegraph", "Class": "T", "Identifier": "T1", "Username": "ines"}
UNKNOWN_CLASS = changed(HOME_MAIL, Class="Pigeon", Identifier="P1", DisplayName="Pigeon post")
NO_CLASS = {"uniqueId": "W1", "AccountName": "Wharf", "Hostname": "imap.wharf.example"}
WITH_CLASS = {"AccountType": "IMAPAccount", "uniqueId": "Q1", "AccountName": "Quay", "Username": "ola"}


class Files(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL)
        self.copy = self.scratch / "copy.plist"

    def write(self, *accounts, version=CURRENT_VERSION):
        self.copy.write_bytes(plistlib.dumps({"Version": version, "Accounts": list(accounts)}))
        return self.copy

    def listed(self, place):
        """Each account that is listed, by its place."""
        (listing,) = json.loads("\n".join(self.done("--file", place, "--json", "list")))["files"]
        return {each["place"]: each for each in listing["accounts"]}

    def faults(self, place):
        return {each: found["fault"] for each, found in self.listed(place).items() if found["fault"]}


class ListingAFile(Files):
    def test_tells_what_it_is_and_every_account_in_it(self):
        self.write(HOME_MAIL, CLOUD, version=7)
        head, heading, *rows = self.done("--file", self.copy, "list")
        self.assertEqual(f"{self.copy}: settings file, data version 7", head)
        self.assertEqual("PLACE IDENTIFIER TYPE CLASS NAME USER FAULT".split(), heading.split())
        places = ["Accounts[0]", "Accounts[1]", "Accounts[1].ChildAccounts[0]", "Accounts[1].ChildAccounts[1]"]
        self.assertEqual(places, [row.split()[0] for row in rows])

    def test_lists_what_cannot_be_loaded_with_its_fault(self):
        faults = self.faults(self.write(UNKNOWN_TYPE, UNKNOWN_CLASS, HOME_MAIL, "nothing", {"Type": "Mail"}))
        self.assertEqual("its type is unknown", faults["Accounts[0]"])
        self.assertEqual("its class is unknown and no directory tells a better one", faults["Accounts[1]"])
        self.assertEqual("it is no account record", faults["Accounts[3]"])
        self.assertEqual("it has no class", faults["Accounts[4]"])
        self.assertEqual(4, len(faults))

    def test_tells_of_children_that_nobody_finds(self):
        faults = self.faults(self.write(changed(CLOUD, ChildAccounts=[{"Type": "CalDAV"}])))
        self.assertIn("it has no class", faults["Accounts[0].ChildAccounts[0]"])

    def test_tells_which_share_an_identifier(self):
        faults = self.faults(self.write(HOME_MAIL, changed(HOME_MAIL, Username="other")))
        self.assertEqual({"Accounts[1]": "it shares its identifier with Accounts[0]"}, faults)

    def test_shows_no_credential(self):
        self.write(changed(HOME_MAIL, Password="mangrove"), changed(UNKNOWN_TYPE, Password="mangrove"))
        for words in (["list"], ["--json", "list"], ["show", "M1"], ["--json", "show", "Accounts[1]"]):
            self.assertNotIn("mangrove", "\n".join(self.done("--file", self.copy, *words)))

    def test_leaves_everything_as_it_was(self):
        self.write(UNKNOWN_CLASS)
        before = self.tree.entries(with_lock=True)
        self.done("--file", self.copy, "list")
        self.assertEqual(before, self.tree.entries(with_lock=True))

    def test_reads_the_descriptions_of_the_first_releases(self):
        for path in (LEGACY_MAIL, LEGACY_EXCHANGE):
            self.copy.write_bytes(self.example("legacy-files").read(path))
            found = self.listed(self.copy)
            self.assertNotIn(None, [each["identifier"] for each in found.values()])
            self.assertNotIn(None, [each["class"] for each in found.values()])

    def test_refuses_what_is_no_file_of_accounts(self):
        self.copy.write_bytes(plistlib.dumps({"Bookmarks": []}))
        self.assert_refused(1, f"this is no file of accounts: {self.copy}", "--file", self.copy, "list")

    def test_says_why_a_file_cannot_be_read(self):
        self.copy.write_bytes(self.write(HOME_MAIL).read_bytes()[:40])
        run = self.accountctl("--file", self.copy, "list")
        self.assertEqual((1, []), (run.status, run.output))
        self.assertIn(f"accountctl: the file cannot be read: {self.copy}: ", run.errors[0])


class ShowingAnAccountOfAFile(Files):
    def test_finds_it_by_place_identifier_name_and_user(self):
        self.write(HOME_MAIL, UNKNOWN_CLASS)
        for word in ("Accounts[1]", "P1", "P", "pigeon POST"):
            shown = json.loads("\n".join(self.done("--file", self.copy, "--json", "show", word)))
            self.assertEqual(("Accounts[1]", "Pigeon"), (shown["place"], shown["properties"]["Class"]))

    def test_names_those_that_may_be_meant(self):
        self.write(HOME_MAIL, UNKNOWN_TYPE)
        message = "several accounts are meant by ines: Accounts[0], M1 (Home); Accounts[1], T1"
        self.assert_refused(2, message, "--file", self.copy, "show", "ines")

    def test_tells_of_a_word_that_means_nothing(self):
        self.assert_refused(3, "no account is called X there", "--file", self.write(HOME_MAIL), "show", "X")


class VerifyingAFile(Files):
    def test_tells_what_verify_tells_of_it(self):
        self.write(HOME_MAIL, UNKNOWN_TYPE, version=7)
        run = self.accountctl("--file", self.copy, "verify")
        self.assertEqual((5, self.accountctl("verify", self.copy).output), (run.status, run.output))

    def test_tells_which_description_keeps_a_first_releases_file_from_being_converted(self):
        self.copy.write_bytes(plistlib.dumps({"MailAccounts": [WITH_CLASS, NO_CLASS]}))
        run = self.accountctl("--file", self.copy, "--json", "verify")
        report = json.loads("\n".join(run.output))
        self.assertEqual((5, ["MailAccounts[1]"]), (run.status, [each["place"] for each in report["findings"]]))

    def test_is_told_by_a_real_migration_to_be_true(self):
        for faulty, count in (([WITH_CLASS], 1), ([WITH_CLASS, NO_CLASS], 0)):
            tree = Device(self.scratch / f"device of {len(faulty)}")
            tree.write("etc/passwd", self.tree.read("etc/passwd"))
            tree.write("etc/group", self.tree.read("etc/group"))
            tree.write_plist(LEGACY_MAIL, {"MailAccounts": faulty})
            run = self.accountctl("--file", tree.path(LEGACY_MAIL), "verify")
            tree.migrate(HOST)
            quays = [each for each in tree.read_plist(SETTINGS)["Accounts"] if each["Identifier"] == "Q1"]
            self.assertEqual((0 if count else 5, count), (run.status, len(quays)))


class SnapshotsAndDevices(Files):
    def setUp(self):
        super().setUp()
        self.put(changed(HOME_MAIL, Password="mangrove"), DIRECTORY, version=7)
        self.snapshots = self.scratch / "snapshots"
        self.assertEqual(0, self.tree.migrate(HOST, "--snapshots", self.snapshots).status)
        (self.snapshot,) = self.snapshots.glob("000001-*")

    def test_are_found_by_path_and_a_snapshot_by_its_identifier(self):
        words = [[self.snapshot], [self.tree.root]]
        words += [[word, "--snapshots", self.snapshots] for word in ("latest", "000001", self.snapshot.name)]
        for place in words:
            (listing,) = json.loads("\n".join(self.done("--json", "list", "--file", *place)))["files"]
            self.assertEqual(["M1", "L1"], [each["identifier"] for each in listing["accounts"]])

    def test_snapshots_are_looked_for_where_the_device_has_them(self):
        usual = self.tree.path("var/lib/account-settings/snapshots")
        shutil.copytree(self.snapshots, usual)
        self.assertIn("data version 7", self.done("--file", "latest", "list")[0])

    def test_an_unknown_one_is_told(self):
        message = f"there is no file 000009, and none among the snapshots in {self.snapshots} is called so"
        self.assert_refused(2, message, "--file", "000009", "--snapshots", self.snapshots, "list")

    def test_a_copy_that_is_damaged_is_not_believed(self):
        copy = self.snapshot / "1"
        copy.write_bytes(copy.read_bytes().replace(b"mangrove", b"mangrave"))
        self.assert_refused(1, f"the snapshot is damaged: {copy}", "--file", self.snapshot, "list")

    def test_a_manifest_that_is_damaged_is_not_believed(self):
        manifest = self.snapshot / "manifest"
        manifest.write_bytes(manifest.read_bytes().replace(b'"part":"settings"', b'"part":"sentinel"'))
        self.assert_refused(1, f"the snapshot is damaged: {manifest}", "--file", self.snapshot, "list")

    def test_a_copy_outside_of_the_snapshot_is_not_read(self):
        manifest = self.snapshot / "manifest"
        contents = json.loads(manifest.read_text())["manifest"]
        next(each for each in contents["files"] if each["state"] == "file")["copy"] = "../elsewhere"
        text = json.dumps(contents, separators=(",", ":"), ensure_ascii=False)
        sum_of_it = hashlib.sha256(text.encode()).hexdigest()
        manifest.write_text(f'{{"manifest":{text},"sha256":"{sum_of_it}"}}\n')
        self.assert_refused(1, f"the snapshot is damaged: {manifest}", "--file", self.snapshot, "list")


class WhatMakesNoSense(Files):
    def test_is_refused(self):
        for message, words in (
            ("--file is for list, show and verify", ["--file", "x", "rename", "M1", "Work"]),
            ("--set is for recover", ["--set", "A=B", "list"]),
            ("--dry-run is for commands that change accounts", ["--dry-run", "list"]),
        ):
            self.assert_refused(2, message + " (see --help)", *words)
        self.assert_refused(2, "--file says already what is to be verified", "--file", "x", "verify", "y")


if __name__ == "__main__":
    unittest.main()
