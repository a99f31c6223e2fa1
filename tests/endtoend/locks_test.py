"""The migration lock of a device: who holds it keeps out runs of this device and of no other, and nobody waits in silence."""

import fcntl
import os
import subprocess
import time
import unittest

from accountctl_case import ACCOUNTCTL
from device import CURRENT_VERSION, SETTINGS, plain_environment
from device_case import HOST, DeviceTest

LOCK = "tmp/AccountMigrationInProgress"
REFUSED = 8
LONG = 20  # seconds


class HeldLocks(DeviceTest):
    def setUp(self):
        super().setUp()
        self.held = self.example("first-generation")
        path = self.held.path(LOCK)
        path.parent.mkdir(mode=0o1777)
        self.lock = open(path, "xb")
        self.addCleanup(self.lock.close)
        fcntl.flock(self.lock, fcntl.LOCK_EX)

    def start(self, *words):
        return subprocess.Popen(
            [str(word) for word in words], env=plain_environment(), stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
        )

    def test_a_run_gives_up_after_its_time_and_touches_nothing(self):
        before = self.held.entries(with_lock=True)
        run = self.held.migrate(HOST, "--lock-timeout", "1")
        self.assertEqual((REFUSED, before), (run.status, self.held.entries(with_lock=True)))
        self.assertIn(LOCK, run.errors[-1])
        self.assertEqual([], run.told("result"))

    def test_a_run_with_snapshots_gives_up_for_either_lock(self):
        snapshots = self.scratch / "snapshots"
        for _ in range(2):
            before = self.held.entries(with_lock=True)
            run = self.held.migrate(HOST, "--snapshots", snapshots, "--lock-timeout", "0")
            self.assertEqual((REFUSED, before), (run.status, self.held.entries(with_lock=True)))
            fcntl.flock(self.lock, fcntl.LOCK_UN)
            self.lock.close()
            self.lock = open(snapshots / "lock", "rb")
            fcntl.flock(self.lock, fcntl.LOCK_EX)

    def test_a_run_says_for_whom_it_waits_and_then_goes_on(self):
        host = self.start(HOST, "--root", self.held.root)
        self.assertTrue(host.stderr.readline().startswith("waiting for "))
        fcntl.flock(self.lock, fcntl.LOCK_UN)
        host.communicate(timeout=LONG)
        self.assertEqual((0, CURRENT_VERSION), (host.returncode, self.held.read_plist(SETTINGS)["Version"]))

    def test_other_devices_do_not_wait(self):
        began = time.monotonic()
        self.assertEqual(0, self.example("current").migrate(HOST).status)
        self.assertLess(time.monotonic() - began, LONG)

    def test_commands_that_read_wait_for_a_while_and_say_that_they_go_on(self):
        clients = [self.start(ACCOUNTCTL, "--root", self.held.root, command) for command in ("list", "types", "verify")]
        for client in clients:
            _, errors = client.communicate(timeout=LONG)
            if "types" not in client.args:
                self.assertIn("while a migration may run", errors)
        self.assertEqual([0, 0], [client.returncode for client in clients[:2]])

    def test_a_client_that_only_reads_leaves_no_lock_file(self):
        device = self.example("current")
        client = self.start(ACCOUNTCTL, "--root", device.root, "list")
        client.communicate(timeout=LONG)
        self.assertEqual((0, False), (client.returncode, device.path("tmp").exists()))


@unittest.skipIf(os.getuid() != 0, "only root replaces what is another's")
class PlantedLocks(DeviceTest):
    def test_are_replaced_and_told(self):
        device = self.example("current")
        lock = device.path(LOCK)
        lock.parent.mkdir()
        for plant in (os.mkfifo, os.mkdir, lambda path: path.symlink_to("elsewhere")):
            plant(lock)
            run = device.migrate(HOST)
            self.assertEqual(0, run.status, run.errors)
            self.assertIn("was replaced, since it was", "\n".join(run.errors))
            self.assertTrue(lock.is_file() and not lock.is_symlink())
            lock.unlink()


if __name__ == "__main__":
    unittest.main()
