"""Rehearsed runs: the device stays as it is to the last time stamp, and what is told is what a run then does."""

import fcntl
import os
import plistlib
import tempfile
import threading
import time
import unittest

from device import CURRENT_VERSION, EXAMPLES, LEGACY_MAIL, SETTINGS
from golden_devices_test import ANSWERS, DEVICES
from rehearsal_case import REHEARSAL, RehearsalTest, every_detail

LOCK = "tmp/AccountMigrationInProgress"


class Rehearsals(RehearsalTest):
    def test_of_every_example_device(self):
        for example in sorted(EXAMPLES.iterdir()):
            with self.subTest(example=example.name):
                self.assert_foretold(self.example(example.name))

    def test_of_a_device_of_every_version(self):
        for directory in sorted(DEVICES.iterdir()):
            with self.subTest(device=directory.name):
                device = self.device()
                for name, path in {**ANSWERS, "settings.plist": SETTINGS}.items():
                    if (directory / name).exists():
                        device.write_plist(path, plistlib.loads((directory / name).read_bytes()))
                self.assert_foretold(device)

    def test_of_an_empty_device(self):
        self.assert_foretold(self.device())

    def test_tell_of_a_save_that_will_fail(self):
        device = self.example("legacy-files")
        device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        self.assert_foretold(device)

    def test_tell_of_a_temporary_directory_on_another_volume(self):
        if os.stat("/dev/shm").st_dev == self.scratch.stat().st_dev:
            self.skipTest("/dev/shm is no volume of its own here")
        with tempfile.TemporaryDirectory(dir="/dev/shm") as elsewhere:
            run = self.assert_foretold(self.example("current"), environment={"TMPDIR": elsewhere})
            self.assertEqual([], os.listdir(elsewhere))
        self.assertIn("Invalid cross-device link", "\n".join(run.output))

    def test_tell_of_a_settings_file_that_is_a_directory(self):
        device = self.device()
        device.path(SETTINGS).mkdir()
        self.assertIn("Is a directory", "\n".join(self.assert_foretold(device).output))

    def test_follow_links_as_a_run_does(self):
        device = self.example("first-generation")
        device.path("private").mkdir()
        device.path("var").rename(device.path("private/var"))
        device.path("var").symlink_to("private/var")
        settings = device.path(SETTINGS)
        settings.rename(settings.with_name("elsewhere.plist"))
        settings.symlink_to("elsewhere.plist")
        self.assert_foretold(device)

    def test_follow_links_that_mean_something_else_on_this_machine(self):
        device = self.example("first-generation")
        device.path("private").mkdir()
        device.path("var").rename(device.path("private/var"))
        device.path("var").symlink_to("/private/var")
        run = self.assert_foretold(device)
        self.assertNotIn("not saved", "\n".join(run.output).lower())
        self.assertEqual(CURRENT_VERSION, plistlib.loads(device.read("private/" + SETTINGS))["Version"])

    def test_repeat_themselves(self):
        device = self.example("legacy-files")
        first, second = self.rehearsed(device), self.rehearsed(device)
        self.assertEqual(self.comparable(first, set()), self.comparable(second, set()))

    def test_without_an_explanation_say_what_they_are_and_answer_the_runs_status(self):
        device = self.example("current")
        before = every_detail(device.root)
        run = self.run_host("--root", device.root, "--dry-run")
        self.assertEqual((0, [], [REHEARSAL]), (run.status, run.output, run.errors))
        self.assertEqual(before, every_detail(device.root))
        self.assertEqual(1, self.run_directed("fail", "--dry-run").status)

    def test_explain_themselves_as_rehearsals(self):
        run = self.run_host("--root", self.example("current").root, "--dry-run", "--explain")
        self.assertEqual("What a run would do (this was a rehearsal: nothing on the device was changed)", run.output[0])

    def test_keep_the_legacy_files(self):
        device = self.example("legacy-files")
        run = self.rehearsed(device)
        self.assertIn('"source-removed"', "\n".join(run.output))
        self.assertTrue(device.path(LEGACY_MAIL).exists())


class Waiting(RehearsalTest):
    def setUp(self):
        super().setUp()
        self.current = self.example("current")
        self.lock = self.current.path(LOCK)
        self.lock.parent.mkdir()
        self.lock.touch()

    def test_a_rehearsal_waits_for_a_run_that_is_under_way(self):
        with open(self.lock, "rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            release = threading.Timer(0.5, fcntl.flock, [lock, fcntl.LOCK_UN])
            began = time.monotonic()
            release.start()
            self.rehearsed(self.current)
            self.assertGreater(time.monotonic() - began, 0.4)

    def test_a_rehearsal_does_not_wait_for_another(self):
        with open(self.lock, "rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_SH)
            self.assertEqual(0, self.rehearsed(self.current).status)

    def test_a_rehearsal_that_may_not_wait_any_longer_is_refused(self):
        with open(self.lock, "rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            before = every_detail(self.current.root)
            run = self.run_host("--root", self.current.root, "--dry-run", "--lock-timeout", "0")
        self.assertEqual((8, before), (run.status, every_detail(self.current.root)))


if __name__ == "__main__":
    unittest.main()
