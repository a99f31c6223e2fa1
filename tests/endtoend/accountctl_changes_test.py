"""What accountctl makes of the accounts: exactly the change that was asked for, and nothing else."""

import json
import os
import stat
import unittest

from accountctl_case import (
    CALENDARS, CLOUD, CONTACTS, DIRECTORY, HOME_MAIL, MAIL, NOTES, AccountctlTest, changed,
)
from device import CURRENT_VERSION, SETTINGS, TEMPORARY

IDENTIFIER = r"^[0-9A-F]{8}-[0-9A-F]{4}-[0-9A-F]{4}-[0-9A-F]{4}-[0-9A-F]{12}$"


class Changes(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)

    def assert_left(self, *accounts):
        self.assertEqual({"Accounts": list(accounts), "Version": CURRENT_VERSION}, self.tree.read_plist(SETTINGS))

    def cloud_with(self, place, **more):
        children = list(CLOUD["ChildAccounts"])
        children[place] = changed(children[place], **more)
        return changed(CLOUD, ChildAccounts=children)

    def test_disabling_takes_a_data_class_out(self):
        self.assertEqual([], self.done("disable", "M1", "Notes"))
        self.assert_left(changed(HOME_MAIL, **{"Enabled Dataclasses": [MAIL]}), CLOUD, DIRECTORY)

    def test_enabling_puts_a_data_class_in_by_its_whole_name_too(self):
        self.done("enable", "V1", CALENDARS)
        self.assert_left(HOME_MAIL, changed(CLOUD, **{"Enabled Dataclasses": [CONTACTS, CALENDARS]}), DIRECTORY)

    def test_enabling_what_is_enabled_changes_nothing(self):
        self.done("enable", "M1", "Mail")
        self.assert_left(HOME_MAIL, CLOUD, DIRECTORY)

    def test_switching_a_childs_data_class_changes_the_child_inside_its_parent(self):
        self.done("enable", "C1", "Calendars")
        self.assert_left(HOME_MAIL, self.cloud_with(0, **{"Enabled Dataclasses": [CALENDARS]}), DIRECTORY)

    def test_renaming(self):
        self.assertEqual([], self.done("rename", "M1", "Büro & Heim"))
        self.assert_left(changed(HOME_MAIL, DisplayName="Büro & Heim"), CLOUD, DIRECTORY)

    def test_renaming_to_a_name_like_an_option(self):
        self.done("rename", "M1", "--", "--json")
        self.assert_left(changed(HOME_MAIL, DisplayName="--json"), CLOUD, DIRECTORY)

    def test_renaming_a_child(self):
        self.done("rename", "K1", "Post")
        self.assert_left(HOME_MAIL, self.cloud_with(1, DisplayName="Post"), DIRECTORY)

    def test_adding_prints_the_new_identifier(self):
        (identifier,) = self.done(
            "add", "Mail", "IMAPAccount", "Username=ines", "Empty=", "Equation=a=b", "PortNumber:=1993",
            "SSLEnabled:=false", 'Extension:={"a": [1, -2, 2.5, "x", {}], "b": true}',
        )
        self.assertRegex(identifier, IDENTIFIER)
        added = {
            "Type": "Mail",
            "Class": "IMAPAccount",
            "Identifier": identifier,
            "Sync Identifier": identifier,
            "Username": "ines",
            "Empty": "",
            "Equation": "a=b",
            "PortNumber": 1993,
            "SSLEnabled": False,
            "Extension": {"a": [1, -2, 2.5, "x", {}], "b": True},
        }
        self.assert_left(HOME_MAIL, CLOUD, DIRECTORY, added)

    def test_adding_under_a_given_identifier(self):
        self.assertEqual(["L2"], self.done("add", "LDAP", "LDAPAccount", "Identifier=L2"))
        self.assert_left(HOME_MAIL, CLOUD, DIRECTORY, {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L2"})

    def test_adding_to_a_device_without_accounts(self):
        self.tree.path(SETTINGS).unlink()
        self.done("add", "LDAP", "LDAPAccount", "Identifier=L1")
        self.assertEqual(["L1"], [each["Identifier"] for each in self.accounts()])

    def test_removing_an_account_with_its_children(self):
        self.assertEqual([], self.done("remove", "V1"))
        self.assert_left(HOME_MAIL, DIRECTORY)

    def test_removing_a_child(self):
        self.done("remove", "C1")
        self.assert_left(HOME_MAIL, changed(CLOUD, ChildAccounts=CLOUD["ChildAccounts"][1:]), DIRECTORY)

    def test_removing_every_record_under_the_identifier(self):
        self.put(HOME_MAIL, DIRECTORY, changed(HOME_MAIL, DisplayName="Again"))
        self.done("remove", "M1")
        self.assert_left(DIRECTORY)

    def test_saving_keeps_every_value_and_the_order(self):
        before = self.tree.read_plist(SETTINGS)
        self.assertEqual([], self.done("save"))
        self.assertEqual(before, self.tree.read_plist(SETTINGS))
        self.assertEqual(list(HOME_MAIL), list(self.accounts()[0]))

    def test_saving_repairs_what_needs_it(self):
        self.put(changed(HOME_MAIL, Class="MailAccount", AccountPath="~/Library/Mail/IMAP-ines@imap.example.com"))
        self.done("save")
        self.assertEqual("IMAPAccount", self.accounts()[0]["Class"])

    def test_the_file_is_the_mobile_users_alone(self):
        self.done("rename", "M1", "Work")
        status = self.tree.path(SETTINGS).stat()
        self.assertEqual((0o600, os.getuid()), (stat.S_IMODE(status.st_mode), status.st_uid))

    def test_no_temporary_file_stays(self):
        self.done("rename", "M1", "Work")
        self.assertEqual([], os.listdir(self.tree.path(TEMPORARY)))
        self.assertEqual([self.tree.path(SETTINGS).name], os.listdir(self.tree.path(SETTINGS).parent))


class AnswersForMachines(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD)

    def answer(self, *words):
        return json.loads("\n".join(self.done("--json", *words)))

    def test_tell_of_the_account_as_it_is_now(self):
        self.assertEqual([MAIL], self.answer("disable", "M1", "Notes")["account"]["enabled"])
        self.assertEqual([MAIL, NOTES], self.answer("enable", "M1", "Notes")["account"]["enabled"])
        self.assertEqual("Work", self.answer("rename", "M1", "Work")["account"]["name"])

    def test_tell_of_the_new_account(self):
        self.assertRegex(self.answer("add", "LDAP", "LDAPAccount")["account"]["identifier"], IDENTIFIER)

    def test_tell_what_is_gone_and_how_many_were_saved(self):
        self.assertEqual({"removed": "M1"}, self.answer("remove", "M1"))
        self.assertEqual({"saved": 1}, self.answer("save"))


if __name__ == "__main__":
    unittest.main()
