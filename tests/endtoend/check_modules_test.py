"""accountctl check-modules: what each entry of AccountCreators is called for, and why one never is."""

import json
import plistlib
import unittest

from accountctl_case import CALENDARS, CONTACTS, MAIL, NOTES, RESOURCES, AccountctlTest
from device_case import PLUGINS

ODD = "usr/lib/odd_module.so"
LISTENS = "Supported Dataclasses"
TYPES = plistlib.loads((RESOURCES / "AccountTypesProperties.plist").read_bytes())
FAILS = {
    "FullAccount": "asking for the full account of such a record ends with an assertion failure",
    "NotifierAccount": "a change of such an account ends with an assertion failure",
}


def entry(kind, class_name="Maker", framework=ODD, **description):
    return {"Type": kind, "Description": {"Framework": framework, "Class": class_name, **description}}


def notifier(class_name="Maker", dataclasses=(MAIL,), **more):
    return entry("NotifierAccount", class_name, **{LISTENS: list(dataclasses)}, **more)


class CheckModules(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.tree.write(ODD, (PLUGINS / "odd_module.so").read_bytes())
        self.file = self.scratch / "creators.plist"

    def run_on(self, creators, *options, **more):
        self.tree.write_plist(self.file, creators)
        return self.accountctl(*options, "check-modules", self.file, **more)

    def check(self, *entries, options=("--modules",), status=None, **more):
        """What is said of these entries for mail accounts, where nothing is said of any other type."""
        run = self.run_on({**{each: [] for each in TYPES}, "Mail": list(entries)}, "--json", *options, **more)
        report = json.loads("\n".join(run.output))
        self.assertEqual(status if status is not None else 5 if report["findings"] else 0, run.status)
        return report

    def assert_found(self, kind, what, effect, *entries, place="Mail[0]", **more):
        report = self.check(*entries, **more)
        (finding,) = report["findings"]
        self.assertEqual((kind, place, effect), (finding["kind"], finding["place"], finding["effect"]))
        self.assertRegex(finding["what"], what)
        called = {each["place"]: each["called"] for each in report["entries"]}
        self.assertIs(False, called[place])

    def test_says_what_each_entry_is_called_for(self):
        report = self.check(entry("FullAccount", "MailMaker"), entry("SyncAccount"), notifier(dataclasses=[MAIL, NOTES]))
        self.assertEqual([], report["findings"])
        self.assertEqual([True, True, True], [each["called"] for each in report["entries"]])
        self.assertEqual([None, None, [MAIL, NOTES]], [each["dataclasses"] for each in report["entries"]])
        self.assertEqual(["classForAccountType", "initWithProperties"], report["entries"][0]["answers"])
        self.assertEqual(str(self.tree.path(ODD)), report["entries"][0]["module"])

    def test_says_so_to_people(self):
        creators = {**{each: [] for each in TYPES}, "Mail": [notifier(), {"Type": "Other"}]}
        run = self.run_on(creators, "--modules")
        self.assertEqual((5, f"{self.file}: 1 finding"), (run.status, run.output[0]))
        self.assertRegex(run.output[2], r"^Mail\[0\]  NotifierAccount  Maker  after a save  Mail  +usr/lib/odd_module.so$")
        self.assertRegex(run.output[3], r"^Mail\[1\]  Other  +never$")
        self.assertEqual("    it is never called", run.output[5])

    def test_looks_at_the_configuration_that_is_used(self):
        report = json.loads("\n".join(self.accountctl("--json", "check-modules").output))
        self.assertEqual(str(RESOURCES / "AccountCreators.plist"), report["file"])
        self.assertEqual(([], set(TYPES)), (report["findings"], {each["type"] for each in report["entries"]}))

    def test_finds_a_notifier_whose_data_classes_stand_beside_its_description(self):
        misplaced = {**entry("NotifierAccount"), LISTENS: [MAIL]}
        self.assert_found("misplaced-key", "^Supported Dataclasses stands beside Description", "it is never called", misplaced)

    def test_finds_keys_that_are_missing_or_no_such_thing(self):
        never, fails = "it is never called", FAILS["FullAccount"]
        for kind, what, effect, bad in (
            ("no-dictionary", "no dictionary", never, "Maker"),
            ("unknown-kind", "no Type", never, {"Description": {}}),
            ("unknown-kind", "Type is Notifier,", never, {**notifier(), "Type": "Notifier"}),
            ("missing-key", "no dictionary Description", never, {"Type": "NotifierAccount"}),
            ("missing-key", "no dictionary Description", fails, {"Type": "FullAccount"}),
            ("misplaced-key", "^Class stands beside", fails, {"Type": "FullAccount", "Class": "Maker"}),
            ("missing-key", "no Supported Dataclasses", never, entry("NotifierAccount")),
            ("wrong-kind", "Supported Dataclasses is no array", never, entry("NotifierAccount", **{LISTENS: MAIL})),
            ("missing-key", "no Framework", FAILS["NotifierAccount"],
             {"Type": "NotifierAccount", "Description": {LISTENS: [MAIL], "Class": "Maker"}}),
            ("wrong-kind", "Class is no text", fails, entry("FullAccount", "")),
        ):
            with self.subTest(what=what):
                self.assert_found(kind, what, effect, bad)

    def test_finds_a_notifier_for_data_classes_that_no_such_account_has(self):
        self.assert_found("unsupported-dataclasses", "no account of this type", "it is never called",
                          notifier(dataclasses=[CALENDARS, CONTACTS]))
        self.assert_found("unsupported-dataclasses", "is empty", "it is never called", notifier(dataclasses=[]))

    def test_finds_a_data_class_that_there_is_not(self):
        report = self.check(notifier(dataclasses=["Mail", MAIL]))
        self.assertEqual(["unknown-dataclass"], [each["kind"] for each in report["findings"]])
        self.assertIs(True, report["entries"][0]["called"])

    def test_finds_that_a_later_entry_is_used(self):
        self.assert_found("shadowed", r"^Mail\[2\] ", "its module is opened, but its class is never called",
                          entry("FullAccount"), entry("SyncAccount"), entry("FullAccount"))

    def test_finds_types_that_are_unknown_or_missing(self):
        run = self.run_on({"Post": [entry("FullAccount")], "Mail": {}}, "--json", "--modules")
        report = json.loads("\n".join(run.output))
        self.assertEqual(5, run.status)
        self.assertEqual(
            {"Post": "unknown-type", **{each: "no-entries" for each in TYPES}},
            {each["place"]: each["kind"] for each in report["findings"]},
        )
        self.assertEqual([False], [each["called"] for each in report["entries"]])

    def test_finds_modules_that_cannot_be_opened(self):
        self.tree.write("usr/lib/text.so", "no module")
        for framework, what in (("usr/lib/none.so", "none.so: No such file"), ("usr/lib/text.so", "text.so: ")):
            with self.subTest(framework=framework):
                self.assert_found("not-opened", what, FAILS["FullAccount"], entry("FullAccount", framework=framework))

    def test_finds_classes_that_do_not_answer(self):
        full, note = FAILS["FullAccount"], FAILS["NotifierAccount"]
        for kind, what, effect, bad in (
            ("no-such-class", "no class Nobody", full, entry("FullAccount", "Nobody")),
            ("answers-nothing", "Bare does not answer noteAccountChanges", note, notifier("Bare")),
            ("answers-nothing", "Foreign does not answer noteAccountChanges", note, notifier("Foreign")),
            ("answers-nothing", "classForAccountType or accountWithBasicAccount", full, entry("FullAccount", "Bare")),
            ("answers-nothing", "accountToRefreshForBasicAccount", "such an account has none, and its refreshes answer false",
             entry("SyncAccount", "Bare")),
        ):
            with self.subTest(what=what):
                self.assert_found(kind, what, effect, bad)

    def test_finds_a_maker_that_has_no_full_account_for_the_type(self):
        creators = {**{each: [] for each in TYPES}, "LDAP": [entry("FullAccount", "MailMaker")]}
        (finding,) = json.loads("\n".join(self.run_on(creators, "--json", "--modules").output))["findings"]
        self.assertEqual("answers-nothing", finding["kind"])
        self.assertIn("for the type LDAP", finding["what"])

    def test_outlives_modules_that_do_not_survive_being_opened(self):
        for way, what in (("dies", "by SIGSEGV$"), ("exits", "with status 3$"), ("hangs", "not done after 10 seconds$")):
            with self.subTest(way=way):
                self.assert_found("died", what, "whoever opens the module ends so", entry("FullAccount"),
                                  environment={"ODD_MODULE": way, "ASAN_OPTIONS": "handle_segv=0", "TSAN_OPTIONS": "handle_segv=0"})

    def test_outlives_a_class_that_throws(self):
        self.assert_found("died", "by SIGABRT$", "whoever opens the module ends so", entry("FullAccount", "Thrower"))

    def test_keeps_what_a_module_says_out_of_its_report(self):
        run = self.run_on({each: [] for each in TYPES} | {"Mail": [notifier()]}, "--json", "--modules",
                          environment={"ODD_MODULE": "talks"})
        self.assertEqual([], json.loads("\n".join(run.output))["findings"])
        self.assertEqual(["odd module: opened"], run.errors)

    def test_opens_no_module_of_another_root_unless_asked_for(self):
        run = self.run_on({each: [] for each in TYPES} | {"Mail": [notifier()]}, "--json", environment={"ODD_MODULE": "dies"})
        self.assertEqual(["accountctl: no module is opened; modules under another root are opened only with --modules"],
                         run.errors)
        (checked,) = json.loads("\n".join(run.output))["entries"]
        self.assertEqual((0, None, []), (run.status, checked["called"], checked["answers"]))

    def test_of_a_file_that_cannot_be_read_fails(self):
        run = self.accountctl("check-modules", self.scratch / "none.plist")
        self.assertEqual((1, [], 1), (run.status, run.output, len(run.errors)))
        self.assertTrue(run.errors[0].startswith("accountctl: the file cannot be read: "))

    def test_changes_nothing(self):
        before = self.standing()
        self.check(entry("FullAccount"), notifier())
        self.assert_unchanged(before)


if __name__ == "__main__":
    unittest.main()
