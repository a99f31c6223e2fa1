"""The account modules of an installed tree, and one that is built on that tree alone."""

import os
import plistlib
import subprocess
import unittest
from pathlib import Path

from accountctl_case import ACCOUNTCTL, DIRECTORY, HOME_MAIL
from device import CURRENT_VERSION, EXAMPLES, SETTINGS, Device, plain_environment, run_host
from device_case import DeviceTest

BUILD_TREE = Path(os.environ["BUILD_TREE"])
EXAMPLE = EXAMPLES.parent / "modules"
CALENDARS = "com.vorlix.Dataclass.Calendars"


def run(*command):
    ended = subprocess.run(
        [str(part) for part in command],
        env=plain_environment(), stdin=subprocess.DEVNULL, capture_output=True, text=True, check=False,
    )
    if ended.returncode != 0:
        raise AssertionError(f"{command} failed:\n{ended.stdout}{ended.stderr}")


class InstalledModules(DeviceTest):
    def setUp(self):
        super().setUp()
        self.prefix = self.scratch / "prefix"
        run("cmake", "--install", BUILD_TREE, "--prefix", self.prefix)
        self.resources = self.prefix / os.environ["DATA_DIRECTORY"] / "account-settings"
        self.modules = self.prefix / os.environ["LIBRARY_DIRECTORY"] / "account-settings" / "modules"
        self.tree = self.device(Version=CURRENT_VERSION, Accounts=[HOME_MAIL, DIRECTORY])

    def accountctl(self, *words):
        return run_host(self.prefix / "bin" / ACCOUNTCTL.name, "--root", self.tree.root, "--modules", *words)

    def creators(self):
        return plistlib.loads((self.resources / "AccountCreators.plist").read_bytes())

    def named_modules(self):
        return {entry["Description"]["Framework"] for entries in self.creators().values() for entry in entries}

    def test_are_those_that_the_installed_configuration_names_under_the_system_root(self):
        self.assertEqual({str(path)[1:] for path in self.modules.iterdir()}, self.named_modules())

    def test_are_opened_by_the_installed_programs(self):
        inside = self.tree.path(str(self.prefix)[1:])
        inside.parent.mkdir(parents=True)
        inside.symlink_to(self.prefix)
        for words in (["show", "M1"], ["rename", "M1", "Work"]):
            self.assertEqual((0, []), self.accountctl(*words)[::2])
        self.assertIn("Service     imap.example.com:993 (secure)", self.accountctl("show", "M1").output)

    def test_of_one_that_moved_are_found_once_its_configuration_is_written_again(self):
        moved = self.scratch / "moved"
        self.prefix.rename(moved)
        run("cmake", "--install", BUILD_TREE, "--prefix", moved)
        self.prefix, self.resources = moved, moved / self.resources.relative_to(self.prefix)
        self.assertEqual([str(moved)[1:]], sorted({name[: len(str(moved)) - 1] for name in self.named_modules()}))

    def build_example(self):
        build = self.scratch / "build"
        run(
            "cmake", "-G", "Ninja", "-S", EXAMPLE, "-B", build, f"-DCMAKE_PREFIX_PATH={self.prefix}",
            f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}",
        )
        run("cmake", "--build", build)
        return build / "example-accounts.so"

    def name_example(self, path):
        def entry(kind, class_name, **more):
            return {"Type": kind, "Description": {"Framework": path, "Class": class_name, **more}}

        creators = self.creators()
        creators["CalDAV"] = [
            entry("FullAccount", "ExampleAccountCreator"),
            entry("SyncAccount", "ExampleAccountCreator"),
            entry("NotifierAccount", "ExampleNotifier", **{"Supported Dataclasses": [CALENDARS]}),
        ]
        self.tree.write_plist(self.resources / "AccountCreators.plist", creators)

    def test_are_joined_by_the_example_built_on_them(self):
        self.tree.write("usr/lib/example/example-accounts.so", self.build_example().read_bytes())
        self.name_example("usr/lib/example/example-accounts.so")
        added = self.accountctl(
            "add", "CalDAV", "MobileCalDAVAccount", "Identifier=C1", f'Enabled Dataclasses:=["{CALENDARS}"]'
        )
        self.assertEqual((0, ["C1"]), (added.status, added.output))
        self.assertEqual(
            [
                'example-accounts: {ChangeType = 0; AccountID = "C1"; AccountType = "CalDAV"; OriginalDataclasses = ()}',
                f"example-accounts: C1 changed for {CALENDARS}",
            ],
            added.errors,
        )
        shown = self.accountctl("show", "C1")
        self.assertEqual((0, []), (shown.status, shown.errors))
        self.assertEqual("C1", self.tree.read_plist(SETTINGS)["Accounts"][2]["Identifier"])

    def test_can_be_tried_on_a_new_device(self):
        def accountctl(*words):
            return run_host(self.prefix / "bin" / ACCOUNTCTL.name, *words)

        root = self.scratch / "new"
        self.assertEqual((0, []), accountctl("new-device", root)[::2])
        device, self.resources = Device(root), root / "usr/share/account-settings"
        device.write("usr/lib/example/example-accounts.so", self.build_example().read_bytes())
        self.name_example("usr/lib/example/example-accounts.so")
        options = ("--root", root, "--resources", self.resources)
        self.assertEqual((0, []), run_host(self.prefix / "bin/migration-host", *options)[::2])
        checked = accountctl(*options, "--modules", "check-modules")
        self.assertEqual((0, []), (checked.status, checked.errors))
        (line,) = [each for each in checked.output if " ExampleNotifier " in each]
        self.assertRegex(line, r" after a switch, after a save +Calendars +usr/lib/example/example-accounts\.so$")
        added = accountctl(*options, "--modules", "add", "CalDAV", "MobileCalDAVAccount", "Identifier=C1",
                           f'Enabled Dataclasses:=["{CALENDARS}"]')
        self.assertEqual((0, ["C1"], 2), (added.status, added.output, len(added.errors)))


if __name__ == "__main__":
    unittest.main()
