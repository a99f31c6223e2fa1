"""What a run without snapshots would take away, though it stands nowhere else, is kept under a name that no run uses again."""

import json
import os
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from device_case import HOST, DeviceTest
from failed_saves_test import CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH, on_small_volume, without_capabilities

BROKEN = b"<plist><dict><key>Accounts"
ACCOUNT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "A"}
MOST = 9


class KeptAside(DeviceTest):
    def broken_device(self, content=BROKEN):
        device = self.device()
        device.write(SETTINGS, content)
        device.path(SETTINGS).chmod(0o640)
        return device

    def kept(self, device, of=SETTINGS_COPY):
        """What is kept beside a file, by the rest of its name."""
        place = device.path(of)
        return {path.name[len(place.name):]: path.read_bytes() for path in place.parent.glob(place.name + ".*-*")}

    def places(self, run):
        return {(lost["code"], lost.get("where")) for lost in run.result()["lost"]}


class Settings(KeptAside):
    def test_that_cannot_be_read_are_kept_as_they_are_and_the_run_goes_on(self):
        device = self.broken_device()
        before = device.path(SETTINGS).stat()
        run = device.migrate(HOST)
        kept = device.path(SETTINGS_COPY + ".unreadable-1")
        after = kept.stat()
        self.assertEqual(BROKEN, kept.read_bytes())
        self.assertEqual((before.st_mode, before.st_uid, before.st_gid, before.st_mtime_ns),
                         (after.st_mode, after.st_uid, after.st_gid, after.st_mtime_ns))
        self.assertEqual((0, {"Accounts": [], "Version": CURRENT_VERSION}), (run.status, device.read_plist(SETTINGS)))
        self.assertIn(f"migration-host: the settings file cannot be read; it is kept as {kept}", run.errors)
        self.assertEqual({("unreadable-settings-file", str(kept))}, self.places(run))

    def test_of_a_newer_version_are_kept(self):
        device = self.device(Version=13, Accounts=[ACCOUNT], More="of it")
        content = device.read(SETTINGS)
        run = device.migrate(HOST)
        kept = device.path(SETTINGS_COPY + ".newer-1")
        self.assertEqual(content, kept.read_bytes())
        self.assertIn(f"migration-host: the settings file is of a newer version; it is kept as {kept}", run.errors)
        self.assertEqual({("newer-settings-file", str(kept))}, self.places(run))

    def test_that_a_run_can_use_are_not_kept(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[ACCOUNT])
        self.assertEqual([], device.migrate(HOST).errors)
        self.assertEqual({}, self.kept(device))

    def test_are_never_overwritten_and_no_more_than_nine_are_kept_which_is_said(self):
        device = self.broken_device()
        for number in range(MOST + 1):
            device.write(SETTINGS, BROKEN + bytes([number]))
            run = device.migrate(HOST)
        self.assertEqual({f".unreadable-{number + 1}": BROKEN + bytes([number]) for number in range(MOST)}, self.kept(device))
        first = device.path(SETTINGS_COPY + ".unreadable-1")
        self.assertIn(f"migration-host: {first} to {MOST} are kept already; a further one is not, and goes as the rules require",
                      run.errors)
        self.assertEqual({("unreadable-settings-file", str(device.path(SETTINGS_COPY)))}, self.places(run))

    def test_that_stay_since_no_save_succeeds_are_kept_once(self):
        device = self.broken_device()
        device.write("etc/group", "wheel:*:0:root\n")
        for _ in range(3):
            self.assertEqual(6, device.migrate(HOST).status)
        self.assertEqual({".unreadable-1": BROKEN}, self.kept(device))

    def test_are_kept_by_the_snapshot_where_there_is_one(self):
        device = self.broken_device()
        run = device.migrate(HOST, "--snapshots", self.scratch / "snapshots")
        self.assertEqual({}, self.kept(device))
        [(code, where)] = self.places(run)
        self.assertEqual(("unreadable-settings-file", self.scratch / "snapshots"), (code, device.path(where).parent))

    def test_are_kept_where_the_directory_for_that_is_missing(self):
        device = self.broken_device()
        device.path(SETTINGS_COPY).parent.rmdir()
        device.migrate(HOST)
        self.assertEqual({".unreadable-1": BROKEN}, self.kept(device))

    def test_that_are_reached_by_a_link_are_kept(self):
        device = self.broken_device()
        target = device.path(SETTINGS).with_name("elsewhere")
        device.path(SETTINGS).rename(target)
        device.path(SETTINGS).symlink_to(target.name)
        device.migrate(HOST)
        self.assertEqual({".unreadable-1": BROKEN}, self.kept(device))

    def assert_refused(self, run):
        self.assertEqual(8, run.status, run.errors)
        self.assertRegex(run.errors[-1], "^migration-host: the settings file is of no use to this run, and cannot be kept: .*"
                                         "; the device was not touched$")

    def test_that_can_neither_be_read_nor_kept_end_the_run_before_it_begins(self):
        device = self.broken_device()
        device.path(SETTINGS).chmod(0)
        before = device.entries() if os.getuid() == 0 else None
        self.assert_refused(device.migrate(HOST, prepare=without_capabilities(CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH)))
        device.path(SETTINGS).chmod(0o640)
        self.assertEqual(BROKEN, device.read(SETTINGS))
        if before:
            self.assertEqual(sorted(before), sorted(device.entries()))

    def test_for_whose_copy_there_is_no_room_end_the_run_before_it_begins(self):
        device, volume = self.broken_device(BROKEN + bytes(60_000)), self.scratch / "volume"
        volume.mkdir()
        if not on_small_volume(volume, "true").status == 0:
            self.skipTest("mounting a small volume is not allowed here")
        device.set_mobile(0, 0)
        run = on_small_volume(
            volume, 'cp -a "$1/." . && { cat /dev/zero > filler; } 2> /dev/null; cp var/mobile/Library/Preferences/* "$3";'
            ' "$2" --root "$0"; status=$?; rm filler; cmp "$3"/*.plist var/mobile/Library/Preferences/*.plist && exit $status',
            device.root, HOST, self.scratch)
        self.assert_refused(run)


class LegacyFiles(KeptAside):
    def assert_kept(self, device, file, why, content, codes):
        run = device.migrate(HOST)
        kept = device.path(f"{file}.{why}-1")
        self.assertFalse(device.path(file).exists())
        self.assertEqual(content, kept.read_bytes())
        self.assertIn(f"migration-host: {device.path(file)} holds accounts that stand nowhere else; it is kept as {kept}",
                      run.errors)
        self.assertEqual({(code, str(kept)) for code in codes}, self.places(run))

    def test_that_cannot_be_read_are_kept(self):
        device = self.device()
        device.write(LEGACY_EXCHANGE, BROKEN)
        self.assert_kept(device, LEGACY_EXCHANGE, "unreadable", BROKEN, ["unreadable-legacy-file"])

    def test_that_cannot_be_converted_are_kept(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}, {"uniqueId": "BAD"}]})
        self.assert_kept(device, LEGACY_MAIL, "unconverted", device.read(LEGACY_MAIL), ["refused-file", "refused-description"])

    def test_whose_accounts_could_not_be_saved_are_kept_with_owner_and_permissions(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}]})
        device.path(LEGACY_MAIL).chmod(0o604)
        device.write("etc/group", "wheel:*:0:root\n")
        self.assert_kept(device, LEGACY_MAIL, "unsaved", device.read(LEGACY_MAIL), ["not-saved"])
        self.assertEqual(0o100604, device.path(LEGACY_MAIL + ".unsaved-1").stat().st_mode)

    def test_that_are_kept_give_their_accounts_once_they_stand_in_their_place_again(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M"}]})
        device.write("etc/group", "wheel:*:0:root\n")
        device.migrate(HOST)
        device.set_mobile(os.getuid(), os.getgid())
        device.path(LEGACY_MAIL + ".unsaved-1").rename(device.path(LEGACY_MAIL))
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertIn("M", [each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]])

    def test_whose_accounts_are_saved_are_not_kept(self):
        device = self.example("legacy-files")
        self.assertEqual("kept", device.migrate(HOST).result()["verdict"])
        self.assertEqual(({}, {}), (self.kept(device, LEGACY_MAIL), self.kept(device, LEGACY_EXCHANGE)))

    def test_go_as_required_where_nine_are_kept_already(self):
        device = self.device()
        for number in range(MOST + 1):
            device.write(LEGACY_MAIL, BROKEN + bytes([number]))
            run = device.migrate(HOST)
        self.assertEqual(MOST, len(self.kept(device, LEGACY_MAIL)))
        self.assertFalse(device.path(LEGACY_MAIL).exists())
        self.assertEqual({("unreadable-legacy-file", None)}, self.places(run))


class Rehearsals(KeptAside):
    def test_keep_nothing_and_foretell_it(self):
        device = self.broken_device()
        device.write(LEGACY_MAIL, BROKEN)
        before = device.entries()
        run = device.migrate(HOST, "--dry-run", "--explain=json")
        self.assertEqual(before, device.entries())
        facts = [fact for stage in json.loads("\n".join(run.output))["stages"] for fact in stage["facts"]]
        settings, legacy = device.path(SETTINGS_COPY + ".unreadable-1"), device.path(LEGACY_MAIL + ".unreadable-1")
        self.assertEqual([{"fact": "kept-aside", "where": str(settings)},
                          {"fact": "kept-aside", "file": str(device.path(LEGACY_MAIL)), "where": str(legacy)}],
                         [fact for fact in facts if fact["fact"] == "kept-aside"])
        self.assertEqual({("unreadable-settings-file", str(settings)), ("unreadable-legacy-file", str(legacy))}, self.places(run))


if __name__ == "__main__":
    unittest.main()
