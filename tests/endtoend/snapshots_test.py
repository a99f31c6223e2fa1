"""Snapshots as an integrator uses them: what is kept, how many, and what a restore brings back."""

import os
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from device_case import HOST
from snapshots_case import UNDOABLE, SnapshotsTest

class Keeping(SnapshotsTest):
    host = HOST

    def test_a_run_without_snapshots_makes_no_directory(self):
        device = self.old_device()
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertFalse(self.snapshots.exists())

    def test_a_run_with_snapshots_ends_like_one_without(self):
        plain, watched = self.old_device("first-generation"), self.old_device("current")
        self.assertEqual(0, plain.migrate(HOST).status)
        self.assertEqual(0, self.migrate(watched).status)
        self.assertEqual(set(plain.entries()), set(watched.entries()))
        self.assertEqual(plain.read_plist(SETTINGS), watched.read_plist(SETTINGS))

    def test_the_directory_is_made_for_its_owner_alone(self):
        self.migrate(self.old_device())
        self.assertEqual(0o40700, self.snapshots.stat().st_mode)
        for path in self.snapshots.rglob("*"):
            self.assertEqual(0, path.stat().st_mode & 0o022, path)

    def test_a_snapshot_tells_what_it_is(self):
        device = self.old_device()
        self.migrate(device)
        (snapshot,) = self.list()
        self.assertEqual(str(device.root), snapshot["root"])
        self.assertEqual((3, "run", "migrated", False), tuple(snapshot[k] for k in ("dataVersion", "reason", "outcome", "kept")))
        self.assertEqual([str(device.path(path)) for path in UNDOABLE], [each["path"] for each in snapshot["files"]])
        settings = snapshot["files"][0]
        self.assertEqual(("settings", "file", "0640"), tuple(settings[key] for key in ("part", "state", "mode")))
        self.assertEqual([1_234_567_890, 123_456_789], settings["modified"])

    def test_only_the_newest_are_kept_by_count(self):
        device = self.old_device()
        for number in range(7):
            self.edit(device, f"new {number}")
            self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(["000003", "000004", "000005", "000006", "000007"], [each[:6] for each in self.identifiers()])
        self.edit(device, "the last")
        self.migrate(device, "--keep", "2")
        self.assertEqual(["000007", "000008"], [each[:6] for each in self.identifiers()])

    def test_the_list_is_a_table_for_people(self):
        self.migrate(self.old_device())
        run = self.run_host("--list-snapshots", "--snapshots", self.snapshots)
        self.assertEqual(["Snapshot", "Taken", "Before", "Version", "State", "Files"], run.output[0].split())
        self.assertRegex(run.output[1], r"^000001-\S+Z  \d{4}-\S+Z  run +3 +migrated +com\.vorlix\.accountsettings\.plist ")

    def test_an_empty_directory_lists_nothing(self):
        self.snapshots.mkdir(mode=0o700)
        run = self.run_host("--list-snapshots", "--snapshots", self.snapshots)
        self.assertEqual((0, [f"no snapshots in {self.snapshots}"]), (run.status, run.output))
        self.assertEqual([], self.list())


class Restoring(SnapshotsTest):
    host = HOST

    def test_a_restore_brings_every_file_back_exactly(self):
        device = self.old_device()
        before = self.undoable(device)
        self.assertEqual(0, self.migrate(device).status)
        self.assertNotEqual(before, self.undoable(device))
        run = self.restore(device, self.identifiers()[0])
        self.assertEqual((0, []), (run.status, run.errors))
        self.assertEqual(before, self.undoable(device))

    def test_a_restored_device_migrates_again_as_before(self):
        device = self.old_device()
        self.migrate(device)
        migrated = device.read_plist(SETTINGS)
        self.restore(device, self.identifiers()[0])
        self.assertEqual(0, self.migrate(device).status)
        again = device.read_plist(SETTINGS)
        self.assertEqual([each["Type"] for each in migrated["Accounts"]], [each["Type"] for each in again["Accounts"]])

    def test_a_restore_can_be_undone(self):
        device = self.old_device()
        self.migrate(device)
        migrated = self.undoable(device)
        first = self.identifiers()[0]
        told = self.restore(device, first).output
        second = self.identifiers()[1]
        self.assertEqual([f"restored snapshot {first}; the state before it is snapshot {second}"], told)
        self.assertEqual(0, self.restore(device, second).status)
        self.assertEqual(migrated, self.undoable(device))

    def test_a_restore_replaces_what_was_edited_since(self):
        device = self.old_device()
        before = self.undoable(device)
        self.migrate(device)
        device.write(SETTINGS, "edited")
        self.assertEqual(0, self.restore(device, self.identifiers()[0]).status)
        self.assertEqual(before, self.undoable(device))

    def test_records_of_the_run_stay(self):
        device = self.old_device()
        self.migrate(device)
        self.restore(device, self.identifiers()[0])
        self.assertTrue(device.path(SETTINGS_COPY).exists())


class FailedSaves(SnapshotsTest):
    host = HOST

    def failed_run(self):
        """A run whose settings have no owner to go to, and whose plug-in deletes the legacy files all the same."""
        device = self.old_device()
        device.write("etc/group", "wheel:*:0:root\n")
        before = self.undoable(device)
        return device, before, self.migrate(device)

    def test_are_rolled_back_whole(self):
        device, before, run = self.failed_run()
        self.assertEqual(6, run.status)
        self.assertIn("Failed to save accounts to filesystem.", run.messages())
        said = "migration-host: the accounts could not be saved; the device is as it was before the run"
        self.assertIn(said, run.errors)
        self.assertEqual(before, self.undoable(device))

    def test_leave_no_snapshot_since_nothing_is_changed(self):
        self.failed_run()
        self.assertEqual([], self.list())
        self.assertFalse((self.snapshots / "running").exists())

    def test_are_made_good_by_the_next_run(self):
        device, _, _ = self.failed_run()
        device.set_mobile(os.getuid(), os.getgid())
        self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])
        self.assertFalse(device.path(LEGACY_MAIL).exists())


if __name__ == "__main__":
    unittest.main()
