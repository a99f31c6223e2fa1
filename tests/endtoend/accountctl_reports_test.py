"""What accountctl prints: tables for people, JSON for machines, and never a credential."""

import json
import plistlib
import unittest

from accountctl_case import CLOUD, CONTACTS, DIRECTORY, HOME_MAIL, MAIL, NOTES, RESOURCES, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS

SECRET = "vy8-Quince"


class Lists(AccountctlTest):
    def test_accounts_as_a_table_children_below_their_parents(self):
        self.put(HOME_MAIL, CLOUD, DIRECTORY)
        self.assertEqual(
            [
                "IDENTIFIER  TYPE           CLASS                NAME       USER  ENABLED",
                "M1          Mail           IMAPAccount          Home       ines  Mail, Notes",
                "V1          VorlixAccount  KQAccount            Cirrant          Contacts",
                "  C1        CalDAV         MobileCalDAVAccount  Cirrant    ines  Contacts",
                "  K1        KeldorIMAP     KeldorIMAPAccount    Cirrant          Contacts",
                "L1          LDAP           LDAPAccount          (no name)",
            ],
            self.done("list"),
        )

    def test_accounts_for_machines(self):
        self.put(HOME_MAIL, CLOUD)
        listed = json.loads("\n".join(self.done("list", "--json")))
        self.assertEqual(["version", "accounts"], list(listed))
        self.assertEqual(CURRENT_VERSION, listed["version"])
        self.assertEqual(
            {
                "identifier": "M1",
                "type": "Mail",
                "class": "IMAPAccount",
                "name": "Home",
                "user": "ines",
                "host": "imap.example.com",
                "parent": None,
                "enabled": [MAIL, NOTES],
                "supported": [MAIL, NOTES],
                "children": [],
            },
            listed["accounts"][0],
        )
        children = listed["accounts"][1]["children"]
        self.assertEqual([("C1", "V1"), ("K1", "V1")], [(each["identifier"], each["parent"]) for each in children])

    def test_an_account_without_a_list_of_data_classes_apart_from_one_with_an_empty_list(self):
        self.put(DIRECTORY, changed(HOME_MAIL, **{"Enabled Dataclasses": []}))
        listed = json.loads("\n".join(self.done("list", "--json")))
        self.assertEqual([None, []], [each["enabled"] for each in listed["accounts"]])

    def test_nothing_on_a_device_without_accounts(self):
        run = self.accountctl("list")
        told = f"accountctl: the device has no settings file: {self.tree.path(SETTINGS)}"
        self.assertEqual((0, ["IDENTIFIER  TYPE  CLASS  NAME  USER  ENABLED"], [told]), (run.status, run.output, run.errors))
        self.assertEqual({"version": 0, "accounts": []}, json.loads("\n".join(self.done("list", "--json"))))
        self.assertFalse(self.tree.path(SETTINGS).exists())

    def test_the_accounts_of_an_earlier_release(self):
        self.put(HOME_MAIL, version=3)
        self.assertEqual(3, json.loads("\n".join(self.done("list", "--json")))["version"])

    def test_columns_by_what_is_seen_of_a_name(self):
        names = ["Öre", "Cafe\u0301", "日本", "plain", "\U0001f680", "\U0001f468\u200d\U0001f469\u200d\U0001f467",
                 "\U0001f1e9\U0001f1ea", "ก็ดี", "नमस्ते"]
        self.put(*(changed(HOME_MAIL, Identifier=str(index), DisplayName=name) for index, name in enumerate(names)))
        self.assertEqual(
            [
                "NAME   ENABLED",
                "Öre    Mail, Notes",
                "Cafe\u0301   Mail, Notes",
                "日本   Mail, Notes",
                "plain  Mail, Notes",
                "\U0001f680     Mail, Notes",
                "\U0001f468\u200d\U0001f469\u200d\U0001f467     Mail, Notes",
                "\U0001f1e9\U0001f1ea     Mail, Notes",
                "ก็ดี     Mail, Notes",
                "नमस्ते   Mail, Notes",
            ],
            self.done("list", "--columns", "name,enabled"),
        )

    def test_names_that_would_steer_a_terminal_or_break_the_line_as_they_are_harmless(self):
        self.put(changed(HOME_MAIL, DisplayName="a\nb\x1b[31m\u202ec"))
        self.assertEqual("M1          a\ufffdb\ufffd[31m\ufffdc", self.done("list", "--columns=identifier,name")[1])

    def test_the_columns_that_are_asked_for(self):
        self.put(HOME_MAIL, CLOUD)
        self.assertEqual(
            [
                "USER    HOST              IDENTIFIER",
                "ines    imap.example.com  M1",
                "                          V1",
                "  ines                    C1",
                "                          K1",
            ],
            self.done("list", "--columns=user,Host,identifier"),
        )

    def test_on_a_device_with_files_of_the_first_releases_alone_a_word_on_them(self):
        self.tree.write_plist(LEGACY_MAIL, {"Accounts": []})
        run = self.accountctl("list")
        told = "accountctl: the device has account files of the first releases alone; a migration converts them"
        self.assertEqual((0, [told]), (run.status, run.errors))
        self.put(HOME_MAIL)
        self.assertEqual([], self.accountctl("list").errors)

    def test_on_what_is_not_in_the_list_a_word(self):
        self.put()
        self.assertEqual([f"accountctl: the settings file has no accounts: {self.tree.path(SETTINGS)}"],
                         self.accountctl("list").errors)
        self.put(HOME_MAIL, changed(DIRECTORY, Type="Post"), 7)
        self.assertEqual(["accountctl: 2 records of the settings file cannot be loaded; accountctl verify tells why"],
                         self.accountctl("list").errors)


class Shows(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)

    def test_an_account_with_its_properties(self):
        self.assertEqual(
            [
                "Identifier  M1",
                "Type        Mail",
                "Class       IMAPAccount",
                "Name        Home",
                "Enabled     Mail, Notes",
                "Supported   Mail, Notes",
                "Properties",
                "  Type                 Mail",
                "  Class                IMAPAccount",
                "  Identifier           M1",
                "  DisplayName          Home",
                "  Username             ines",
                "  Hostname             imap.example.com",
                f'  Enabled Dataclasses  ("{MAIL}", "{NOTES}")',
                "  Unknown              {Kept = (1, true, 2.5, <data: 2 bytes>)}",
            ],
            self.done("show", "M1"),
        )

    def test_an_account_for_machines(self):
        shown = json.loads("\n".join(self.done("show", "M1", "--json")))
        self.assertIsNone(shown["service"])
        kept = {"Kept": [1, True, 2.5, "<data: 2 bytes>"]}
        self.assertEqual(changed(HOME_MAIL, Unknown=kept), shown["properties"])

    def test_integers_of_any_size(self):
        self.put(changed(DIRECTORY, Largest=2**64 - 1, Smallest=-(2**63)))
        properties = json.loads("\n".join(self.done("show", "L1", "--json")))["properties"]
        self.assertEqual((2**64 - 1, -(2**63)), (properties["Largest"], properties["Smallest"]))

    def test_a_parent_with_its_children(self):
        shown = self.done("show", "V1")
        self.assertIn("Child       C1", shown)
        self.assertIn("Child       K1", shown)
        self.assertNotIn("ines", "\n".join(shown))

    def test_a_child_with_its_parent(self):
        shown = self.done("show", "C1")
        self.assertIn("Parent      V1", shown)
        self.assertIn("  Username    ines", shown)

    def test_that_an_account_has_no_name(self):
        self.assertIn("Name        (no name)", self.done("show", "L1"))
        self.assertIsNone(json.loads("\n".join(self.done("show", "L1", "--json")))["name"])

    def test_that_an_account_has_no_list_of_data_classes(self):
        self.assertIn("Enabled     (no list)", self.done("show", "L1"))


class Types(AccountctlTest):
    def test_of_accounts_with_what_each_supports(self):
        shipped = plistlib.loads((RESOURCES / "AccountTypesProperties.plist").read_bytes())
        expected = [{"type": name, "supported": type["Supported Dataclasses"]} for name, type in shipped.items()]
        self.assertEqual({"types": expected}, json.loads("\n".join(self.done("types", "--json"))))

    def test_as_a_table(self):
        lines = self.done("types")
        self.assertEqual("TYPE                 DATA CLASSES", lines[0])
        self.assertIn("CalDAV               Calendars, Reminders", lines)
        self.assertIn("SMTP", lines)


class Credentials(AccountctlTest):
    def setUp(self):
        super().setUp()
        secrets = {
            "Password": SECRET,
            "OAuthToken": {"value": SECRET},
            "Session": [{"refresh_token": SECRET, "Kind": "bearer"}],
            "Opaque": SECRET.encode(),
        }
        child = changed(CLOUD["ChildAccounts"][0], **secrets)
        self.put(changed(HOME_MAIL, **secrets), changed(CLOUD, ChildAccounts=[child]))

    def assert_not_told(self, *words):
        run = self.accountctl(*words)
        told = "\n".join(run.output + run.errors)
        self.assertNotIn(SECRET, told)
        return told

    def test_are_told_only_to_be_there(self):
        told = self.assert_not_told("show", "M1")
        self.assertIn("  Password             <hidden>", told)
        self.assertIn("  OAuthToken           <hidden>", told)
        self.assertRegex(told, "\n  Session +<hidden>\n")
        self.assertIn("  Opaque               <data: 10 bytes>", told)

    def test_are_hidden_from_machines_too(self):
        properties = json.loads(self.assert_not_told("--json", "show", "M1"))["properties"]
        self.assertEqual("<hidden>", properties["Password"])
        self.assertEqual("<hidden>", properties["Session"])

    def test_are_told_by_no_command(self):
        for words in (
            ["list"], ["list", "--json"], ["show", "V1"], ["show", "V1", "--json"], ["show", "C1"],
            ["enable", "C1", "Calendars", "--json"], ["disable", "M1", "Notes", "--json"],
            ["rename", "M1", "Work", "--json"], ["save", "--json"], ["remove", "M1", "--json"],
        ):
            with self.subTest(words=words):
                self.assert_not_told(*words)

    def test_are_not_repeated_from_a_command_line_at_fault(self):
        for word in (f"Password:={SECRET}", f"Password{SECRET}", f"={SECRET}"):
            with self.subTest(word=word):
                self.assertIn("property 1", self.assert_not_told("add", "Mail", "IMAPAccount", word))
        self.assert_not_told("add", "Mail", "IMAPAccount", f"Password={SECRET}", "--json")


if __name__ == "__main__":
    unittest.main()
