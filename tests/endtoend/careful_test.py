"""Runs that rehearse first: what a rehearsal foretells is said, kept for, or refused, and one that breaks is survived."""

import fcntl
import os
import subprocess
import threading
import time
import unittest

from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS
from device_case import HOST, PLUGINS, can_trace_calls, strace
from rehearsal_case import every_detail
from snapshots_case import SnapshotsTest

KEPT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "KEPT"}
LOST = {"Type": "Mail", "Class": "Unheard of", "Identifier": "LOST"}
FORETOLD = "migration-host: a rehearsal foretold a loss: Mail (LOST) [dropped-unknown-class]"


class CarefulTest(SnapshotsTest):
    host = HOST

    def settings(self, *accounts, version=11):
        return self.device(Version=version, Accounts=list(accounts))

    def directed(self, direction):
        device = self.device()
        device.write("etc/direction", direction)
        return device

    def kept_for(self):
        return [each["keptFor"] for each in self.list()]


class Careful(CarefulTest):
    def test_runs_that_lose_nothing_say_nothing_and_do_what_others_do(self):
        device = self.settings(KEPT)
        run = self.migrate(device, "--careful")
        self.assertEqual((0, [], ["Migrating accounts"]), (run.status, run.output, run.errors))
        self.assertEqual([[]], self.kept_for())
        self.assertEqual([KEPT], device.read_plist(SETTINGS)["Accounts"])

    def test_runs_that_lose_an_account_say_so_before_and_keep_their_snapshot(self):
        run = self.migrate(self.settings(KEPT, LOST), "--careful")
        self.assertEqual((0, FORETOLD), (run.status, run.errors[0]))
        ((reason,),) = self.kept_for()
        self.assertIn("[dropped-unknown-class]", reason)

    @unittest.skipIf(os.environ["SANITIZE"], "a sanitizer looks for leaks in no traced program")
    @unittest.skipUnless(can_trace_calls(), "system calls cannot be traced here")
    def test_runs_whose_rehearsal_breaks_go_on_and_keep_their_snapshot(self):
        for number, (call, said) in enumerate((("setsid:signal=SIGSEGV", "the rehearsal was ended by signal 11"),
                                               ("clone:error=EAGAIN", "there was no rehearsal: Could not make a "
                                                "process: Resource temporarily unavailable (errno 11)"))):
            device = self.settings({**KEPT, "Identifier": f"K{number}"})
            run = subprocess.run([*strace("-o", os.devnull, "-e", f"inject={call}"), HOST, "--root", device.root,
                                  "--careful", "--snapshots", self.snapshots], capture_output=True, text=True, check=False)
            self.assertEqual((0, f"migration-host: {said}"), (run.returncode, run.stderr.splitlines()[0]))
            self.assertEqual([said], self.kept_for()[number])

    def test_a_rehearsal_is_careful_itself(self):
        device = self.settings(KEPT, LOST)
        before = every_detail(device.root)
        run = self.migrate(device, "--careful", "--dry-run")
        self.assertEqual((0, before), (run.status, every_detail(device.root)))


class Refusing(CarefulTest):
    def test_runs_that_would_lose_an_account_do_not_touch_the_device(self):
        device = self.settings(KEPT, LOST)
        before = every_detail(device.root)
        run = self.run_host("--root", device.root, "--refuse-loss")
        self.assertEqual((7, [], before), (run.status, run.output, every_detail(device.root)))
        self.assertEqual([FORETOLD, "migration-host: the run is refused, since something may be lost; the device was not"
                          " touched"], run.errors)

    def test_runs_that_would_not_be_saved_do_not_touch_the_device(self):
        device = self.old_device()
        device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        before = every_detail(device.root)
        run = self.run_host("--root", device.root, "--refuse-loss")
        self.assertEqual((7, before), (run.status, every_detail(device.root)))
        self.assertIn("a rehearsal foretold that the accounts are not saved: ", run.errors[0])
        self.assertTrue(device.path(LEGACY_MAIL).exists())

    def test_runs_whose_rehearsal_breaks_do_not_begin(self):
        device = self.directed("crash")
        run = self.run_host("--root", device.root, "--plugin", PLUGINS / "directed_migrator.so", "--refuse-loss")
        self.assertEqual(7, run.status)
        self.assertIn("the rehearsal ", run.errors[0])

    def test_runs_that_lose_nothing_are_made(self):
        device = self.settings(KEPT)
        self.assertEqual(0, self.run_host("--root", device.root, "--refuse-loss").status)
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])

    def test_a_rehearsal_ends_with_the_status_of_the_run(self):
        device = self.settings(LOST)
        self.assertEqual(7, self.run_host("--root", device.root, "--refuse-loss", "--dry-run").status)

    def test_the_lock_is_waited_for_first(self):
        device = self.settings(LOST)
        lock = device.path("tmp/AccountMigrationInProgress")
        lock.parent.mkdir()
        lock.touch()
        with open(lock, "rb") as held:
            fcntl.flock(held, fcntl.LOCK_EX)
            self.assertEqual(8, self.run_host("--root", device.root, "--refuse-loss", "--lock-timeout=0").status)
            release = threading.Timer(0.5, fcntl.flock, [held, fcntl.LOCK_UN])
            began = time.monotonic()
            release.start()
            self.assertEqual(7, self.run_host("--root", device.root, "--refuse-loss").status)
            self.assertGreater(time.monotonic() - began, 0.4)


class Use(CarefulTest):
    def test_is_for_runs_and_needs_what_it_keeps(self):
        for arguments, message in ((["--careful"], "--careful needs --snapshots"),
                                   (["--careful", "--undo", "--snapshots", "/s"], "--careful is for a run"),
                                   (["--refuse-loss", "--undo", "--snapshots", "/s"], "--refuse-loss is for a run")):
            run = self.run_host(*arguments)
            self.assertEqual(2, run.status)
            self.assertIn(message, run.errors[0])


if __name__ == "__main__":
    unittest.main()
