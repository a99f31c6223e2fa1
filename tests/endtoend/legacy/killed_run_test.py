"""The real host killed at work without snapshots: that steps may be missing is told, and the way back is kept."""

import os
import signal
import subprocess
import unittest

from device import CURRENT_VERSION, SETTINGS, SETTINGS_COPY, TEMPORARY
from legacy_case import HOST
from mortal_case import MortalCase

ACCOUNTCTL = os.environ["ACCOUNTCTL"]
MARK = TEMPORARY + "/account-migration-under-way"
KEPT = SETTINGS_COPY + ".interrupted-1"
VERSION = 3  # whose chain saves as it goes, so that a file looks current before the run has ended
GONE = "the run before this one was killed while it saved: steps of it may be missing, and are not taken up again"


class KilledRuns(MortalCase):
    def saves_of(self, device):
        """The numbers of the changes that put a settings file in place."""
        _, changes = self.run_until(device, 0)
        return [number for number, change in enumerate(changes, 1) if change == ("rename", SETTINGS)]

    def old_device(self):
        return self.device(version=VERSION, accounts=[{"Type": "Gmail", "Class": "GmailAccount", "Identifier": "G",
                                                      "Username": "g@example.net"}])

    def killed_before(self, change, device=None):
        device = device or self.old_device()
        run, _ = self.run_until(device, change)
        self.assertEqual(-signal.SIGKILL, run.status)
        return device

    def killed_between_saves(self):
        saves = self.saves_of(self.old_device())
        self.assertGreater(len(saves), 1)
        return self.killed_before(saves[1])

    def verify(self, device):
        ended = subprocess.run([ACCOUNTCTL, "--root", device.root, "verify"], capture_output=True, text=True, check=False)
        return ended.returncode, ended.stdout

    def test_between_their_saves_leave_a_mark_that_verify_tells_of(self):
        device = self.killed_between_saves()
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])
        status, said = self.verify(device)
        self.assertEqual(5, status)
        self.assertIn(f"{device.path(MARK)}: ", said)
        self.assertIn("a run was killed while it worked: version steps of it may be missing", said)

    def test_are_told_by_the_next_run_which_keeps_the_settings_from_before(self):
        device = self.killed_between_saves()
        before = device.read(SETTINGS_COPY)
        run = device.migrate(HOST)
        self.assertEqual((0, before), (run.status, device.read(KEPT)))
        self.assertIn(f"migration-host: {GONE}; the settings from before it are kept as {device.path(KEPT)}", run.errors)
        self.assertFalse(device.path(MARK).exists())
        self.assertIn("a run kept it", self.verify(device)[1])

    def test_are_told_also_where_the_next_run_takes_snapshots(self):
        device = self.killed_between_saves()
        run = device.migrate(HOST, "--snapshots", self.scratch / "snapshots")
        self.assertIn(f"migration-host: {GONE}; the settings from before it are kept as {device.path(KEPT)}", run.errors)

    def test_end_like_undisturbed_ones_once_what_was_kept_is_put_back(self):
        reference = self.old_device()
        self.assertEqual(0, reference.migrate(HOST).status)
        device = self.killed_between_saves()
        device.migrate(HOST)
        device.path(KEPT).rename(device.path(SETTINGS))
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertEqual(reference.read_plist(SETTINGS), device.read_plist(SETTINGS))
        self.assertEqual((0, "no findings"), (self.verify(device)[0], self.verify(device)[1].strip().rsplit(", ")[-1]))

    def test_before_their_first_save_leave_nothing_to_be_told(self):
        device = self.killed_before(self.saves_of(self.old_device())[0])
        run = device.migrate(HOST)
        self.assertNotIn(GONE, "\n".join(run.errors))
        self.assertEqual([], [name for name in os.listdir(device.path(TEMPORARY)) if "under-way" in name])
        self.assertFalse(device.path(KEPT).exists())

    def test_that_are_killed_again_are_kept_once_each(self):
        device = self.killed_between_saves()
        first = device.read(SETTINGS_COPY)
        device.migrate(HOST)
        device.write_plist(SETTINGS, {"Version": VERSION, "Accounts": []})
        self.killed_before(self.saves_of(self.old_device())[1], device)
        device.migrate(HOST)
        self.assertEqual(first, device.read(KEPT))
        self.assertEqual(VERSION, device.read_plist(SETTINGS_COPY + ".interrupted-2")["Version"])

    def test_of_devices_without_a_settings_file_are_told_without_a_copy(self):
        device = self.legacy_device(version=None)
        self.killed_before(self.saves_of(self.legacy_device(version=None))[1], device)
        run = device.migrate(HOST)
        self.assertIn(f"migration-host: {GONE}", run.errors)
        self.assertFalse(device.path(KEPT).exists())

    def test_are_foretold_by_a_rehearsal_that_leaves_the_mark(self):
        device = self.killed_between_saves()
        self.assertIn(GONE, "\n".join(device.migrate(HOST, "--dry-run").errors))
        self.assertEqual((True, False), (device.path(MARK).exists(), device.path(KEPT).exists()))


class OtherRuns(MortalCase):
    def test_that_end_leave_no_mark(self):
        device = self.legacy_device(version=VERSION)
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertFalse(device.path(MARK).exists())

    def test_on_a_current_device_set_none(self):
        device = self.device()
        run, _ = self.run_until(device, 1)
        self.assertEqual((-signal.SIGKILL, False), (run.status, device.path(MARK).exists()))

    def test_find_no_mark_in_what_is_no_file(self):
        device = self.device()
        device.path(MARK).mkdir(parents=True)
        self.assertEqual([], device.migrate(HOST).errors)
        self.assertTrue(device.path(MARK).is_dir())


if __name__ == "__main__":
    unittest.main()
