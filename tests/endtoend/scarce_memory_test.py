"""The real host where the system gives it little memory: as much as its start takes, as much as a run takes, and between.

Whatever takes the memory, the program, its libraries or the one that reads property lists, meets the end of it.
"""

import os
import resource
import shutil
import unittest
from collections import Counter

from device import LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, Device
from device_case import DeviceTest

LIMITS = int(os.environ.get("MEMORY_LIMITS", "20"))
MEGABYTE = 1 << 20
MAIL = [f"M{number}" for number in range(200)]
STANDING = [f"L{number}" for number in range(10)]
EVERY_ACCOUNT_ONCE = Counter([*MAIL, *STANDING, "E"])


@unittest.skipIf(os.environ["SANITIZE"], "a sanitizer takes more of the address space than there is memory")
class ScarceMemory(DeviceTest):
    def old_device(self):
        device = self.device(Version=0, Accounts=[
            {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": identifier} for identifier in STANDING])
        device.write_plist(LEGACY_MAIL, {"DeliveryAccounts": [], "MailAccounts": [
            {"AccountType": "IMAPAccount", "uniqueId": identifier} for identifier in MAIL]})
        device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [
            {"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": "E"}]})
        return device

    def run_within(self, limit, *arguments):
        return self.run_host(*arguments, prepare=lambda: resource.setrlimit(resource.RLIMIT_AS, (limit, limit)))

    def least_for(self, succeeds):
        """To a tenth of a megabyte, in bytes."""
        least, enough = 0, 512 * MEGABYTE
        while enough - least > MEGABYTE // 10:
            middle = (least + enough) // 2
            least, enough = (least, middle) if succeeds(middle) else (middle, enough)
        return enough

    def copy_of(self, device):
        root = self.scratch / "copy"
        shutil.rmtree(root, ignore_errors=True)
        shutil.copytree(device.root, root)
        return Device(root)

    def accounts_of(self, device):
        waiting, found = list(device.read_plist(SETTINGS)["Accounts"]), Counter()
        while waiting:
            account = waiting.pop()
            found[account["Identifier"]] += 1
            waiting += account.get("ChildAccounts", [])
        return Counter({name: count for name, count in found.items() if name in EVERY_ACCOUNT_ONCE})

    def test_loses_and_doubles_no_account_wherever_it_ends(self):
        untouched = self.old_device()
        start = self.least_for(lambda limit: self.run_within(limit, "--help").status == 0)
        whole = self.least_for(lambda limit: self.run_within(limit, "--root", self.copy_of(untouched).root).status == 0)
        endings = Counter()
        for number in range(LIMITS):
            limit, device = start + (whole - start) * number // LIMITS, self.copy_of(untouched)
            with self.subTest(limit=limit):
                status = self.run_within(limit, "--root", device.root).status
                endings[status] += 1
                if status == 0:
                    self.assertEqual(EVERY_ACCOUNT_ONCE, self.accounts_of(device))
                self.assertEqual(0, self.run_host("--root", device.root).status)
                self.assertEqual(EVERY_ACCOUNT_ONCE, self.accounts_of(device))
        print(f"{LIMITS} limits from {start >> 10} to {whole >> 10} KiB; statuses, signals negative: {dict(endings)}")
        self.assertGreater(endings[1], 0)


if __name__ == "__main__":
    unittest.main()
