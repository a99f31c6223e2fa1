"""Snapshots where others were before, and where somebody makes their files what they should not be."""

import hashlib
import json
import os
import shutil
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS
from device_case import HOST
from snapshots_case import AUTO_FETCH, SENTINEL, SnapshotsTest

COMPANION = LEGACY_MAIL + ".original"
TOO_LARGE = (1 << 30) + 1
STRANGER = 4711


def make_huge(place):
    place.touch()
    os.truncate(place, TOO_LARGE)


def make_link(place):
    place.symlink_to("/etc/passwd")


KINDS = [os.mkdir, make_link, os.mkfifo, make_huge]


class DirectoriesOfOthers(SnapshotsTest):
    host = HOST

    def setUp(self):
        super().setUp()
        self.snapshots.mkdir(mode=0o700)

    def assert_left_alone(self, name):
        before = {path: path.is_file() and path.read_bytes() for path in self.snapshots.rglob("*")}
        device = self.old_device()
        state = self.undoable(device)
        for run in (self.migrate(device), self.work(device, "--list-snapshots")):
            message = f"migration-host: {self.snapshots} cannot hold snapshots: it holds something else: {name}"
            self.assertEqual((2, message), (run.status, run.errors[-1]))
        self.assertEqual(before, {path: path.is_file() and path.read_bytes() for path in self.snapshots.rglob("*")})
        self.assertEqual(state, self.undoable(device))

    def test_with_hidden_entries_are_refused(self):
        (self.snapshots / ".ssh").mkdir()
        (self.snapshots / ".ssh" / "id").write_text("a key")
        self.assert_left_alone(".ssh")

    def test_with_a_file_that_has_one_of_our_names_are_refused(self):
        for name in ("last", "format", ".new", "000001-20260101T000000Z"):
            (self.snapshots / name).write_text("somebody's")
            self.assert_left_alone(name)
            (self.snapshots / name).unlink()

    def test_whose_mark_a_dead_host_began_are_taken(self):
        for part in ("", "migra"):
            (self.snapshots / ".new-0123456789abcdef").write_text(part)
            self.assertEqual(0, self.migrate(self.old_device()).status)
            self.assertEqual(1, len(self.list()))
            shutil.rmtree(self.snapshots)
            self.snapshots.mkdir(mode=0o700)
        (self.snapshots / ".new-0123456789abcdef").write_text("somebody's")
        self.assert_left_alone(".new-0123456789abcdef")

    def test_of_an_earlier_release_are_known_by_their_names(self):
        device = self.old_device()
        (self.snapshots / "lock").touch()
        (self.snapshots / "last").write_text('{"snapshot":"000001-20260101T000000Z"}\n')
        self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(1, len(self.list()))

    def test_that_became_ours_lose_nothing_that_is_put_there_later(self):
        device = self.old_device()
        self.assertEqual(0, self.migrate(device).status)
        (self.snapshots / ".git").mkdir()
        (self.snapshots / "last").write_text("somebody's")
        self.edit(device, "new")
        self.assertEqual(0, self.migrate(device).status)
        self.assertTrue((self.snapshots / ".git").is_dir())
        self.assertEqual("somebody's", (self.snapshots / "last").read_text())

    def test_what_a_dead_host_left_is_swept_away(self):
        device = self.old_device()
        self.migrate(device)
        for name in (".new", ".old"):
            (self.snapshots / name).mkdir()
        (self.snapshots / ".new-0123456789abcdef").touch()
        self.edit(device, "new")
        self.migrate(device)
        self.assertEqual([], [path.name for path in self.snapshots.iterdir() if path.name.startswith(".")])


class WhatNoRunCanRead(SnapshotsTest):
    """In the place of a file with accounts it keeps nobody's device from its migration, and is kept itself."""

    host = HOST

    def device_with(self, path, put):
        shutil.rmtree(self.scratch / "legacy-files", ignore_errors=True)
        device = self.old_device()
        device.path(path).unlink()
        put(device.path(path))
        return device

    def assert_put_aside(self, device, path, name):
        run = self.migrate(device, "--explain=json")
        line = f"migration-host: {device.path(path)} is nothing that a run can read; it is kept as {name}"
        self.assertEqual((0, line), (run.status, run.errors[0]), run.errors)
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])
        self.assertIn(str(name), [each["where"] for each in json.loads("\n".join(run.output))["result"]["lost"]])

    def test_makes_way_whatever_it_is(self):
        for path in (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE):
            for put in (os.mkdir, os.mkfifo, make_huge):
                with self.subTest(path=path, put=put):
                    device = self.device_with(path, put)
                    place = device.path(path)
                    name = place.with_name(place.name + ".unreadable-1")
                    before = place.stat()
                    self.assert_put_aside(device, path, name)
                    self.assertEqual((before.st_ino, before.st_mode), (name.stat().st_ino, name.stat().st_mode))
                    self.assertEqual(0, self.migrate(device).status)
                    shutil.rmtree(self.snapshots)

    def test_is_foretold_by_a_rehearsal_which_moves_nothing(self):
        for put in (os.mkdir, os.mkfifo, make_huge):
            with self.subTest(put=put):
                device = self.device_with(SETTINGS, put)
                rehearsal = self.migrate(device, "--dry-run", "--explain=json")
                self.assertTrue(device.path(SETTINGS).exists())
                run = self.migrate(device, "--explain=json")
                results = [json.loads("\n".join(each.output))["result"] for each in (rehearsal, run)]
                self.assertEqual(*[(each["verdict"], each["lost"]) for each in results])
                shutil.rmtree(self.snapshots)

    def test_finds_a_name_however_many_are_taken(self):
        device = self.device_with(SETTINGS, os.mkdir)
        names = {device.path(SETTINGS).with_name(f"{device.path(SETTINGS).name}.unreadable-{number}") for number in range(1, 10)}
        for name in names:
            name.mkdir()
        run = self.migrate(device)
        self.assertEqual((0, 10), (run.status, len([*device.path(SETTINGS).parent.glob("*.unreadable-*")])), run.errors)

    def test_keeps_no_restore_from_its_end(self):
        device = self.old_device()
        before = self.undoable(device)
        self.migrate(device)
        device.path(SETTINGS).unlink()
        device.path(SETTINGS).mkdir()
        run = self.restore(device, "latest")
        self.assertEqual((0, before), (run.status, self.undoable(device)), run.errors)


class GoodLinks(SnapshotsTest):
    """What a link in the place of a file with accounts leads to is migrated, kept and brought back."""

    host = HOST

    def test_are_followed_as_without_snapshots(self):
        for path in (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE):
            with self.subTest(path=path):
                with_file, with_link = self.old_device(), self.old_device()
                place = with_link.path(path)
                place.rename(place.with_name("target"))
                place.symlink_to("target")
                self.assertEqual([0, 0], [device.migrate(HOST).status for device in [with_file]] + [self.migrate(with_link).status])
                self.assertEqual(with_file.read_plist(SETTINGS), with_link.read_plist(SETTINGS))
                shutil.rmtree(self.snapshots)

    def test_come_back_as_the_files_that_they_led_to(self):
        device = self.old_device()
        before = self.undoable(device)
        place = device.path(LEGACY_MAIL)
        place.rename(place.with_name("target"))
        place.symlink_to("target")
        self.assertEqual(0, self.migrate(device).status)
        self.assertEqual(0, self.restore(device, "latest").status)
        self.assertEqual(before, self.undoable(device))
        self.assertFalse(place.is_symlink())
        self.assertTrue(place.with_name("target").is_file())


class OddFiles(SnapshotsTest):
    """What a user can put at the path of a marker or a companion does not keep his device from being migrated."""

    host = HOST

    def run_with(self, path, put):
        device = self.old_device()
        place = device.path(path)
        place.unlink(missing_ok=True)
        put(place)
        run = self.migrate(device)
        self.assertEqual(0, run.status, run.errors)
        return device, run

    def migrated_with(self, path, put):
        device, run = self.run_with(path, put)
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])
        return device, run

    def test_of_any_kind_hinder_no_migration_and_are_said(self):
        for path, kinds in {AUTO_FETCH: KINDS[:-1], COMPANION: KINDS, SENTINEL: KINDS[-1:]}.items():
            for put in kinds:
                with self.subTest(path=path, put=put):
                    device, run = self.run_with(path, put)
                    self.assertIn(f"migration-host: {device.path(path)} has no copy: ", "\n".join(run.errors))

    def test_of_a_sparse_marker_no_byte_is_copied(self):
        device, run = self.migrated_with(AUTO_FETCH, make_huge)
        self.assertFalse(device.path(AUTO_FETCH).exists())
        copied = sum(path.stat().st_size for path in self.snapshots.rglob("*"))
        self.assertLess(copied, 1 << 20)
        self.assertEqual([], [line for line in run.errors if "has no copy" in line])

    def test_a_marker_comes_back_as_a_marker(self):
        device, _ = self.migrated_with(AUTO_FETCH, lambda place: place.write_text("whatever"))
        self.assertEqual(0, self.restore(device, "latest").status)
        self.assertTrue(device.path(AUTO_FETCH).is_file())

    def test_special_mode_bits_do_not_come_back(self):
        device, _ = self.migrated_with(COMPANION, lambda place: (place.write_text("x"), place.chmod(0o4755)))
        self.assertEqual(0, self.restore(device, "latest").status)
        self.assertEqual(0o755, device.path(COMPANION).stat().st_mode & 0o7777)

    @unittest.skipUnless(os.geteuid() == 0, "needs to give files away")
    def test_of_a_second_name_that_a_user_gave_no_copy_is_made(self):
        device = self.old_device()
        secret = self.scratch / "secret"
        secret.write_text("nobody else's")
        secret.chmod(0o600)
        place = device.path(COMPANION)
        place.unlink()
        os.chown(place.parent, STRANGER, STRANGER)
        os.link(secret, place)
        run = self.migrate(device)
        self.assertEqual(0, run.status, run.errors)
        self.assertIn(f"migration-host: {place} has no copy: ", "\n".join(run.errors))
        copies = [path for path in self.snapshots.rglob("*") if path.is_file()]
        self.assertEqual([], [path for path in copies if b"nobody else's" in path.read_bytes()])


class ForgedManifests(SnapshotsTest):
    """A manifest is believed nothing that no run could have written."""

    host = HOST

    def forge(self, change):
        device = self.old_device()
        self.migrate(device)
        identifier = self.identifiers()[0]
        path = self.snapshots / identifier / "manifest"
        manifest = json.loads(path.read_text())["manifest"]
        change(manifest)
        text = json.dumps(manifest, separators=(",", ":"), ensure_ascii=False)
        whole = {"manifest": manifest, "sha256": hashlib.sha256(text.encode()).hexdigest()}
        path.write_text(json.dumps(whole, separators=(",", ":"), ensure_ascii=False))
        self.after = self.undoable(device)
        return device, identifier, self.restore(device, identifier)

    def test_names_no_path_that_no_run_changes(self):
        victim = self.scratch / "victim"
        _, identifier, run = self.forge(lambda manifest: manifest["files"][0].update(path=str(victim)))
        message = f"snapshot {identifier} names {victim}, which no run changes"
        self.assert_refused(5, message, run)
        self.assertFalse(victim.exists())

    def test_names_no_copy_outside_of_the_snapshot(self):
        device, identifier, run = self.forge(lambda manifest: manifest["files"][0].update(copy="../../secret"))
        self.assert_refused(5, f"the manifest of snapshot {identifier} is damaged", run)
        self.assertEqual(self.after, self.undoable(device))

    def test_gives_no_special_mode_bits(self):
        device, _, run = self.forge(lambda manifest: manifest["files"][0].update(mode="4755"))
        self.assertEqual(0, run.status, run.errors)
        self.assertEqual(0o755, device.path(SETTINGS).stat().st_mode & 0o7777)

    def test_is_restored_where_it_is_true(self):
        device, _, run = self.forge(lambda manifest: None)
        self.assertEqual(0, run.status, run.errors)
        self.assertTrue(device.path(LEGACY_EXCHANGE).exists())


if __name__ == "__main__":
    unittest.main()
