"""A run that is killed before one change to the device's files, and the run after it."""

import os
import signal
import subprocess
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY, TEMPORARY
from legacy_case import HOST, SENTINEL, STANDING, delivery_record, exchange_record, mail_record
from mortal_case import MORTAL, MortalCase

ACCOUNTS = [
    STANDING,
    exchange_record("E1"),
    delivery_record("D1"),
    mail_record("M1"),
    mail_record("G1", "GmailAccount", "Gmail", "Gmail"),
]


class InterruptionTest(MortalCase):
    def undisturbed(self):
        device = self.legacy_device()
        run, changes = self.run_until(device, 0)
        self.assertEqual(0, run.status, run.errors)
        return device, changes

    def interrupted(self, change):
        device = self.legacy_device()
        run, _ = self.run_until(device, change)
        self.assertEqual(-signal.SIGKILL, run.status, f"before change {change}")
        return device

    def without_copy(self, device):
        return {path: entry for path, entry in device.entries().items() if path != SETTINGS_COPY}

    def test_deletion_makes_its_changes_in_their_order(self):
        _, changes = self.undisturbed()
        start = changes.index(("create", SENTINEL))
        self.assertEqual(
            [("create", SENTINEL), ("remove", LEGACY_EXCHANGE), ("remove", LEGACY_MAIL), ("remove", SENTINEL)],
            changes[start : start + 4],
        )

    def test_deletion_that_was_interrupted_anywhere_ends_as_an_undisturbed_one(self):
        reference, changes = self.undisturbed()
        first = changes.index(("create", SENTINEL)) + 1
        for change in range(first, len(changes) + 1):
            with self.subTest(before=changes[change - 1]):
                device = self.interrupted(change)
                saved = device.read(SETTINGS)
                self.assertEqual(0, device.migrate(HOST).status)
                self.assertEqual(self.without_copy(reference), self.without_copy(device))
                self.assertEqual(saved, device.read(SETTINGS_COPY), "the second run found what the first had saved")

    def test_second_run_after_an_interrupted_deletion_only_finishes_that(self):
        _, changes = self.undisturbed()
        first = changes.index(("create", SENTINEL)) + 1
        for change, remaining in ((first + 1, 2), (first + 2, 1), (first + 3, 0)):
            device = self.interrupted(change)
            left = [path for path in (LEGACY_EXCHANGE, LEGACY_MAIL) if device.path(path).exists()]
            self.assertEqual(remaining, len(left))
            run, made = self.run_until(device, 0)
            self.assertEqual(0, run.status)
            self.assertNotIn("Saving all accounts", run.messages())
            self.assertEqual(("remove", SENTINEL), made[-1])

    def test_no_interruption_of_a_run_loses_or_doubles_an_account(self):
        _, changes = self.undisturbed()
        self.assertGreater(len(changes), 10)
        for change in range(1, len(changes) + 1):
            with self.subTest(before=changes[change - 1]):
                device = self.interrupted(change)
                self.assertEqual(0, device.migrate(HOST).status)
                self.assertEqual({"Accounts": ACCOUNTS, "Version": CURRENT_VERSION}, device.read_plist(SETTINGS))
                found = {path for path, entry in device.entries().items() if entry.kind != "directory"}
                left = {path for path in found if path.startswith("var/") and not path.startswith(TEMPORARY)}
                self.assertEqual({SETTINGS, SETTINGS_COPY}, left)

    def test_no_interruption_makes_a_verdict_wrong(self):
        _, changes = self.undisturbed()
        for change in range(1, len(changes) + 1):
            with self.subTest(before=changes[change - 1]):
                self.assertEqual("kept", self.interrupted(change).migrate(HOST).result()["verdict"])

    def test_a_deletion_that_an_earlier_run_began_spares_accounts_that_were_not_saved(self):
        device = self.legacy_device()
        device.write(SENTINEL, "")
        run = device.migrate(HOST)
        kept = {name: str(device.path(file + ".unsaved-1")) for file, name in ((LEGACY_EXCHANGE, "E1"), (LEGACY_MAIL, "M1"))}
        lost = {each["identifier"]: (each["code"], each["where"]) for each in run.result()["lost"]}
        self.assertEqual({"E1", "D1", "M1", "G1"}, set(lost))
        self.assertEqual({name: ("not-saved", where) for name, where in kept.items()}, {name: lost[name] for name in kept})
        self.assertTrue(all(os.path.exists(where) for where in kept.values()))

    def test_second_run_waits_for_the_first_and_goes_on_when_that_is_killed(self):
        reference, changes = self.undisturbed()
        device = self.legacy_device()
        stop = changes.index(("create", SENTINEL)) + 2
        first = self.start(device, "--plugin", MORTAL, environment=self.mortality(stop, signal.SIGSTOP))
        self.assertTrue(os.WIFSTOPPED(os.waitpid(first.pid, os.WUNTRACED)[1]))
        second = self.start(device)
        with self.assertRaises(subprocess.TimeoutExpired):
            second.wait(timeout=0.5)
        first.kill()
        self.assertEqual(0, second.wait(timeout=60))
        self.assertEqual(self.without_copy(reference), self.without_copy(device))


if __name__ == "__main__":
    unittest.main()
