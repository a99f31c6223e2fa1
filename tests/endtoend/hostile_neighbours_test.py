"""A run of root's in directories in which the mobile user writes, and has planted things where the run reads and writes.

Whatever stands there: what belongs to others is not read, written, deleted or given away, nothing blocks, and everything
that is written is its owner's alone to read.
"""

import os
import plistlib
import shutil
import socket
import stat
import subprocess
import tempfile
import time
import unittest
from pathlib import Path

from device import HOME, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS, SETTINGS_COPY, TEMPORARY, Device
from device_case import HOST, DeviceTest, can_trace_calls, strace

MOBILE = 501
SECRET = "the-secret-of-somebody-else"
REPORTS = HOME + "/Library/Logs/CrashReporter/AccountMigration"
RECORDS_SWITCH = PREFERENCES + "/com.vorlix.accountsettings-logging.plist"
LOCK = "tmp/AccountMigrationInProgress"
LONG = 10  # seconds
MEMORY = "/dev/shm"

# Where a run reads, writes or deletes.
PLACES = {
    "settings file": SETTINGS,
    "temporary directory": TEMPORARY,
    "copy": SETTINGS_COPY,
    "directory of reports": REPORTS,
    "removal sentinel": PREFERENCES + "/.removingOldAccounts",
    "legacy mail file": LEGACY_MAIL,
    "legacy Exchange file": LEGACY_EXCHANGE,
    "mail auto-fetch marker": HOME + "/Library/Mail/AutoFetchEnabled",
    "switch of the reports": RECORDS_SWITCH,
    "tethered-sync values": PREFERENCES + "/com.vorlix.mobile.tethered_sync.plist",
    "external sources": PREFERENCES + "/com.vorlix.external-sources.plist",
}

# What somebody would love to have read, in every form that a run reads.
TREASURE = plistlib.dumps({
    "Version": 3,
    "Accounts": [{"Type": "Mail", "Class": "IMAPAccount", "Identifier": "T", "DisplayName": SECRET}],
    "MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "T1", "AccountName": SECRET}],
    "DAAccountsKey": [{"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": SECRET}],
    "ASSaveMigrationInformation": True,
})


def put_away(path):
    """Makes room at the path."""
    if path.is_dir() and not path.is_symlink():
        path.rename(path.with_name(path.name + " before"))
    elif path.is_symlink() or path.exists():
        path.unlink()


def plant_socket(path):
    here = os.open(path.parent, os.O_PATH)
    with socket.socket(socket.AF_UNIX) as server:
        server.bind(f"/proc/self/fd/{here}/{path.name}")
    os.close(here)


def plant_directory(path):
    path.mkdir()
    (path / "within").mkdir()
    (path / "within" / "file").write_text("mine")


def link_parent(path, target):
    path.parent.rename(path.parent.with_name(path.parent.name + " before"))
    path.parent.symlink_to(target)
    return path.parent


def planters(ways_to_treasures, treasure):
    """By name, what plants something at a path. `ways` lead to directories of somebody else's."""
    planted = {
        "hard link": lambda path: os.link(treasure, path),
        "pipe": os.mkfifo,
        "device": lambda path: os.mknod(path, stat.S_IFCHR | 0o666, os.makedev(1, 5)),
        "directory": plant_directory,
        "socket": plant_socket,
    }
    for name, way in ways_to_treasures.items():
        planted[f"link to a file {name}"] = lambda path, way=way: path.symlink_to(f"{way}/{path.name}")
        planted[f"link to a directory {name}"] = lambda path, way=way: path.symlink_to(way)
        planted[f"link to nothing {name}"] = lambda path, way=way: path.symlink_to(f"{way}/nothing")
        planted[f"parent linked to a directory {name}"] = lambda path, way=way: link_parent(path, way.removeprefix("../"))
    return planted


def state(directory):
    """All that a run may not change below the directory."""
    found = {}
    for path in [directory, *sorted(directory.rglob("*"))]:
        status = path.lstat()
        content = path.read_bytes() if path.is_file() else None
        found[path] = (status.st_mode, status.st_uid, status.st_gid, status.st_mtime_ns, content)
    return found


class Neighbours:
    """What holds whoever runs the host."""

    def setUp(self):
        super().setUp()
        if os.access(MEMORY, os.W_OK):  # hundreds of runs bring each of their files to stable storage
            scratch = tempfile.TemporaryDirectory(dir=MEMORY)
            self.addCleanup(scratch.cleanup)
            self.scratch = Path(scratch.name)

    def make(self, name):
        """A device of the mobile user's with something to do at every place, and treasures in it and beside it."""
        device = Device(self.scratch / name / "device")
        device.set_mobile(self.mobile, self.mobile)
        account = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L", "DisplayName": "mine"}
        device.write_plist(SETTINGS, {"Accounts": [account], "Version": 0})
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M1"}]})
        device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": []})
        device.write_plist(RECORDS_SWITCH, {"ASSaveMigrationInformation": True})
        device.write(PLACES["mail auto-fetch marker"], "")
        device.write(SETTINGS_COPY, "an old copy")
        device.path(TEMPORARY).mkdir(mode=0o700)
        for path in [device.path(HOME), *device.path(HOME).rglob("*")]:
            self.give(path)
        self.treasures = [device.path("private"), device.root.parent / "outside"]
        for directory in self.treasures:
            self.fill(directory)
        return device

    def give(self, path):
        os.chown(path, self.mobile, self.mobile, follow_symlinks=False)

    def fill(self, directory):
        directory.mkdir()
        for place in PLACES.values():
            (directory / Path(place).name).write_bytes(TREASURE)
        (directory / "nothing here").mkdir()
        for path in directory.iterdir():
            path.chmod(0o600 if path.is_file() else 0o700)

    def ways(self, device, place):
        up = "/".join([".."] * len(Path(place).parts))
        return {
            "of the device": "/private",
            "outside": str(self.treasures[1]),
            "outside, going up": f"{up}/outside",
        }

    def test_cannot_lead_a_run_to_what_is_not_theirs(self):
        for place, below in PLACES.items():
            device = self.make(place)
            treasure = self.treasures[0] / Path(below).name
            for kind in self.kinds(planters(self.ways(device, below), treasure)):
                with self.subTest(place=place, kind=kind):
                    shutil.rmtree(self.scratch / place)
                    device = self.make(place)
                    path = device.path(below)
                    if not kind.startswith("parent"):
                        put_away(path)
                    planted = planters(self.ways(device, below), treasure)[kind](path)
                    if kind != "hard link":
                        self.give(planted or path)
                    self.assert_run_does_no_harm(device)

    def assert_run_does_no_harm(self, device, **how):
        before = {path: path.lstat().st_ino for path in device.root.rglob("*")}
        treasures = [state(directory) for directory in self.treasures]
        started = time.monotonic()
        run = device.migrate(HOST, timeout=2 * LONG, **how)
        self.assertLess(time.monotonic() - started, LONG)
        self.assertIn(run.status, (0, 1, 6, 8), run.errors)
        self.assertEqual(treasures, [state(directory) for directory in self.treasures])
        trace = device.root.with_name(device.root.name + ".trace")
        self.assertNotIn(SECRET, trace.read_text(encoding="utf-8") + "".join(run.output + run.errors))
        self.assertEqual(0o600, stat.S_IMODE(trace.stat().st_mode))
        for path in device.root.rglob("*"):
            self.assert_tells_nothing(path, path.lstat(), before)
        return run

    def assert_tells_nothing(self, path, status, before):
        if not stat.S_ISREG(status.st_mode) or any(path.is_relative_to(each) for each in self.treasures):
            return
        if status.st_nlink == 1:
            self.assertNotIn(SECRET.encode(), path.read_bytes(), path)
        if status.st_ino not in before.values():  # what was there may stand under another name
            is_lock = path.name == Path(LOCK).name  # everybody may wait for it, and nothing is in it
            self.assertEqual(0o644 if is_lock else 0o600, stat.S_IMODE(status.st_mode), path)

    def test_leave_a_run_its_work_where_they_planted_nothing(self):
        device = self.make("clean")
        run = self.assert_run_does_no_harm(device)
        self.assertEqual(0, run.status)
        settings = device.path(SETTINGS).stat()
        self.assertEqual((self.mobile, self.mobile, 0o600), (settings.st_uid, settings.st_gid, settings.st_mode & 0o777))
        self.assertLessEqual({"L", "M1"}, {each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]})

    def test_may_keep_a_second_name_of_their_own_settings(self):
        device = self.make("second name")
        os.link(device.path(SETTINGS), device.path(HOME + "/second name"))
        self.assert_run_does_no_harm(device)
        self.assertIn("L", {each["Identifier"] for each in device.read_plist(SETTINGS)["Accounts"]})

    def test_see_only_what_is_theirs_whatever_the_umask(self):
        device = self.make("umask")
        self.assert_run_does_no_harm(device, prepare=lambda: os.umask(0))


@unittest.skipIf(os.getuid() != 0, "only root is worth planting for")
class NeighboursOfRoot(Neighbours, DeviceTest):
    mobile = MOBILE

    @staticmethod
    def kinds(planted):
        return planted

    def with_open_tmp(self, name):
        device = self.make(name)
        device.path("tmp").mkdir()
        device.path("tmp").chmod(0o1777)
        return device

    def test_of_the_lock_cannot_make_a_run_wait_or_write(self):
        kinds = planters({"outside": "/outside"}, Path("/nothing"))
        for kind in [kind for kind in kinds if not kind.startswith("parent")]:
            with self.subTest(kind=kind):
                device = self.with_open_tmp(f"lock {kind}")
                treasure = self.treasures[0] / "Accounts.plist"
                planters({"outside": str(self.treasures[1])}, treasure)[kind](device.path(LOCK))
                run = self.assert_run_does_no_harm(device)
                self.assertEqual(0, run.status, run.errors)
                self.assertIn(f"{LOCK} was replaced, since", "\n".join(run.errors))

    def test_may_have_made_the_lock_file(self):
        device = self.with_open_tmp("lock")
        give_to_mobile(device.path(LOCK))
        run = self.assert_run_does_no_harm(device)
        self.assertEqual((0, MOBILE), (run.status, device.path(LOCK).stat().st_uid), run.errors)

    @unittest.skipUnless(can_trace_calls(), "no strace here, or it may trace nothing")
    def test_own_a_lock_file_that_is_never_opened_as_one_to_be_made(self):
        """Where fs.protected_regular is set, the kernel lets nobody open another's file in /tmp in that way."""
        device, log = self.with_open_tmp("lock"), self.scratch / "calls"
        give_to_mobile(device.path(LOCK))
        subprocess.run(
            strace("-o", str(log), "-e", "trace=openat,openat2", str(HOST), "--root", str(device.root)),
            capture_output=True, timeout=LONG, check=False,
        )
        opened = [line for line in log.read_text().splitlines() if Path(LOCK).name in line]
        self.assertNotEqual([], opened)
        self.assertEqual([], [line for line in opened if "O_CREAT" in line])


@unittest.skipIf(os.getuid() == 0, "as root, see above")
class NeighboursOfAnOrdinaryUser(Neighbours, DeviceTest):
    """The mobile user's own run. What it could read anyway may be read for it, inside of the device."""

    mobile = os.getuid()

    @staticmethod
    def kinds(planted):
        return [kind for kind in planted if kind not in ("hard link", "device") and not kind.endswith("of the device")]


def give_to_mobile(path):
    path.write_text("")
    path.chmod(0o644)
    os.chown(path, MOBILE, MOBILE)


if __name__ == "__main__":
    unittest.main()
