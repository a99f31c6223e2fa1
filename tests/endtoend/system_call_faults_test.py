"""The real host, killed at or failed in one system call of a run: the settings file is the old one or a whole new one.

A sample of the calls; with EVERY_SYSTEM_CALL set, each of them. The calls of the program's loader, before the host's own
first one, are left out: there the loader ends the program. Whatever went, the verdict of the run names it.
"""

import json
import os
import plistlib
import random
import re
import shutil
import subprocess
import tempfile
import unittest
from collections import Counter
from pathlib import Path

from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS, TEMPORARY, Device, plain_environment
from device_case import HOST, can_trace_calls, strace
from reader import Reader

READING = ["openat", "openat2", "read", "newfstatat"]
CHANGING = ["write", "fsync", "renameat", "renameat2", "unlinkat", "mkdirat", "fchownat", "fchmod", "flock"]
ERRORS = ["ENOSPC", "EIO", "EACCES", "EROFS", "EINTR"]
SAMPLE = 20  # kills, and as many errors, of each kind of device
MEMORY = "/dev/shm"
STANDING = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L", "Port": 389}


def identifiers(path):
    try:
        root = plistlib.loads(path.read_bytes())
    except FileNotFoundError:
        return None
    return Counter(each["Identifier"] for each in root["Accounts"])


@unittest.skipIf(os.environ["SANITIZE"], "a sanitizer makes calls of its own, and looks for leaks in no traced program")
@unittest.skipUnless(can_trace_calls(), "no strace here, or it may trace nothing")
class SystemCallFaults(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory(dir=MEMORY if os.access(MEMORY, os.W_OK) else None)
        self.addCleanup(scratch.cleanup)
        self.scratch = Path(scratch.name)
        self.counts = Counter()

    def make(self, version):
        root = self.scratch / "device"
        if root.exists():
            shutil.rmtree(self.scratch / "device")
        device = Device(root)
        device.set_mobile(os.getuid(), os.getgid())
        device.write_plist(SETTINGS, {"Accounts": [STANDING], "Version": version})
        if version == 0:
            device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M1"}]})
        return device

    def run_host(self, device, *before):
        ended = subprocess.run(
            [*before, str(HOST), "--root", str(device.root), "--explain=json"],
            env=plain_environment(), stdin=subprocess.DEVNULL, capture_output=True, timeout=30, check=False,
        )
        self.told = ended.stdout
        return ended.returncode

    def assert_named(self, reader):
        """What went, a reader of the files counts itself; where the explanation could not be printed there is none to hold it against."""
        if self.told.endswith(b"}\n"):
            reader.check(self, json.loads(self.told))
            self.counts["verdicts"] += 1

    def calls_of_a_run(self, version):
        """The host's own calls, each by its name and its number among those of that name."""
        device, log = self.make(version), self.scratch / "log"
        names = ",".join(f"?{name}" for name in READING + CHANGING)
        self.assertEqual(0, self.run_host(device, *strace("-o", str(log), "-e", f"trace={names}")))
        numbers, calls = Counter(), []
        for line in log.read_text(errors="replace").splitlines():
            found = re.match(r"\d+ +(\w+)\(", line)
            if not found:
                continue
            numbers[found[1]] += 1
            if calls or str(device.root) in line:
                calls.append((found[1], numbers[found[1]]))
        return calls

    def faults(self, calls):
        kills = [(name, number, "signal=KILL", "") for name, number in calls]
        errors = [
            (name, number, f"error={error}", duration)
            for name, number in calls
            for error in ERRORS
            for duration in ("", "+")
            if (name, error) != ("flock", "EINTR")  # which waits, however often it is interrupted
        ]
        if os.environ.get("EVERY_SYSTEM_CALL"):
            return kills + errors
        chance = random.Random(12)
        return chance.sample(kills, SAMPLE) + chance.sample(errors, SAMPLE)

    def check(self, version):
        calls = self.calls_of_a_run(version)
        for name, number, fault, duration in self.faults(calls):
            with self.subTest(version=version, call=name, number=number, fault=fault + duration):
                device = self.make(version)
                reader = Reader(device)
                old, before = device.read(SETTINGS), device.entries()
                injected = f"inject={name}:{fault}:when={number}{duration}"
                status = self.run_host(device, *strace("-o", os.devnull, "-e", f"trace={name}", "-e", injected))
                self.counts[fault.split("=")[0]] += 1
                self.assert_whole(device, old, name)
                if fault == "signal=KILL":
                    self.assert_finished_by_the_next_run(device, version)
                    self.assert_named(reader)
                else:
                    # 2: the root could not be looked at, so there is no such directory and nothing was begun.
                    self.assertTrue(status in (0, 1, 3, 6, 9) or (status in (2, 8) and before == device.entries()), status)
                    self.assert_named(reader)
                    if not duration and name != "unlinkat":
                        self.assertEqual([], self.left_in_temporary_directory(device))
                    self.assertEqual(0, self.run_host(device))  # the lock is free
        print(f"\nversion {version}: {len(calls)} calls, {dict(self.counts)} faults tried", flush=True)

    def left_in_temporary_directory(self, device):
        directory = device.path(TEMPORARY)
        return os.listdir(directory) if directory.is_dir() else []

    def assert_whole(self, device, old, call):
        if device.read(SETTINGS) == old:
            return
        found = identifiers(device.path(SETTINGS))
        if found["L"] != 1:
            # A file that cannot be read counts as missing; what it held is in the copy, unless that was hit as well.
            self.counts["began with nothing"] += 1
            self.assertIn(call, READING)

    def assert_finished_by_the_next_run(self, device, version):
        legacy = device.path(LEGACY_MAIL).exists()
        self.assertTrue(version != 0 or legacy or identifiers(device.path(SETTINGS))["M1"] == 1)
        self.assertEqual(0, self.run_host(device))
        found = identifiers(device.path(SETTINGS))
        self.assertEqual(1, found["L"])
        if version == 0:
            self.assertEqual(1, found["M1"])

    def test_leave_a_device_with_legacy_files_whole(self):
        self.check(0)

    def test_leave_a_current_device_whole(self):
        self.check(CURRENT_VERSION)


if __name__ == "__main__":
    unittest.main()
