"""Many hosts, clients and an editor at one device. Whoever wins, the settings file is a whole one of this release, no
account is gone or doubled, and every program ends well."""

import os
import plistlib
import subprocess
import threading
import unittest

from accountctl_case import ACCOUNTCTL, MAIL
from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, TEMPORARY, plain_environment
from device_case import HOST, DeviceTest

ROUNDS = 3
HOSTS = 4
CLIENTS = 4
PATIENCE = 120


def account(number):
    return {"Type": "Mail", "Class": "IMAPAccount", "Identifier": f"M{number}", "Enabled Dataclasses": [MAIL]}


class ManyAtOnce(DeviceTest):
    def start(self, *words):
        return subprocess.Popen(
            [str(word) for word in words], env=plain_environment(), stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        )

    def assert_ended_well(self, process):
        output, errors = process.communicate(timeout=PATIENCE)
        self.assertEqual(0, process.returncode, (process.args, output, errors))

    def assert_whole(self, content, identifiers):
        settings = plistlib.loads(content)
        self.assertEqual(identifiers, sorted(each["Identifier"] for each in settings["Accounts"]))
        return settings

    def edit(self, device, ended):
        """An editor that replaces the file, as editors do, with what it just read, until all others have ended."""
        beside = device.path(SETTINGS).with_name("edited")
        while not ended.wait(0.01):
            beside.write_bytes(device.read(SETTINGS))
            os.replace(beside, device.path(SETTINGS))

    def test_leave_a_whole_file_with_every_account_once(self):
        for _ in range(ROUNDS):
            device = self.device(Version=CURRENT_VERSION, Accounts=[account(number) for number in range(CLIENTS)])
            identifiers = [f"M{number}" for number in range(CLIENTS)]
            ended = threading.Event()
            editor = threading.Thread(target=self.edit, args=(device, ended))
            editor.start()
            hosts = [self.start(HOST, "--root", device.root) for _ in range(HOSTS)]
            clients = [
                self.start(ACCOUNTCTL, "--root", device.root, "rename", f"M{number}", f"Name {number}")
                for number in range(CLIENTS)
            ]
            try:
                for process in hosts + clients:
                    self.assert_ended_well(process)
            finally:
                ended.set()
                editor.join()
            settings = self.assert_whole(device.read(SETTINGS), identifiers)
            self.assertEqual(CURRENT_VERSION, settings["Version"])
            self.assertEqual([], list(device.path(TEMPORARY).iterdir()))

    def test_convert_legacy_accounts_once(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "L1"}]})
        device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [
            {"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": "E1"}
        ]})
        for process in [self.start(HOST, "--root", device.root) for _ in range(HOSTS)]:
            self.assert_ended_well(process)
        self.assert_whole(device.read(SETTINGS), ["DeviceLocalAccount", "E1", "L1"])
        self.assertFalse(device.path(LEGACY_MAIL).exists())


if __name__ == "__main__":
    unittest.main()
