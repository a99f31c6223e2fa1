"""Devices that broke, each in its own way, as somebody finds them at night: what the tools say of them is true, and the
way back that docs/OPERATIONS.md tells works, with every key and credential."""

import json
import os
import plistlib
import resource
import unittest

from accountctl_case import DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS, SETTINGS_COPY, TEMPORARY, run_host
from device_case import HOST, PLUGINS

MORTAL = PLUGINS / "legacy" / "mortal_migrator.so"
PLUGIN = os.path.join(os.environ["BUILD_TREE"], os.environ["LIBRARY_DIRECTORY"], "account-settings", "accounts-migrator.so")

HOME = changed(HOME_MAIL, Password="mangrove")
WORK = {
    "Type": "Mail", "Class": "IMAPAccount", "Identifier": "W1", "Sync Identifier": "S-W1", "DisplayName": "Work",
    "Username": "ines", "Hostname": "imap.work.example", "Password": "tamarisk", "Further": [1, {"key": b"\x00"}],
}
QUAY = {"uniqueId": "Q1", "AccountName": "Quay", "Username": "ola", "Password": "mangrove"}
WHARF = {"AccountType": "IMAPAccount", "uniqueId": "F1", "AccountName": "Wharf", "Username": "mara"}


class BrokenDevices(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.snapshots = self.tree.path("var/lib/account-settings/snapshots")
        self.put(HOME, WORK, DIRECTORY, version=11)

    def boot(self, *more, **how):
        """What the boot's command makes of the device."""
        return self.tree.migrate(HOST, "--snapshots", self.snapshots, *more, **how)

    def told(self, *words):
        """What accountctl says, whatever it ends with."""
        run = self.accountctl(*words)
        return "\n".join([*run.output, *run.errors])

    def assert_accounts(self, *accounts):
        self.assertEqual(*(sorted(each, key=lambda account: account["Identifier"]) for each in (accounts, self.accounts())))

    def test_a_settings_file_was_cut_off(self):
        self.boot()
        self.tree.write(SETTINGS, self.tree.read(SETTINGS)[:-40])
        self.assertIn("unreadable", self.told("verify", "--json"))
        self.boot()
        self.assertEqual([], [each for each in self.accounts() if each["Type"] != "OnMyDevice"])
        self.assertIn("the file cannot be read", self.told("diff", "latest"))
        self.assertIn("removed: Accounts[1], W1 (Work)", self.told("diff", "000001"))
        self.done("recover", "000001", "M1", "Work", "L1")
        self.assert_accounts(HOME, WORK, DIRECTORY)

    def test_a_newer_release_had_written_the_settings(self):
        self.tree.write_plist(SETTINGS, {"Version": 13, "Accounts": [HOME], "Later": {"kept": True}})
        before = self.tree.read(SETTINGS)
        self.boot()
        self.assertIn("settings file, data version 13", self.told("--file", "latest", "list"))
        self.assertEqual("0 removed, 0 added, 0 changed, 1 the same", self.told("diff", "latest"))
        self.run_host("--root", self.tree.root, "--snapshots", self.snapshots, "--undo")
        self.assertEqual(before, self.tree.read(SETTINGS))

    def test_an_accounts_class_was_unknown(self):
        self.put(HOME, changed(WORK, Class="Pigeon"), version=11)
        self.boot()
        self.assertIn("removed: Accounts[1], W1 (Work)", self.told("diff", "latest"))
        self.assertIn("its class is unknown and no directory tells a better one", self.told("--file", "latest", "list"))
        self.assertIn("--set KEY=VALUE repairs it", self.told("recover", "latest", "Work"))
        self.done("recover", "latest", "Work", "--set", "Class=IMAPAccount")
        self.assert_accounts(HOME, WORK)

    def test_there_were_no_snapshots_when_an_account_went(self):
        self.put(HOME, changed(WORK, Type="Telegraph"), version=11)
        self.tree.migrate(HOST)
        copy = self.tree.path(SETTINGS_COPY)
        self.assertIn("its type is unknown", self.told("--file", copy, "list"))
        self.done("recover", copy, "Accounts[1]", "--set", "Type=Mail")
        self.assert_accounts(HOME, WORK)

    def test_two_accounts_shared_an_identifier(self):
        self.put(changed(WORK, Identifier="M1"), HOME, version=11)
        self.boot()
        self.assertNotIn("imap.work.example", json.dumps(self.accounts(), default=repr))
        self.assertIn("it shares its identifier with Accounts[0]", self.told("--file", "latest", "list"))
        self.assertIn("--set 'Identifier:=null'", self.told("recover", "latest", "Accounts[0]"))
        self.done("recover", "latest", "Accounts[0]", "--set", "Identifier:=null")
        (back,) = [each for each in self.accounts() if each.get("Hostname") == "imap.work.example"]
        self.assertEqual(changed(WORK, Identifier=back["Identifier"]), back)

    def test_the_disk_was_full(self):
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": [WHARF]})
        before = self.standing()
        full = {"prepare": lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (100, 100))}
        run = run_host(HOST, "--root", self.tree.root, "--snapshots", self.snapshots, **full)
        self.assertEqual(5, run.status, run.errors)
        self.assertEqual([], [path for path, entry in before.items() if self.standing()[path] != entry])
        self.assertEqual(0, self.boot().status)
        self.assertIn("Wharf", self.told("list"))

    def test_nobody_could_be_given_the_saved_file(self):
        users = self.tree.read("etc/passwd")
        self.tree.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        self.assertEqual(6, self.boot().status)
        self.assertIn("version-older", self.told("verify", "--json"))
        self.tree.write("etc/passwd", users)
        self.assertEqual(0, self.boot().status)
        self.assert_accounts(HOME, WORK, DIRECTORY)

    def killed_while_it_saved(self):
        """A run without snapshots that died before it moved the new settings into place; answers what it left."""
        changes = self.scratch / "changes"
        how = {"REAL_PLUGIN": PLUGIN, "DIE_OF": "9", "CHANGES": str(changes), "DIE_BEFORE": "0"}
        original = self.tree.read(SETTINGS)
        self.tree.migrate(HOST, "--plugin", MORTAL, environment=how)
        made = [line.split(" ", 1)[1] for line in changes.read_text().splitlines()]
        self.tree.write(SETTINGS, original)
        self.tree.path(SETTINGS_COPY).unlink()
        self.tree.path(TEMPORARY).rmdir()
        number = made.index(str(self.tree.path(SETTINGS))) + 1
        run = self.tree.migrate(HOST, "--plugin", MORTAL, environment={**how, "DIE_BEFORE": str(number)})
        self.assertEqual(-9, run.status)
        return list(self.tree.path(TEMPORARY).glob("file??????"))

    def test_a_run_was_killed_without_snapshots(self):
        left = self.killed_while_it_saved()
        self.assertEqual(1, len(left))
        self.assertIn("a run was killed while it worked", self.told("verify"))
        self.assertIn("data version 11", self.told("--file", self.tree.root, "list"))
        for each in left:
            self.assertEqual("0 removed, 0 added, 0 changed, 3 the same", self.told("diff", each))
        self.assertEqual(0, self.boot().status)
        self.assert_accounts(HOME, WORK, DIRECTORY)

    def test_a_legacy_file_had_a_description_without_a_class(self):
        self.tree.path(SETTINGS).unlink()
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": [WHARF, QUAY]})
        self.boot()
        self.assertNotIn("Wharf", self.told("list"))
        self.assertIn("MailAccounts[1] (Q1): there is no AccountType", self.told("--file", "latest", "verify"))
        self.run_host("--root", self.tree.root, "--snapshots", self.snapshots, "--undo")
        self.done("recover", self.tree.path(LEGACY_MAIL), "Quay", "--set", "Class=IMAPAccount")
        self.boot()
        back = {each["Identifier"]: each for each in self.accounts()}
        self.assertEqual(("mangrove", "ola"), (back["Q1"]["Password"], back["Q1"]["Username"]))
        self.assertIn("F1", back)

    @unittest.skipIf(os.getuid() != 0, "only root makes other users' files")
    def test_the_settings_might_have_been_planted(self):
        self.tree.set_mobile(501, 501)
        settings, elsewhere = self.tree.path(SETTINGS), self.tree.path("secret")
        settings.rename(elsewhere)
        elsewhere.chmod(0o600)
        os.chown(settings.parent, 501, 501)
        os.link(elsewhere, settings)
        run = self.boot()
        self.assertEqual((8, True), (run.status, f"{settings} may have been planted" in run.errors[-1]), run.errors)
        settings.unlink()
        settings.write_bytes(elsewhere.read_bytes())
        os.chown(settings, 501, 501)
        self.assertEqual(0, self.boot().status)
        self.assert_accounts(HOME, WORK, DIRECTORY)

    def test_a_wrong_snapshot_was_restored(self):
        self.put(HOME, DIRECTORY, version=11)
        self.boot()
        before = self.scratch / "work.plist"
        before.write_bytes(plistlib.dumps({"Version": CURRENT_VERSION, "Accounts": [WORK]}))
        self.done("recover", before)
        self.run_host("--root", self.tree.root, "--snapshots", self.snapshots, "--restore", "000001")
        self.boot()
        self.assertIn("removed: Accounts[2], W1 (Work)", self.told("diff", "000002"))
        self.assertIn("brought back: Accounts[2], W1 (Work)", self.done("recover", "000002"))
        self.assert_accounts(HOME, DIRECTORY, WORK)


if __name__ == "__main__":
    unittest.main()
