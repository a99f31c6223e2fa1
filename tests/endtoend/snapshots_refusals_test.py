"""What is refused of snapshots: one line, the documented exit status, and the device as it was."""

import os
import unittest

from device import LEGACY_MAIL, SETTINGS
from device_case import HOST
from snapshots_case import SnapshotsTest

BAD_NUMBERS = ["0", "-1", "x", "3x", "1.5", "99999999999999999999999"]


class WrongUse(SnapshotsTest):
    host = HOST

    def assert_wrong(self, message, *arguments):
        self.assert_refused(2, f"{message} (see --help)", self.run_host(*arguments))

    def test_what_needs_a_directory_without_one(self):
        self.assert_wrong("--restore needs --snapshots", "--restore", "000001-x")
        self.assert_wrong("--list-snapshots needs --snapshots", "--list-snapshots")
        self.assert_wrong("--keep needs --snapshots", "--keep", "3")

    def test_contradictory_options(self):
        snapshots = ("--snapshots", self.snapshots)
        both = "--restore and --list-snapshots exclude each other"
        self.assert_wrong(both, *snapshots, "--restore", "x", "--list-snapshots")
        for other in ("--list-snapshots", "--restore=x"):
            self.assert_wrong("--keep is for a run: only a run removes snapshots", *snapshots, "--keep", "3", other)

    def test_what_is_no_run_can_be_neither_rehearsed_nor_explained(self):
        snapshots = ("--snapshots", self.snapshots)
        for instead in (("--restore", "x"), ("--list-snapshots",)):
            for option in ("--dry-run", "--explain"):
                run = self.run_host(*snapshots, *instead, option)
                self.assertEqual((2, [], 1), (run.status, run.output, len(run.errors)))

    def test_what_was_explained_without_asking_for_an_explanation(self):
        self.assert_wrong("--of needs --explain", "--snapshots", self.snapshots, "--of", "latest")

    def test_a_number_of_snapshots_that_is_none(self):
        for text in BAD_NUMBERS:
            message = f"--keep needs a number of snapshots, at least 1: {text}"
            self.assert_wrong(message, "--snapshots", self.snapshots, f"--keep={text}")

    def test_a_listing_in_an_unknown_form(self):
        self.assert_wrong("--list-snapshots is followed by nothing or =json", "--list-snapshots=xml")

    def test_options_given_twice(self):
        self.assert_wrong("--keep is given twice", "--keep", "1", "--keep", "1")
        self.assert_wrong("--list-snapshots is given twice", "--list-snapshots", "--list-snapshots")
        self.assertFalse(self.snapshots.exists())


class Directories(SnapshotsTest):
    host = HOST

    def assert_untouched(self, status, message, device, run):
        self.assertEqual((status, [f"migration-host: {message}"]), (run.status, run.errors))
        self.assertEqual(self.before, self.undoable(device))

    def refused(self, message):
        device = self.old_device()
        self.before = self.undoable(device)
        run = self.migrate(device)
        self.assert_untouched(2, f"{self.snapshots} cannot hold snapshots: {message}", device, run)
        self.assertEqual([], run.console())

    def test_one_that_others_may_write(self):
        self.snapshots.mkdir()
        self.snapshots.chmod(0o770)
        self.refused("others may write it")

    def test_a_link(self):
        (self.scratch / "elsewhere").mkdir(mode=0o700)
        self.snapshots.symlink_to(self.scratch / "elsewhere")
        self.refused("it is no directory")

    def test_a_file(self):
        self.snapshots.write_text("")
        self.refused("it is no directory")

    def test_one_that_others_could_exchange(self):
        above = self.scratch / "above"
        above.mkdir()
        above.chmod(0o777)
        self.snapshots = above / "snapshots"
        self.snapshots.mkdir(mode=0o700)
        self.refused(f"others could exchange it, by way of {above}")

    @unittest.skipUnless(os.geteuid() == 0, "needs to give a directory away")
    def test_one_of_somebody_else(self):
        self.snapshots.mkdir(mode=0o700)
        os.chown(self.snapshots, 4711, 4711)
        self.refused("it belongs to somebody else")

    @unittest.skipUnless(os.geteuid() == 0, "needs to give a link away")
    def test_one_behind_a_link_of_somebody_else(self):
        (self.scratch / "real").mkdir(mode=0o700)
        link = self.scratch / "link"
        link.symlink_to(self.scratch / "real")
        os.lchown(link, 4711, 4711)
        self.snapshots = link / "snapshots"
        (self.scratch / "real" / "snapshots").mkdir(mode=0o700)
        self.refused(f"others could exchange it, by way of {link}")

    def test_a_missing_one_holds_nothing_to_restore_or_list(self):
        message = f"{self.snapshots} cannot hold snapshots: it does not exist"
        self.assert_refused(2, message, self.restore(self.old_device(), "000001-x"))
        self.assert_refused(2, message, self.run_host("--list-snapshots", "--snapshots", self.snapshots))


class Snapshots(SnapshotsTest):
    host = HOST

    def migrated(self):
        device = self.old_device()
        self.migrate(device)
        self.after = self.undoable(device)
        return device, self.identifiers()[0]

    def assert_not_restored(self, status, message, device, run):
        self.assert_refused(status, message, run)
        self.assertEqual(self.after, self.undoable(device))

    def test_an_unknown_identifier(self):
        device, _ = self.migrated()
        for name in ("000009-20260101T000000Z", "../etc", "manifest", "lock"):
            message = f"there is no snapshot {name} in {self.snapshots}"
            self.assert_not_restored(2, message, device, self.restore(device, name))

    def test_another_device(self):
        _, identifier = self.migrated()
        other = self.old_device("current")
        before = self.undoable(other)
        run = self.restore(other, identifier)
        self.assertEqual(2, run.status)
        self.assertRegex(run.errors[0], "belongs to another device: --root .*/legacy-files --home ")
        self.assertEqual(2, self.migrate(other).status)
        self.assertEqual(before, self.undoable(other))

    def test_a_damaged_copy(self):
        device, identifier = self.migrated()
        copy = self.snapshots / identifier / "1"
        copy.write_bytes(copy.read_bytes()[:-1] + b"\0")
        message = f"the copy of {device.path(SETTINGS)} in snapshot {identifier} is damaged"
        self.assert_not_restored(5, message, device, self.restore(device, identifier))

    def test_a_missing_copy(self):
        device, identifier = self.migrated()
        (self.snapshots / identifier / "1").unlink()
        run = self.restore(device, identifier)
        self.assertEqual((5, self.after), (run.status, self.undoable(device)))
        self.assertEqual(1, len(run.errors))

    def test_a_damaged_manifest(self):
        device, identifier = self.migrated()
        manifest = self.snapshots / identifier / "manifest"
        whole = manifest.read_bytes()
        for damage in (b"", whole[:-20], whole.replace(b'"0640"', b'"0666"'), b"{}", b"\xff"):
            manifest.write_bytes(damage)
            run = self.restore(device, identifier)
            self.assert_not_restored(5, f"the manifest of snapshot {identifier} is damaged", device, run)
            self.assertEqual([{"id": identifier, "state": "damaged", "damage": []}], self.list())

    def test_a_damaged_snapshot_hinders_no_run(self):
        device, identifier = self.migrated()
        (self.snapshots / identifier / "manifest").write_text("{}")
        self.edit(device, "new")
        self.assertEqual(0, self.migrate(device, "--keep=1").status)
        self.assertEqual(2, len(self.list()))

    def test_a_plug_in_that_does_not_tell_its_files(self):
        run = self.run_directed("succeed", "--snapshots", self.snapshots)
        message = "the plug-in does not tell which files it changes, so no snapshot can be taken"
        self.assert_refused(5, message, run)


if __name__ == "__main__":
    unittest.main()
