"""accountctl new-device: a scratch device on which modules can be tried, made by one command."""

import json
import os
import unittest

from accountctl_case import ACCOUNTCTL, RESOURCES, AccountctlTest
from device import CURRENT_VERSION, SETTINGS, Device, run_host
from device_case import HOST


class NewDevice(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.root = self.scratch / "new"
        self.resources = self.root / "usr/share/account-settings"
        # The shipped modules, where the shipped configuration names them below this root.
        modules = RESOURCES.parent.parent
        inside = self.tree.path(str(modules).lstrip("/"))
        inside.parent.mkdir(parents=True)
        inside.symlink_to(modules)

    def on_device(self, program, *words):
        return run_host(program, "--root", self.root, "--resources", self.resources, *words)

    def test_is_one_that_nothing_is_wrong_with(self):
        self.done("new-device", self.root)
        self.assertEqual({"Accounts": [], "Version": CURRENT_VERSION}, Device(self.root).read_plist(SETTINGS))
        verified = self.on_device(ACCOUNTCTL, "verify")
        self.assertEqual((0, []), (verified.status, verified.errors), verified.output)
        self.assertEqual((0, []), self.on_device(HOST)[::2])

    def test_has_the_modules_that_its_configuration_names(self):
        self.done("new-device", self.root)
        checked = self.on_device(ACCOUNTCTL, "--modules", "--json", "check-modules")
        report = json.loads("\n".join(checked.output))
        self.assertEqual((0, []), (checked.status, report["findings"]))
        self.assertEqual({True}, {each["called"] for each in report["entries"]})

    def test_can_be_changed_and_tells_its_modules(self):
        self.done("new-device", self.root)
        added = self.on_device(ACCOUNTCTL, "--modules", "add", "Mail", "IMAPAccount", "Identifier=M1", "Hostname=mail.example.com")
        self.assertEqual((0, ["M1"], []), added[:3])
        shown = self.on_device(ACCOUNTCTL, "--modules", "show", "M1")
        self.assertIn("Service     mail.example.com:993 (secure)", shown.output)

    def test_says_where_it_is_and_what_comes_next(self):
        printed = self.done("new-device", self.root)
        self.assertEqual(f"a device without accounts: {self.root}", printed[0])
        self.assertTrue(printed[-1].endswith(" --modules check-modules"))
        other = self.scratch / "other"
        report = json.loads("\n".join(self.done("--json", "new-device", other)))
        self.assertEqual({"schema": 1, "root": str(other), "resources": f"{other}/usr/share/account-settings"}, report)

    def test_is_made_in_an_empty_directory_and_below_missing_ones(self):
        self.root.mkdir()
        self.done("new-device", self.root)
        self.done("new-device", self.scratch / "not/yet")

    def assert_not_made(self, why):
        before = sorted(self.scratch.rglob("*"))
        run = self.accountctl("new-device", self.root)
        self.assertEqual((1, [], [f"accountctl: no device is made in {self.root}: {why}"]), run[:3])
        self.assertEqual(before, sorted(self.scratch.rglob("*")))

    def test_is_not_made_where_something_stands(self):
        self.root.mkdir()
        (self.root / "kept").touch()
        self.assert_not_made("it is not empty")

    def test_is_not_made_where_others_have_a_hand_in(self):
        self.root.mkdir()
        self.root.chmod(0o777)
        self.assert_not_made("others may write in it")
        self.root.rmdir()
        self.root.symlink_to(self.tree.root)
        self.assert_not_made("it is no directory")

    def test_says_which_modules_it_has_not(self):
        self.tree.path(str(RESOURCES.parent.parent).lstrip("/")).unlink()
        run = self.accountctl("new-device", self.root)
        self.assertEqual((0, 7), (run.status, len(run.errors)))
        self.assertRegex(run.errors[0], r"^accountctl: there is no module \S+\.so to be copied$")

    def test_has_whoever_makes_it_as_its_mobile_user(self):
        self.done("new-device", self.root)
        self.assertIn(f"mobile:*:{os.getuid()}:{os.getgid()}:", (self.root / "etc/passwd").read_text())
        self.assertEqual(0o700, (self.root / "var/mobile/Library/Mail").stat().st_mode & 0o777)


if __name__ == "__main__":
    unittest.main()
