"""accountctl makes no change that the next load would undo, and tries every change without making it."""

import json
import unittest

from accountctl_case import CLOUD, DIRECTORY, HOME_MAIL, MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, SETTINGS

LOCAL = {"Type": "OnMyDevice", "Class": "DeviceLocalAccount", "Identifier": "DeviceLocalAccount"}
UNKNOWN_CLASS = "the next load would drop it: its class is unknown and no directory tells a better one"


class Changes(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)

    def assert_left(self, *accounts):
        self.assertEqual({"Accounts": list(accounts), "Version": CURRENT_VERSION}, self.tree.read_plist(SETTINGS))

    def test_add_nothing_that_would_be_dropped(self):
        self.assert_refused(2, UNKNOWN_CLASS, "add", "Mail", "Foo")

    def test_add_nothing_that_would_be_repaired(self):
        path = "AccountPath=~/Library/Mail/IMAP-ines@imap.example.com"
        message = "the next load would set Class to IMAPAccount"
        self.assert_refused(2, message, "add", "Mail", "MailAccount", path)

    def test_add_no_child_that_nobody_would_find(self):
        message = "the next load would not find its child 0: it has no class"
        self.assert_refused(2, message, "add", "VorlixAccount", "KQAccount", 'ChildAccounts:=[{"Type": "CalDAV"}]')

    def test_set_properties_and_take_them_away(self):
        self.assertEqual([], self.done("set", "M1", "PortNumber:=993", "Unknown:=null", "Class=POPAccount"))
        expected = changed(HOME_MAIL, PortNumber=993, Class="POPAccount")
        del expected["Unknown"]
        self.assert_left(expected, CLOUD, DIRECTORY)

    def test_set_a_childs_properties_inside_its_parent(self):
        self.done("set", "C1", "Username=ola")
        calendar, mail = CLOUD["ChildAccounts"]
        self.assert_left(HOME_MAIL, changed(CLOUD, ChildAccounts=[changed(calendar, Username="ola"), mail]), DIRECTORY)

    def test_set_nothing_that_would_be_dropped(self):
        self.assert_refused(2, UNKNOWN_CLASS, "set", "M1", "Class=Foo")
        self.assert_refused(2, "the next load would drop it: its type is unknown", "set", "L1", "Type=Telegraph")
        self.assert_refused(2, "the next load would drop it: it has no class", "set", "L1", "Class:=null")
        self.assert_refused(2, "the next load would not find its child 0: it has no class", "set", "C1", "Class=")

    def test_leave_an_account_the_one_that_it_is(self):
        for key in ("Identifier", "ChildAccounts"):
            self.assert_refused(2, f"property 1 sets {key}, which stays as it is", "set", "M1", f"{key}=A")

    def test_do_not_remove_the_devices_own_account(self):
        self.put(LOCAL, HOME_MAIL)
        self.assert_refused(2, "the device's own account cannot be removed", "remove", "DeviceLocalAccount")

    def test_are_tried_without_a_trace(self):
        before = self.tree.entries(with_lock=True)
        for would, words in (
            ("disable Mail of M1 (Home)", ["disable", "M1", "Mail"]),
            ("rename M1 (Home) to Work", ["rename", "M1", "Work"]),
            ("change M1 (Home)", ["set", "M1", "A=B"]),
            ("add L2", ["add", "LDAP", "LDAPAccount", "Identifier=L2"]),
            ("remove V1 (Cirrant)", ["remove", "V1"]),
            ("save 3 accounts", ["save"]),
        ):
            self.assertEqual([f"would {would}"], self.done("--dry-run", *words))
        self.assertEqual(before, self.tree.entries(with_lock=True))

    def test_are_refused_alike_when_they_are_only_tried(self):
        self.assert_refused(2, UNKNOWN_CLASS, "--dry-run", "add", "Mail", "Foo")

    def test_tell_machines_that_they_were_only_tried(self):
        report = json.loads("\n".join(self.done("--json", "--dry-run", "disable", "M1", "Notes")))
        self.assertEqual((True, [MAIL]), (report["dryRun"], report["account"]["enabled"]))
        self.assertNotIn("dryRun", json.loads("\n".join(self.done("--json", "save"))))


if __name__ == "__main__":
    unittest.main()
