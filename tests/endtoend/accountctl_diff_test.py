"""accountctl diff: what became of which account between two files, snapshots or devices."""

import json
import plistlib
import unittest

from accountctl_case import CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, SETTINGS


class Differences(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)

    def file(self, *accounts):
        path = self.scratch / "before.plist"
        path.write_bytes(plistlib.dumps({"Version": CURRENT_VERSION, "Accounts": list(accounts)}))
        return path

    def report(self, *accounts):
        run = self.accountctl("--json", "diff", self.file(*accounts))
        report = json.loads("\n".join(run.output))
        self.assertEqual(report["same"] != 5 or any(report[each] for each in ("removed", "added", "changed")), run.status)
        return report

    def test_there_are_none_between_a_file_and_its_copy(self):
        lines = self.done("diff", self.file(HOME_MAIL, CLOUD, DIRECTORY), self.tree.root)
        self.assertEqual(["0 removed, 0 added, 0 changed, 5 the same"], lines)

    def test_tell_what_was_added_and_removed(self):
        other = changed(DIRECTORY, Identifier="L9")
        report = self.report(HOME_MAIL, CLOUD, other)
        self.assertEqual((["L9"], ["L1"]), tuple([each["identifier"] for each in report[key]] for key in ("removed", "added")))

    def test_tell_each_key_that_changed(self):
        report = self.report(changed(HOME_MAIL, DisplayName="Old", Port=143), CLOUD, DIRECTORY)
        (account,) = report["changed"]
        changes = [(each["key"], each["from"], each["to"]) for each in account["changes"]]
        self.assertEqual(("M1", [("DisplayName", "Old", "Home"), ("Port", 143, None)]), (account["identifier"], changes))

    def test_tell_of_children_as_of_others(self):
        child = changed(CLOUD["ChildAccounts"][0], Username="ola")
        report = self.report(HOME_MAIL, changed(CLOUD, ChildAccounts=[child]), DIRECTORY)
        self.assertEqual(["C1"], [each["identifier"] for each in report["changed"]])
        self.assertEqual(["K1"], [each["identifier"] for each in report["added"]])

    def test_follow_an_account_that_was_given_a_new_identifier(self):
        report = self.report(changed(HOME_MAIL, Identifier="OLD"), CLOUD, DIRECTORY)
        self.assertEqual([["Identifier"]], [[key["key"] for key in each["changes"]] for each in report["changed"]])

    def test_follow_an_account_by_what_it_was_synced_by_and_by_its_class(self):
        self.put(changed(DIRECTORY, **{"Identifier": "NEW", "Sync Identifier": "L1"}), changed(HOME_MAIL, Identifier="NEWER", Type="Gmail"))
        report = self.report(DIRECTORY, HOME_MAIL)
        self.assertEqual(["NEW", "NEWER"], [each["identifier"] for each in report["changed"]])

    def test_tell_two_with_one_identifier_apart(self):
        report = self.report(HOME_MAIL, HOME_MAIL, CLOUD, DIRECTORY)
        self.assertEqual(["Accounts[1]"], [each["place"] for each in report["removed"]])

    def test_show_no_credential(self):
        old = self.file(changed(HOME_MAIL, Password="mangrove", Nested={"token": "mangrove"}), CLOUD, DIRECTORY)
        self.put(changed(HOME_MAIL, Password="tamarisk", Nested={"token": "tamarisk"}), CLOUD, DIRECTORY)
        for words in ([], ["--json"]):
            run = self.accountctl(*words, "diff", old)
            self.assertNotRegex("\n".join(run.output), "mangrove|tamarisk")
        self.assertIn("    Password: <hidden> -> <hidden>", self.accountctl("diff", old).output)

    def test_leave_everything_as_it_was(self):
        before = self.tree.entries(with_lock=True)
        self.accountctl("diff", self.file(HOME_MAIL))
        self.assertEqual(before, self.tree.entries(with_lock=True))

    def test_have_a_status_that_is_not_that_of_trouble(self):
        self.assertEqual(1, self.accountctl("diff", self.file(HOME_MAIL)).status)
        self.tree.write(SETTINGS, b"bplist00")
        run = self.accountctl("diff", self.file(HOME_MAIL))
        self.assertEqual((2, [], 1), (run.status, run.output, len(run.errors)))


if __name__ == "__main__":
    unittest.main()
