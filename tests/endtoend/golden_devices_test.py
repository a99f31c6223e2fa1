"""A device of every stored version, migrated whole: its accounts afterwards, what the run said, and a second run.

Each directory below devices/ holds the settings file and what the device answers, and in expected.plist what a run must
make of them. That it ends at the current version, and says that it migrates where it began before that, holds for each.
Identifiers that a run makes anew stand there as "(new 1)", "(new 2)", in the order of the accounts.
"""

import plistlib
import re
import unittest
from pathlib import Path

from device import CURRENT_VERSION, PREFERENCES, SETTINGS, exactly
from device_case import HOST, DeviceTest

DEVICES = Path(__file__).parent / "devices"
UUID = re.compile(r"[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")
VERSIONS = sorted(plistlib.loads(path.read_bytes())["Version"] for path in DEVICES.glob("*/settings.plist"))
ANSWERS = {
    "device-info.plist": "etc/vorlix/device-info.plist",
    "profile-restrictions.plist": "etc/vorlix/profile-restrictions.plist",
    "external-sources.plist": PREFERENCES + "/com.vorlix.external-sources.plist",
}


def texts(value):
    if isinstance(value, dict):
        return set().union(*map(texts, value.values()))
    if isinstance(value, list):
        return set().union(*map(texts, value))
    return {value} if isinstance(value, str) else set()


class Labels:
    """Names the identifiers that were made anew, each at its first appearance."""

    def __init__(self, accounts_before):
        self.known = texts(accounts_before)
        self.names = {}

    def label(self, value):
        if isinstance(value, dict):
            return {key: self.label(value[key]) for key in sorted(value)}
        if isinstance(value, list):
            return [self.label(element) for element in value]
        if isinstance(value, str) and value not in self.known and UUID.fullmatch(value):
            return self.names.setdefault(value, f"(new {len(self.names) + 1})")
        return value


class GoldenDevices(DeviceTest):
    def golden(self, directory):
        device = self.device()
        for name, path in {**ANSWERS, "settings.plist": SETTINGS}.items():
            if (directory / name).exists():
                device.write_plist(path, plistlib.loads((directory / name).read_bytes()))
        return device

    def migrate(self, device):
        run = device.migrate(HOST)
        self.assertEqual(0, run.status, run.errors)
        return run

    def assert_migrates_as_expected(self, directory):
        device = self.golden(directory)
        before = device.read_plist(SETTINGS)
        begun = ["Migrating accounts"] if before["Version"] < CURRENT_VERSION else []
        expected = plistlib.loads((directory / "expected.plist").read_bytes())
        run = self.migrate(device)
        after = device.read_plist(SETTINGS)
        self.assertEqual(CURRENT_VERSION, after["Version"])
        self.assertEqual(exactly(expected["Accounts"]), exactly(Labels(before["Accounts"]).label(after["Accounts"])))
        self.assertEqual(begun + expected["Console"], run.console())
        self.assertEqual(expected["Cloud Tabs Notices"] * [True], [told["enabled"] for told in run.told("cloud-tabs")])
        self.assert_stays(device, after)

    def assert_stays(self, device, settings):
        run = self.migrate(device)
        self.assertEqual(exactly(settings), exactly(device.read_plist(SETTINGS)))
        self.assertEqual(([], []), (run.console(), run.told("cloud-tabs")))

    def test_there_is_a_device_of_every_version(self):
        self.assertEqual(list(range(CURRENT_VERSION + 1)), VERSIONS)


def test_of(directory):
    return lambda self: self.assert_migrates_as_expected(directory)


for each in sorted(DEVICES.iterdir()):
    setattr(GoldenDevices, "test_a_device_of_" + each.name.replace("-", "_"), test_of(each))

if __name__ == "__main__":
    unittest.main()
