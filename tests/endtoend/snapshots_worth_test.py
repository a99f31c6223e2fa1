"""Which snapshots stay and why, how one is named, and what is told of it."""

import hashlib
import json
import os
import unittest

from device import LEGACY_MAIL, SETTINGS
from device_case import HOST
from snapshots_case import SnapshotsTest


class Worth(SnapshotsTest):
    host = HOST

    def test_a_run_that_changed_nothing_leaves_no_snapshot(self):
        device = self.old_device()
        self.migrate(device)
        first = self.identifiers()
        for _ in range(6):
            self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(first, self.identifiers())
        self.assertFalse((self.snapshots / "running").exists())

    def unreadable(self):
        device = self.old_device()
        device.write(SETTINGS, "<plist><dict><key>Accounts")
        return device, self.migrate(device)

    def test_settings_that_could_not_be_read_are_kept_until_they_are_released(self):
        device, run = self.unreadable()
        self.assertEqual(0, run.status)
        (snapshot,) = self.list()
        self.assertTrue(snapshot["kept"])
        self.assertRegex(snapshot["keptFor"][0], r"^the settings file could not be read, .* \[unreadable-settings-file\]$")
        self.assertIn(f"migration-host:   {snapshot['keptFor'][0]}", run.errors)
        for number in range(3):
            self.edit(device, f"new {number}")
            self.migrate(device, "--keep=1")
        self.assertEqual([snapshot["id"]], self.identifiers()[:1])
        self.assertEqual(0, self.work(device, "--release", snapshot["id"]).status)
        self.edit(device, "the last")
        self.migrate(device, "--keep=1")
        self.assertNotIn(snapshot["id"], self.identifiers())

    def test_settings_of_a_newer_version_are_kept(self):
        device = self.old_device()
        device.write_plist(SETTINGS, {"Version": 13, "Accounts": [], "More": "of it"})
        self.assertEqual(0, self.migrate(device).status)
        [[kept]] = [each["keptFor"] for each in self.list()]
        self.assertRegex(kept, r"^the settings file is of a newer version, .*: version 13 \[newer-settings-file\]$")

    def test_the_list_tells_why_one_is_kept(self):
        device, _ = self.unreadable()
        lines = self.work(device, "--list-snapshots").output
        self.assertIn(f"{self.identifiers()[0]} is kept: the settings file could not be read, ", "\n".join(lines))

    def test_the_list_tells_of_damaged_copies(self):
        device = self.old_device()
        self.migrate(device)
        identifier = self.identifiers()[0]
        (self.snapshots / identifier / "1").write_bytes(b"damaged")
        (snapshot,) = self.list()
        self.assertEqual(("damaged", [str(device.path(SETTINGS))]), (snapshot["state"], snapshot["damage"]))
        lines = self.work(device, "--list-snapshots").output
        self.assertIn(f"{identifier} has a damaged copy of {device.path(SETTINGS)}", lines)

    def test_no_more_than_twenty_are_kept_and_that_is_said(self):
        device = self.old_device()
        for number in range(21):
            device.write(SETTINGS, f"<plist>{number}")
            run = self.migrate(device)
        self.assertEqual(20, sum(each["kept"] for each in self.list()))
        self.assertIn("is kept no longer: 20 newer ones are", "\n".join(run.errors))

    def test_one_that_is_not_kept_cannot_be_released(self):
        device = self.old_device()
        self.migrate(device)
        identifier = self.identifiers()[0]
        message = f"snapshot {identifier} is not kept beyond the count"
        self.assert_refused(2, message, self.work(device, "--release", identifier))


class Names(SnapshotsTest):
    host = HOST

    def test_undo_goes_back_to_before_the_last_run_that_changed_something(self):
        device = self.old_device()
        before = self.undoable(device)
        for _ in range(3):
            self.migrate(device)
        self.assertEqual(0, self.work(device, "--undo").status)
        self.assertEqual(before, self.undoable(device))

    def test_undo_without_a_run_has_nothing_to_go_back_to(self):
        self.snapshots.mkdir(mode=0o700)
        self.assert_refused(2, "no snapshot is from before a run", self.work(self.old_device(), "--undo"))

    def test_latest_and_beginnings_name_a_snapshot(self):
        device = self.old_device()
        before = self.undoable(device)
        self.migrate(device)
        self.assertEqual(0, self.work(device, "--restore", "latest").status)
        self.assertEqual(before, self.undoable(device))
        self.assertEqual(0, self.work(device, "--restore", "000002").status)
        self.assertNotEqual(before, self.undoable(device))

    def test_a_beginning_of_more_than_one_names_none(self):
        device = self.old_device()
        self.migrate(device)
        self.work(device, "--undo")
        first, second = self.identifiers()
        message = f"more than one snapshot begins with 00000: {first} and {second}"
        self.assert_refused(2, message, self.work(device, "--restore", "00000"))


class Explanations(SnapshotsTest):
    host = HOST

    def test_the_run_of_a_snapshot_is_explained_from_it(self):
        device = self.old_device()
        said = self.migrate(device, "--explain").output
        identifier = self.identifiers()[0]
        self.assertEqual(said, self.work(device, "--explain", "--of", identifier).output)
        told = json.loads("\n".join(self.work(device, "--explain=json", "--of", "latest").output))
        self.assertEqual((True, False), (told["result"]["success"], told["rehearsal"]))

    def test_a_restore_has_none(self):
        device = self.old_device()
        self.migrate(device)
        self.work(device, "--undo")
        run = self.work(device, "--explain", "--of=latest")
        self.assert_refused(2, f"snapshot {self.identifiers()[-1]} has no explanation", run)

    def test_no_credential_is_in_it(self):
        device = self.old_device()
        device.write_plist(SETTINGS, {"Version": 3, "Accounts": [
            {"Type": "LDAP", "Class": "L", "Identifier": "L1", "Password": "hunter2"}]})
        self.migrate(device)
        for path in self.snapshots.rglob("explanation*"):
            self.assertNotIn("hunter2", path.read_text())


class IfNeeded(SnapshotsTest):
    """The boot unit's way: at every start, and a run only where there is something to do."""

    host = HOST

    def start(self, device):
        return self.migrate(device, "--if-needed")

    def assert_runs(self, device):
        self.assertIn("result", [event["event"] for event in self.start(device).events])

    def assert_ends_at_once(self, device):
        before = every_detail(self.scratch)
        run = self.work(device, "--if-needed", "--trace", self.scratch / "no-such-trace")
        self.assertEqual((0, [], []), (run.status, run.output, run.errors))
        self.assertEqual(before, every_detail(self.scratch))

    def test_three_starts_in_a_row_are_one_run(self):
        device = self.old_device()
        self.assert_runs(device)
        first = self.identifiers()
        for _ in range(2):
            self.assert_ends_at_once(device)
        self.assertEqual(first, self.identifiers())

    def test_another_release_of_the_system_runs_again(self):
        device = self.old_device()
        device.write("etc/os-release", 'ID=x\nVERSION_ID="12"\n')
        self.start(device)
        self.assert_ends_at_once(device)
        for release in ("VERSION_ID=13\n", "VERSION_ID=13\nBUILD_ID=7\n", "VERSION_ID=13\nBUILD_ID=7\nIMAGE_VERSION='3'\n"):
            device.write("etc/os-release", release)
            self.assert_runs(device)
            self.assert_ends_at_once(device)

    def test_the_release_is_also_found_where_the_vendor_puts_it(self):
        device = self.old_device()
        device.write("usr/lib/os-release", "BUILD_ID=1\n")
        self.start(device)
        device.write("usr/lib/os-release", "BUILD_ID=2\n")
        self.assert_runs(device)

    def test_another_release_of_the_host_runs_again(self):
        device = self.old_device()
        self.start(device)
        stamp = self.snapshots / "stamp"
        told = json.loads(stamp.read_text())
        for damage in (json.dumps({**told, "host": "0.9"}), "{", ""):
            stamp.write_text(damage)
            self.assert_runs(device)

    def test_what_is_to_be_migrated_is_migrated(self):
        device = self.old_device()
        legacy = device.path(LEGACY_MAIL).read_bytes()
        self.start(device)
        device.write(LEGACY_MAIL, legacy)
        self.assert_runs(device)
        self.edit(device, "of an older version")
        self.assert_runs(device)
        self.assert_ends_at_once(device)

    def test_a_run_that_could_not_save_is_tried_again(self):
        device = self.old_device()
        device.write("etc/group", "wheel:*:0:root\n")
        self.assertEqual(6, self.start(device).status)
        self.assertFalse(json.loads((self.snapshots / "stamp").read_text())["endedWell"])
        device.set_mobile(os.getuid(), os.getgid())
        self.assert_runs(device)
        self.assert_ends_at_once(device)

    def test_a_run_that_died_is_recovered(self):
        device = self.old_device()
        self.start(device)
        (self.snapshots / "running").write_text(json.dumps({"snapshot": self.identifiers()[0]}) + "\n")
        self.assert_runs(device)

    def test_needs_a_directory_and_a_run(self):
        for arguments in (["--if-needed"], ["--if-needed", "--undo", "--snapshots", self.snapshots]):
            self.assertEqual(2, self.run_host(*arguments).status)


def every_detail(root):
    details = {}
    for path in [root, *root.rglob("*")]:
        status = path.lstat()
        details[path] = (status.st_ino, status.st_mode, status.st_size, status.st_mtime_ns, status.st_ctime_ns)
    return details


class Rehearsals(SnapshotsTest):
    """--dry-run with the boot's exact command."""

    host = HOST

    def rehearse(self, device):
        before = every_detail(self.scratch)
        run = self.work(device, "--dry-run", "--explain=json")
        self.assertEqual(before, every_detail(self.scratch))
        return run

    def test_tell_what_the_run_will_do_and_make_no_directory(self):
        device = self.old_device()
        run = self.rehearse(device)
        self.assertEqual(0, run.status, run.errors)
        self.assertTrue(json.loads("\n".join(run.output))["rehearsal"])
        self.assertFalse(self.snapshots.exists())

    def test_go_back_first_where_a_run_died(self):
        device = self.old_device()
        self.migrate(device)
        identifier = self.identifiers()[0]
        manifest = self.snapshots / identifier / "manifest"
        manifest.write_text(unfinished(manifest.read_text()))
        states = [{"path": str(device.path(LEGACY_MAIL)), "state": "absent"},
                  {"path": str(device.path(SETTINGS)), "state": sha256(device.path(SETTINGS))}]
        lines = [{"snapshot": identifier}, *states]
        (self.snapshots / "running").write_text("".join(json.dumps(each) + "\n" for each in lines))
        run = self.rehearse(device)
        self.assertEqual(0, run.status, run.errors)
        self.assertIn(f"A run died; the device goes back to snapshot {identifier}", run.errors)
        stages = [each["stage"] for each in json.loads("\n".join(run.output))["stages"]]
        self.assertGreater(len(stages), 3, stages)

    def test_are_refused_as_the_run_will_be(self):
        device = self.old_device()
        self.snapshots.mkdir()
        self.snapshots.chmod(0o777)
        rehearsal, run = self.rehearse(device), self.migrate(device)
        self.assertEqual((2, run.errors[-1]), (rehearsal.status, rehearsal.errors[-1]))


def sha256(path):
    return hashlib.sha256(path.read_bytes()).hexdigest()


def unfinished(text):
    manifest = {**json.loads(text)["manifest"], "outcome": None}
    inner = json.dumps(manifest, separators=(",", ":"))
    whole = {"manifest": manifest, "sha256": hashlib.sha256(inner.encode()).hexdigest()}
    return json.dumps(whole, separators=(",", ":"))


if __name__ == "__main__":
    unittest.main()
