"""Several at one settings file: a migration that runs, another accountctl, an editor. Nobody's change is lost."""

import errno
import fcntl
import os
import subprocess
import time
import unittest

from accountctl_case import ACCOUNTCTL, CLOUD, DIRECTORY, HOME_MAIL, MAIL, AccountctlTest, changed
from device import SETTINGS, plain_environment

MIGRATION_LOCK = "tmp/AccountMigrationInProgress"
PATIENCE = 60


class AtOnce(AccountctlTest):
    def start(self, *words, **environment):
        process = subprocess.Popen(
            [ACCOUNTCTL, "--root", self.tree.root, *words],
            env={**plain_environment(), **environment},
            stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        )
        self.addCleanup(end, process)
        return process

    def assert_done(self, process):
        output, errors = process.communicate(timeout=PATIENCE)
        self.assertEqual((0, ""), (process.returncode, errors))
        return output


class TwoAndAnEditor(AtOnce):
    """One accountctl has loaded the accounts and is about to change them; then others change them, and then it does."""

    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)
        self.pipe = self.scratch / "gate"
        os.mkfifo(self.pipe)
        self.resources = self.resources_with_notifier("GatedNotifier")

    def start_and_hold(self, *words):
        words = ["--resources", self.resources, "--modules", *words]
        process = self.start(*words, NOTIFIER_GATE=str(self.pipe), NOTIFIER_JOURNAL=str(self.scratch / "journal"))
        return process, opened_gate(self.pipe, process)

    def edit_by_hand(self, place, **more):
        settings = self.tree.read_plist(SETTINGS)
        settings["Accounts"][place].update(more)
        self.tree.write_plist(SETTINGS, settings)

    def test_keep_what_each_changed_of_one_account(self):
        first, gate = self.start_and_hold("disable", "M1", "Notes")
        self.done("rename", "M1", "Work")
        self.edit_by_hand(0, Signature="Ines", Username="ines.b")
        os.close(gate)
        self.assert_done(first)
        account = changed(
            HOME_MAIL, DisplayName="Work", Signature="Ines", Username="ines.b", **{"Enabled Dataclasses": [MAIL]}
        )
        self.assertEqual([account, CLOUD, DIRECTORY], self.accounts())

    def test_keep_what_each_changed_of_different_accounts(self):
        first, gate = self.start_and_hold("rename", "M1", "Work")
        self.done("rename", "V1", "Cloud")
        self.edit_by_hand(2, Port=636)
        os.close(gate)
        self.assert_done(first)
        expected = [changed(HOME_MAIL, DisplayName="Work"), changed(CLOUD, DisplayName="Cloud"), changed(DIRECTORY, Port=636)]
        self.assertEqual(expected, self.accounts())

    def test_leave_one_value_to_whoever_saves_last(self):
        first, gate = self.start_and_hold("rename", "M1", "First")
        self.done("rename", "M1", "Second")
        os.close(gate)
        self.assert_done(first)
        self.assertEqual("First", self.accounts()[0]["DisplayName"])

    def test_keep_what_the_other_added_and_bring_nothing_back(self):
        first, gate = self.start_and_hold("rename", "M1", "Work")
        self.done("remove", "L1")
        self.done("add", "LDAP", "LDAPAccount", "Identifier=L2")
        os.close(gate)
        self.assert_done(first)
        added = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L2"}
        self.assertEqual([changed(HOME_MAIL, DisplayName="Work"), CLOUD, added], self.accounts())

    def test_say_that_the_account_is_gone_by_now(self):
        first, gate = self.start_and_hold("rename", "M1", "Work")
        self.done("remove", "M1")
        os.close(gate)
        _, errors = first.communicate(timeout=PATIENCE)
        self.assertEqual((3, "accountctl: no account has the identifier M1\n"), (first.returncode, errors))
        self.assertEqual([CLOUD, DIRECTORY], self.accounts())


class Twelve(AtOnce):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY)

    def assert_done_after_a_while(self, process):
        """It may have said for whom it waited."""
        output, errors = process.communicate(timeout=PATIENCE)
        self.assertRegex(f"{process.returncode} {errors}", r"^0 (accountctl: waiting for process \d+.*\n)*$")
        return output

    def test_that_add_leave_twelve_accounts_more(self):
        started = [self.start("add", "LDAP", "LDAPAccount", f"Username={number}") for number in range(12)]
        told = {self.assert_done_after_a_while(process).strip() for process in started}
        self.assertEqual(12, len(told))
        self.assertEqual({"M1", "V1", "L1", *told}, {each["Identifier"] for each in self.accounts()})
        self.assertEqual(15, len(self.accounts()))

    def test_that_change_the_children_of_one_account_keep_what_each_changed(self):
        started = [self.start("set", ("C1", "K1")[number % 2], f"Key{number}=set") for number in range(12)]
        for process in started:
            self.assert_done_after_a_while(process)
        calendar, mail = self.accounts()[1]["ChildAccounts"]
        self.assertEqual({f"Key{number}" for number in range(0, 12, 2)}, {key for key in calendar if "Key" in key})
        self.assertEqual({f"Key{number}" for number in range(1, 12, 2)}, {key for key in mail if "Key" in key})


class ARunningMigration(AtOnce):
    def test_is_waited_for_before_the_accounts_are_read(self):
        self.put(HOME_MAIL)
        with HeldLock(self.tree):
            waiting = self.start("list")
            with self.assertRaises(subprocess.TimeoutExpired):
                waiting.wait(timeout=0.5)
            self.put(changed(HOME_MAIL, DisplayName="Migrated"))
        self.assertIn("Migrated", self.assert_done(waiting))


def opened_gate(pipe, process):
    """The gate's other end, once the process waits at it."""
    deadline = time.monotonic() + PATIENCE
    while time.monotonic() < deadline and process.poll() is None:
        try:
            return os.open(pipe, os.O_WRONLY | os.O_NONBLOCK)
        except OSError as error:
            if error.errno != errno.ENXIO:
                raise
        time.sleep(0.01)
    raise AssertionError(f"the program did not come to the gate: {process.poll()}")


class HeldLock:
    """The device's migration lock, as another process that migrates holds it."""

    def __init__(self, device):
        self._path = device.path(MIGRATION_LOCK)

    def __enter__(self):
        self._path.parent.mkdir(exist_ok=True)
        self._file = os.open(self._path, os.O_RDONLY | os.O_CREAT, 0o644)
        fcntl.flock(self._file, fcntl.LOCK_EX)

    def __exit__(self, *_):
        os.close(self._file)


def end(process):
    if process.poll() is None:
        process.kill()
    process.wait()
    process.stdout.close()
    process.stderr.close()


if __name__ == "__main__":
    unittest.main()
