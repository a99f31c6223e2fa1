"""The real host killed at work with snapshots on, and what the next run makes of it."""

import os
import signal
import subprocess
import unittest

from device import LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, TEMPORARY
from legacy_case import HOST, SENTINEL
from mortal_case import MORTAL, MortalCase

STRIDE = 1 if "EVERY_POINT" in os.environ else 4
VERSION = 3  # whose chain saves as it goes, so that a file looks current before the run has ended


class Deaths(MortalCase):
    def setUp(self):
        super().setUp()
        self.with_snapshots = ()

    def old_device(self):
        device = self.legacy_device(version=VERSION)
        self.with_snapshots = ("--snapshots", device.root.with_name(device.root.name + ".snapshots"))
        return device

    def snapshots(self):
        path = self.with_snapshots[1]
        return sorted(each for each in os.listdir(path) if each[0].isdigit()) if path.exists() else []

    def undisturbed(self):
        device = self.old_device()
        run, changes = self.run_until(device, 0, *self.with_snapshots)
        self.assertEqual(0, run.status, run.errors)
        return device, changes

    def killed_before(self, change):
        device = self.old_device()
        run, _ = self.run_until(device, change, *self.with_snapshots)
        self.assertEqual(-signal.SIGKILL, run.status, f"before change {change}")
        return device

    def outcome(self, device):
        """What stands where, and the accounts; a device keeps nothing else of a run."""
        return set(device.entries()), device.read_plist(SETTINGS)

    def change_of(self, verb, path):
        return self.undisturbed()[1].index((verb, path)) + 1

    def test_a_run_killed_anywhere_is_taken_back_and_ends_like_an_undisturbed_one(self):
        reference, changes = self.undisturbed()
        expected = self.outcome(reference)
        self.assertGreater(len(changes), 20)
        for change in range(1, len(changes) + 1, STRIDE):
            with self.subTest(before=changes[change - 1]):
                device = self.killed_before(change)
                run = device.migrate(HOST, *self.with_snapshots)
                self.assertEqual(0, run.status, run.errors)
                self.assertEqual(expected, self.outcome(device))
                self.assertEqual("kept", run.result()["verdict"])
                self.assertLessEqual(len(self.snapshots()), 2)

    def test_the_next_run_says_that_it_takes_the_device_back(self):
        device = self.killed_before(self.change_of("remove", LEGACY_EXCHANGE))
        (snapshot,) = self.snapshots()
        run = device.migrate(HOST, *self.with_snapshots)
        self.assertIn(f"A run died; the device goes back to snapshot {snapshot}", run.console())
        self.assertEqual([snapshot], self.snapshots(), "the state before the first attempt stays the one snapshot")

    def test_what_somebody_edited_after_the_death_is_kept_and_said_so(self):
        device = self.killed_before(self.change_of("remove", LEGACY_MAIL))
        edited = device.read_plist(SETTINGS)
        edited["Accounts"].append({"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "edited"})
        device.write_plist(SETTINGS, edited)
        run = device.migrate(HOST, *self.with_snapshots)
        said = f"{device.path(SETTINGS)} was changed by somebody else meanwhile and stays as it is"
        self.assertIn(said, run.console())
        self.assertEqual(0, run.status)
        found = [each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]]
        self.assertIn("edited", found)
        self.assertEqual(len(found), len(set(found)))
        self.assertEqual(2, len(self.snapshots()))

    def test_a_damaged_snapshot_of_a_dead_run_lets_no_run_begin(self):
        device = self.killed_before(self.change_of("remove", LEGACY_MAIL))
        before = device.entries()
        (snapshot,) = self.snapshots()
        copy = self.with_snapshots[1] / snapshot / "1"
        copy.write_bytes(b"damaged")
        run = device.migrate(HOST, *self.with_snapshots)
        line = f"migration-host: the copy of {device.path(SETTINGS)} in snapshot {snapshot} is damaged"
        self.assertEqual((5, line), (run.status, run.errors[-1]))
        self.assertEqual(before, device.entries())

    def test_no_temporary_file_of_a_dead_run_stays(self):
        first = self.undisturbed()[1].index(("rename", SETTINGS)) + 1
        device = self.killed_before(first)
        self.assertEqual(1, len(list(device.path(TEMPORARY).iterdir())))
        device.migrate(HOST, *self.with_snapshots)
        self.assertEqual([], list(device.path(TEMPORARY).iterdir()))

    def test_a_half_made_sentinel_does_not_cost_the_legacy_files(self):
        device = self.killed_before(self.change_of("remove", LEGACY_EXCHANGE))
        device.write(SENTINEL, "Old Acc")
        run = device.migrate(HOST, *self.with_snapshots)
        self.assertIn("Migrating accounts", run.console())
        self.assertIn("E1", [each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]])

    @unittest.skipUnless(os.getuid() == 0, "only root can give a file away")
    def test_a_sentinel_whose_name_a_power_cut_left_to_a_file_of_the_users_does_not_cost_the_legacy_files(self):
        device = self.killed_before(self.change_of("remove", LEGACY_EXCHANGE))
        device.write(SENTINEL, device.read(SETTINGS))
        os.chown(device.path(SENTINEL), 501, 501)
        run = device.migrate(HOST, *self.with_snapshots)
        self.assertEqual("kept", run.result()["verdict"], run.errors)
        self.assertIn("E1", [each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]])
        self.assertFalse(device.path(SENTINEL).exists())

    def test_what_a_sentinel_of_unknown_origin_cost_comes_back_and_is_converted_once_that_is_removed(self):
        device = self.old_device()
        device.write(SENTINEL, "")
        self.assertEqual("lost", device.migrate(HOST, *self.with_snapshots).result()["verdict"])
        undo = device.migrate(HOST, *self.with_snapshots, "--undo")
        self.assertEqual((0, True, True), (undo.status, device.path(SENTINEL).exists(), device.path(LEGACY_MAIL).exists()))
        device.path(SENTINEL).unlink()
        self.assertEqual("kept", device.migrate(HOST, *self.with_snapshots).result()["verdict"])
        self.assertLessEqual({"E1", "M1"}, {each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]})

    def test_a_second_host_waits_for_the_first_with_the_same_directory(self):
        _, changes = self.undisturbed()
        device = self.old_device()
        stop = changes.index(("remove", LEGACY_MAIL)) + 1
        stopped = self.mortality(stop, signal.SIGSTOP)
        first = self.start(device, "--plugin", MORTAL, *self.with_snapshots, environment=stopped)
        self.assertTrue(os.WIFSTOPPED(os.waitpid(first.pid, os.WUNTRACED)[1]))
        second = self.start(device, *self.with_snapshots)
        with self.assertRaises(subprocess.TimeoutExpired):
            second.wait(timeout=0.5)
        first.kill()
        self.assertEqual(0, second.wait(timeout=60))
        self.assertFalse(device.path(LEGACY_MAIL).exists())


if __name__ == "__main__":
    unittest.main()
