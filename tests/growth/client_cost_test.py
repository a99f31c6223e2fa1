"""What the interface for programs adds to the store's own work, for one account among many: counted, never timed."""

import os
import subprocess
import tempfile
import unittest
from pathlib import Path

from callgrind import outside
from device import CURRENT_VERSION, SETTINGS, Device

PROGRAM = os.environ["CLIENT_COST"]
ACCOUNTS = int(os.environ.get("ACCOUNTS", "200"))
MOST = 1.1


def account(number):
    known = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": f"A{number}", "DisplayName": f"Directory {number}",
             "Hostname": "ldap.example.com", "Username": f"user{number}", "Port": 389, "SSLEnabled": True,
             "Enabled Dataclasses": ["com.vorlix.Dataclass.ContactsSearch"]}
    return {**known, **{f"Key {key}": f"value {number * key}" for key in range(10)}}


def counted(accounts):
    """What each piece takes on a device with so many accounts."""
    with tempfile.TemporaryDirectory() as scratch:
        device = Device(Path(scratch) / "device")
        device.set_mobile(os.getuid(), os.getgid())
        device.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [*map(account, range(accounts))]})
        command = [PROGRAM, device.root, f"A{accounts // 2}"]
        names = subprocess.run(command, check=True, capture_output=True, text=True).stdout.splitlines()
        parts = outside("no library", command, "--toggle-collect=measuredPiece", "--dump-after=measuredPiece")[1:]
    return dict(zip(names, parts, strict=True))


class ClientCost(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.counted = counted(ACCOUNTS)

    def assert_adds_little(self, piece):
        own, of_store = self.counted[piece], self.counted[f"{piece} in the store"]
        print(f"\n{piece}: {own:,} instructions, the store {of_store:,}: {own / of_store:.3f}", end="", flush=True)
        self.assertLessEqual(own / of_store, MOST)

    def test_of_looking_one_account_up_is_that_of_the_store(self):
        self.assert_adds_little("look")

    def test_of_changing_one_key_is_hardly_more_than_a_load_and_a_save(self):
        self.assert_adds_little("change")

    def test_of_removing_one_account_does_not_come_from_the_others(self):
        few, many = (counts["remove each"] for counts in (self.counted, counted(4 * ACCOUNTS)))
        print(f"\nremove each: {few:,} instructions, {many:,} of four times as many accounts", end="", flush=True)
        self.assertLessEqual(many / (4 * few), MOST)


if __name__ == "__main__":
    unittest.main()
