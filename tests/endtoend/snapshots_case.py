"""What the tests of snapshots share: a device with something to undo, and the commands."""

import json
import os

from device import LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS
from device_case import DeviceTest

AUTO_FETCH = "var/mobile/Library/Mail/AutoFetchEnabled"
SENTINEL = PREFERENCES + "/.removingOldAccounts"
UNDOABLE = [
    SETTINGS,
    LEGACY_EXCHANGE,
    LEGACY_MAIL,
    LEGACY_EXCHANGE + ".original",
    LEGACY_MAIL + ".original",
    SENTINEL,
    AUTO_FETCH,
]


class SnapshotsTest(DeviceTest):
    def setUp(self):
        super().setUp()
        self.snapshots = self.scratch / "snapshots"

    def old_device(self, name="legacy-files"):
        """A device on which a run changes or deletes a file of every kind."""
        device = self.example(name)
        device.write_plist(SETTINGS, {"Version": 3, "Accounts": [{"Type": "LDAP", "Class": "L", "Identifier": "L1"}]})
        for path in (LEGACY_EXCHANGE, LEGACY_MAIL):
            device.write(path + ".original", "as it was before " + path)
        device.path(SETTINGS).chmod(0o640)
        os.utime(device.path(SETTINGS), ns=(1_000_000_007, 1_234_567_890_123_456_789))
        return device

    def migrate(self, device, *more, **options):
        return device.migrate(self.host, "--snapshots", self.snapshots, *more, **options)

    def work(self, device, *more):
        return self.run_host("--root", device.root, "--snapshots", self.snapshots, *more)

    def edit(self, device, identifier):
        """Makes a change that the next run finds something to do about."""
        contents = device.read_plist(SETTINGS)
        contents["Accounts"].append({"Type": "LDAP", "Class": "L", "Identifier": identifier})
        device.write_plist(SETTINGS, {**contents, "Version": 11})

    def restore(self, device, identifier, *more):
        return self.run_host("--root", device.root, "--snapshots", self.snapshots, "--restore", identifier, *more)

    def list(self):
        run = self.run_host("--list-snapshots=json", "--snapshots", self.snapshots)
        self.assertEqual((0, []), (run.status, run.errors))
        listing = json.loads("\n".join(run.output))
        self.assertEqual(1, listing["schema"])
        return listing["snapshots"]

    def identifiers(self):
        return [each["id"] for each in self.list()]

    def undoable(self, device):
        """What stands at the paths that a run may change, to the nanosecond."""
        states = {}
        for path in UNDOABLE:
            place = device.path(path)
            if place.exists():
                status = place.stat()
                states[path] = (place.read_bytes(), status.st_mode, status.st_uid, status.st_gid, status.st_mtime_ns)
        return states

    def assert_refused(self, status, message, run):
        self.assertEqual((status, [], [f"migration-host: {message}"]), (run.status, run.output, run.errors))
