"""What `accountctl verify` finds in a settings file, and that a migration then does what it said."""

import json
import unittest

from accountctl_case import CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from device_case import HOST
from failed_saves_test import CAP_DAC_OVERRIDE, without_capabilities

CLEAN, FAILED, WRONG_USE, FINDINGS = 0, 1, 2, 5
CAP_DAC_READ_SEARCH = 2
MISNAMED = changed(HOME_MAIL, Class="MailAccount", AccountPath="~/Library/Mail/IMAP-ines@imap.example.com")
CHILD = CLOUD["ChildAccounts"][0]


def without(account, *keys):
    return {key: value for key, value in account.items() if key not in keys}


class VerifyTest(AccountctlTest):
    def found(self, *words):
        """The findings, each as its kind, place and identifier; what is verified stays as it is."""
        self.close_to_others()
        before = self.standing()
        run = self.accountctl("verify", "--json", *words)
        self.assert_unchanged(before)
        self.report = json.loads("\n".join(run.output))
        findings = self.report["findings"]
        self.assertEqual((FINDINGS if findings else CLEAN, []), (run.status, run.errors))
        self.said = [each["migration"] for each in findings]
        self.commands = [each["command"] for each in findings]
        return [(each["kind"], each["place"], each["identifier"]) for each in findings]

    def close_to_others(self):
        """The files as a save leaves them; that they may be read by others is a finding of its own."""
        for path in map(self.tree.path, (SETTINGS, LEGACY_EXCHANGE, LEGACY_MAIL)):
            if path.is_file() and not path.is_symlink():
                path.chmod(0o600)

    def migrated(self):
        self.assertEqual(0, self.tree.migrate(HOST).status)
        return self.tree.read_plist(SETTINGS)


    def assert_kept(self, why):
        """That what the run kept of the settings is told of, until it is taken away as is advised."""
        kept = self.tree.path(f"{SETTINGS_COPY}.{why}-1")
        self.assertIn(("kept-copy", None, None), self.found())
        self.assertTrue(self.commands[-1].endswith(f"verify {kept}"), self.commands)
        kept.unlink()


class Clean(VerifyTest):
    def test_is_what_a_save_of_this_release_leaves(self):
        self.put(HOME_MAIL, CLOUD, DIRECTORY)
        self.done("save")
        self.assertEqual([], self.found())
        path = str(self.tree.path(SETTINGS))
        self.assertEqual([{"file": path, "form": "settings", "accounts": 3}], self.report["files"])
        self.assertEqual([f"{self.tree.path(SETTINGS)}: 3 accounts, no findings"], self.done("verify"))

    def test_is_a_device_without_a_settings_file(self):
        self.assertEqual([], self.found())
        self.assertIsNone(self.report["files"][0]["accounts"])
        self.assertEqual([f"{self.tree.path(SETTINGS)}: there is no settings file"], self.done("verify"))

    def test_is_what_every_example_device_has_after_its_migration(self):
        for name in ("first-generation", "legacy-files", "current"):
            with self.subTest(name=name):
                self.tree = self.example(name)
                self.migrated()
                self.assertEqual([], self.found())


class Structure(VerifyTest):
    def test_that_is_no_property_list_of_a_dictionary_costs_every_account(self):
        for content in (b"bplist00 but no more", b"<plist><array/></plist>", b""):
            self.tree.write(SETTINGS, content)
            self.assertEqual([("unreadable", None, None)], self.found())
            self.assertEqual({"Accounts": [], "Version": CURRENT_VERSION}, self.migrated())
            self.assert_kept("unreadable")

    def test_without_accounts(self):
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION})
        self.assertEqual([("no-accounts", "Accounts", None)], self.found())
        self.assertEqual([], self.migrated()["Accounts"])

    def test_with_accounts_of_another_kind_loses_them(self):
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": {"M1": HOME_MAIL}})
        self.assertEqual([("no-accounts", "Accounts", None)], self.found())
        self.assertEqual([], self.migrated()["Accounts"])

    def test_with_further_keys_loses_them(self):
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [], "Owner": "ines"})
        self.assertEqual([("unknown-key", "Owner", None)], self.found())
        self.assertEqual(["Accounts", "Version"], sorted(self.migrated()))


class Versions(VerifyTest):
    UMBRELLA = {"Type": "Mail", "Class": "GmailAccount", "Identifier": "G1", "DisplayName": "Gmail"}

    def assert_version(self, kinds, is_upgraded, **root):
        self.tree.write_plist(SETTINGS, {"Accounts": [self.UMBRELLA], **root})
        self.assertEqual([(kind, "Version", None) for kind in kinds], self.found())
        migrated = self.migrated()
        self.assertEqual((CURRENT_VERSION, is_upgraded), (migrated["Version"], migrated["Accounts"] != [self.UMBRELLA]))

    def test_older(self):
        for version in (0, 1):
            self.assert_version(["version-older"], True, Version=version)
        self.assertEqual([f"a migration upgrades the accounts from there to {CURRENT_VERSION}"], self.said)

    def test_newer(self):
        for version in (CURRENT_VERSION + 1, 2**40, -1, 2**64 - 1):
            self.assert_version(["version-newer"], False, Version=version)
            if version in (CURRENT_VERSION + 1, 2**40):
                self.assert_kept("newer")

    def test_absent_or_no_number(self):
        self.assert_version(["version-absent"], False)
        for version in (True, str(CURRENT_VERSION).encode(), [CURRENT_VERSION], {}):
            self.assert_version(["version-odd"], False, Version=version)

    def test_of_an_odd_kind_that_is_read_as_a_number(self):
        self.assert_version(["version-odd"], False, Version=str(CURRENT_VERSION))
        self.assert_version(["version-odd"], False, Version=CURRENT_VERSION + 0.9)
        self.assert_version(["version-odd", "version-older"], True, Version="1 and a half")

    def test_absent_beside_legacy_files_means_every_step(self):
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": []})
        self.tree.write_plist(SETTINGS, {"Accounts": [self.UMBRELLA]})
        replaced = ("replaced-with-type", "Accounts[0]", "G1")
        self.assertEqual([("version-absent", "Version", None), replaced, ("legacy", None, None)], self.found())
        self.assertIn("unless there are legacy files to convert: then it runs every step", self.said[0])
        self.assertNotEqual([self.UMBRELLA], self.migrated()["Accounts"])


class Records(VerifyTest):
    """Each is what a load makes of it."""

    def records(self, *accounts):
        self.put(*accounts)
        return self.found()

    def test_without_a_known_type_or_a_class_are_dropped(self):
        self.assertEqual(
            [
                ("unknown-type", "Accounts[0]", "M1"),
                ("unknown-type", "Accounts[1]", "M1"),
                ("no-class", "Accounts[1]", "M1"),
                ("no-class", "Accounts[2]", "M1"),
                ("no-record", "Accounts[3]", None),
            ],
            self.records(
                changed(HOME_MAIL, Type="Post"), without(HOME_MAIL, "Type", "Class"), changed(HOME_MAIL, Class=""), "M1"
            ),
        )
        self.assertEqual({"a migration drops the record"}, set(self.said))
        self.assertEqual([], self.migrated()["Accounts"])

    def test_of_mail_with_an_unknown_class_are_repaired_after_their_directory(self):
        self.assertEqual([("repairable-class", "Accounts[0]", "M1")], self.records(MISNAMED))
        self.assertEqual(["a migration sets it to IMAPAccount"], self.said)
        self.assertEqual([changed(MISNAMED, Class="IMAPAccount")], self.migrated()["Accounts"])

    def test_of_mail_with_an_unknown_class_are_else_dropped(self):
        self.assertEqual([("unknown-class", "Accounts[0]", "M1")], self.records(without(MISNAMED, "AccountPath")))
        self.assertEqual(["a migration drops the record"], self.said)
        self.assertEqual([], self.migrated()["Accounts"])

    def test_without_an_identifier_are_given_one(self):
        for record in (without(DIRECTORY, "Identifier"), changed(DIRECTORY, Identifier=7)):
            self.assertEqual([("no-identifier", "Accounts[0]", None)], self.records(record))
            account = self.migrated()["Accounts"][0]
            self.assertRegex(account["Identifier"], "^[0-9A-F-]{36}$")

    def test_with_an_empty_identifier_keep_it(self):
        self.assertEqual([("no-identifier", "Accounts[0]", None)], self.records(changed(DIRECTORY, Identifier="")))
        self.assertEqual(["a migration leaves it so"], self.said)
        self.assertEqual("", self.migrated()["Accounts"][0]["Identifier"])

    def test_that_are_dropped_have_no_say_in_who_shares_an_identifier(self):
        dropped = changed(DIRECTORY, Type="Post")
        self.assertEqual([("unknown-type", "Accounts[1]", "L1")], self.records(DIRECTORY, dropped))

    def test_with_one_identifier_become_the_last_of_them(self):
        other = changed(HOME_MAIL, DisplayName="Other")
        self.assertEqual([("duplicate-identifier", "Accounts[0]", "M1")], self.records(HOME_MAIL, other))
        self.assertEqual([other, other], self.migrated()["Accounts"])

    def test_name_no_credential(self):
        self.put(changed(HOME_MAIL, Class={"Password": "vy8-Quince"}), {"Type": {"Token": "vy8-Quince"}})
        for words in (["verify"], ["verify", "--json"]):
            run = self.accountctl(*words)
            self.assertEqual(FINDINGS, run.status)
            self.assertNotIn("vy8-Quince", "".join(run.output + run.errors))


class Children(VerifyTest):
    def children(self, *children):
        self.parent = changed(CLOUD, ChildAccounts=list(children))
        self.put(self.parent)
        return self.found()

    def assert_kept(self):
        self.assertEqual([self.parent], self.migrated()["Accounts"])

    def test_that_are_no_array_are_left_as_they_are(self):
        self.parent = changed(CLOUD, ChildAccounts="C1")
        self.put(self.parent)
        self.assertEqual([("unreadable-children", "Accounts[0]", "V1")], self.found())
        self.assert_kept()

    def test_that_are_no_records_are_left_as_they_are(self):
        place = "Accounts[0].ChildAccounts"
        self.assertEqual(
            [
                ("unknown-type", f"{place}[0]", "C1"),
                ("no-class", f"{place}[1]", "C1"),
                ("no-record", f"{place}[2]", None),
            ],
            self.children(changed(CHILD, Type="Post"), without(CHILD, "Class"), 7),
        )
        self.assert_kept()

    def test_without_an_identifier_are_given_none_that_lasts(self):
        self.assertEqual(
            [("no-identifier", "Accounts[0].ChildAccounts[0]", None)], self.children(without(CHILD, "Identifier"))
        )
        self.assert_kept()

    def test_of_a_child_are_left_where_they_are(self):
        self.assertEqual(
            [("orphaned-children", "Accounts[0].ChildAccounts[0]", "C1")],
            self.children(changed(CHILD, ChildAccounts=[CHILD])),
        )
        self.assert_kept()

    def test_go_with_a_parent_that_is_dropped(self):
        self.put(changed(CLOUD, Type="Post"), HOME_MAIL)
        self.assertEqual(
            [("unknown-type", "Accounts[0]", "V1"), ("orphaned-children", "Accounts[0]", "V1")], self.found()
        )
        self.assertEqual([HOME_MAIL], self.migrated()["Accounts"])

    def test_share_an_identifier_beside_each_other_and_across_parents(self):
        self.put(changed(CLOUD, ChildAccounts=[CHILD, CHILD]), changed(CLOUD, Identifier="V2", ChildAccounts=[CHILD]))
        self.assertEqual(
            [("duplicate-identifier", f"Accounts[0].ChildAccounts[{index}]", "C1") for index in (0, 1)], self.found()
        )
        self.assertEqual("Accounts[1].ChildAccounts[0] has the same identifier", self.report["findings"][0]["what"])
        self.assertIn("Parent      V2", self.done("show", "C1"))

    def test_share_an_identifier_with_an_account_that_is_then_found_in_their_place(self):
        self.put(changed(DIRECTORY, Identifier="C1"), CLOUD)
        self.assertEqual([("duplicate-identifier", "Accounts[1].ChildAccounts[0]", "C1")], self.found())
        self.assertIn("Type        LDAP", self.done("show", "C1"))


class Report(VerifyTest):
    def test_reads_as_sentences(self):
        self.put(MISNAMED, version=3)
        self.close_to_others()
        run = self.accountctl("verify")
        self.assertEqual(FINDINGS, run.status)
        self.assertEqual(
            [
                f"{self.tree.path(SETTINGS)}: 1 account, 2 findings",
                "Version: the data version is 3",
                f"    a migration upgrades the accounts from there to {CURRENT_VERSION}",
                "    see what it makes of each account before it runs:",
                f"        migration-host --root {self.tree.root} --dry-run --explain",
                "Accounts[0] (M1): Class is MailAccount, which the mail application does not know",
                "    a migration sets it to IMAPAccount",
                "    nothing need be done; every load repairs it, and this for good:",
                f"        accountctl --root {self.tree.root} save",
            ],
            run.output,
        )

    def test_is_of_the_file_that_is_named(self):
        self.put(HOME_MAIL)
        copy = self.scratch / "copy.plist"
        self.tree.write_plist(copy, {"Version": 3, "Accounts": [MISNAMED]})
        copy.chmod(0o644)
        self.assertEqual(["version-older", "repairable-class"], [kind for kind, *_ in self.found(copy)])
        self.assertEqual([{"file": str(copy), "form": "settings", "accounts": 1}], self.report["files"])
        self.assertEqual([], self.found())


class Refusals(VerifyTest):
    def test_of_a_file_that_is_not_there(self):
        nowhere = self.scratch / "nowhere"
        self.assert_refused(1, f"there is no file {nowhere}", "verify", nowhere)

    def test_of_a_file_that_may_not_be_opened(self):
        self.put(HOME_MAIL)
        self.tree.path(SETTINGS).chmod(0)
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": []})
        run = self.accountctl("verify", prepare=without_capabilities(CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH))
        told = f"accountctl: the file cannot be opened: {self.tree.path(SETTINGS)}: Permission denied (errno 13)"
        self.assertEqual((FAILED, [told]), (run.status, run.errors))
        self.assertIn("accounts of the first releases stand in it: 0", run.output)

    def test_of_wrong_use(self):
        self.assert_refused(WRONG_USE, "the file to verify has no name", "verify", "")
        self.assert_refused(WRONG_USE, "usage: accountctl verify [FILE]", "verify", "one", "two")


if __name__ == "__main__":
    unittest.main()
