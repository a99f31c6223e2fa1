"""Snapshots as an integrator uses them: what is kept, how many, and what a restore brings back."""

import unittest

from device import LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
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
        for _ in range(7):
            self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(["000003", "000004", "000005", "000006", "000007"], [each[:6] for each in self.identifiers()])
        self.migrate(device, "--keep", "2")
        self.assertEqual(["000007", "000008"], [each[:6] for each in self.identifiers()])

    def test_the_list_is_a_table_for_people(self):
        self.migrate(self.old_device())
        run = self.run_host("--list-snapshots", "--snapshots", self.snapshots)
        self.assertEqual(["Snapshot", "Taken", "Version", "State", "Files"], run.output[0].split())
        self.assertRegex(run.output[1], r"^000001-\S+Z  \d{4}-\S+Z +3 +migrated +com\.vorlix\.accountsettings\.plist ")

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
        """A run whose settings have no owner to go to, and which deletes the legacy files all the same."""
        device = self.old_device()
        device.write("etc/group", "wheel:*:0:root\n")
        return device, self.migrate(device)

    def test_the_host_says_which_files_went_and_how_they_come_back(self):
        device, run = self.failed_run()
        (identifier,) = self.identifiers()
        self.assertEqual(0, run.status)
        said = [line for line in run.errors if line.startswith("migration-host: ")]
        self.assertIn("THE SETTINGS WERE NOT SAVED", said[0])
        self.assertEqual([f"migration-host:   {device.path(path)}" for path in (LEGACY_EXCHANGE, LEGACY_MAIL)], said[1:3])
        command = said[3].split("migration-host --restore ")[1]
        self.assertEqual(0, self.run_host("--restore", *command.split()).status)
        self.assertTrue(device.path(LEGACY_MAIL).exists())
        self.assertIn(identifier, command)

    def test_that_snapshot_is_kept_beyond_the_count(self):
        device, _ = self.failed_run()
        for _ in range(3):
            self.migrate(device, "--keep", "1")
        self.assertEqual([("000001", True), ("000004", False)], [(each["id"][:6], each["kept"]) for each in self.list()])

    def test_a_failed_save_without_legacy_files_is_nothing_to_shout_about(self):
        device = self.old_device()
        device.write("etc/group", "wheel:*:0:root\n")
        for path in (LEGACY_EXCHANGE, LEGACY_MAIL):
            device.path(path).unlink()
        run = self.migrate(device)
        self.assertIn("Failed to save accounts to filesystem.", run.messages())
        self.assertEqual([], [line for line in run.errors if "NOT SAVED" in line])


if __name__ == "__main__":
    unittest.main()
