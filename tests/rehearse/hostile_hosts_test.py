"""Hosts that hang, crash, eat memory or talk without end, as a hostile image might make them: each ends as one row."""

import fcntl
import os
import signal
import threading
import unittest

from device_case import HOST as REAL_HOST
from device_case import PLUGINS
from rehearse_case import KEPT, UNFIXABLE, RehearseTest

from migration_rehearse import host, serving

# What a run of this host does is said by a file of the device.
HOST = """#!/usr/bin/python3
import os, resource, signal, sys, time
if "--version" in sys.argv:
    sys.exit(print("migration-host 9.9"))
what = open(sys.argv[sys.argv.index("--root") + 1] + "/etc/passwd").read().split(":")[0]
if what == "hang":
    signal.signal(signal.SIGTERM, signal.SIG_IGN); time.sleep(600)
if what == "spin":
    while True: pass
if what == "crash":
    os.kill(os.getpid(), signal.SIGSEGV)
if what == "eat":
    held = []
    try:
        while True: held.append(b"x" * (1 << 24))
    except MemoryError:
        sys.exit(1)
if what == "talk":
    while True: sys.stdout.write("x" * 65536)
if what == "orphan" and os.fork() == 0:
    time.sleep(600)
if what == "murder":
    os.kill(os.getppid(), signal.SIGKILL)
if what == "refuse":
    sys.stderr.write("it is a link\\n"); sys.exit(8)
if what == "silent":
    sys.exit(0)
if what == "quote":
    print(sys.argv[sys.argv.index("--root") + 1], os.environ); sys.exit(0)
print('{"stages": [], "result": {"success": true, "verdict": "kept", "lost": []}}')
"""


class HostileImages(RehearseTest):
    """A host that serves, with a plug-in that does what a file of the device says."""

    def rehearsing(self, *kinds, status=3):
        images = []
        for kind in kinds:
            images.append(self.image(kind, [{**KEPT, "Identifier": kind}]))
            (images[-1] / "etc/direction").write_text(kind)
        self.rehearse("--plugin", PLUGINS / "directed_migrator.so", "--timeout", 2, "--memory", "300M", "--max-output",
                      "1M", "--workers", 2, *images, status=status)
        return {name: " ".join(each).strip() for name, each in self.verdicts().items()}

    def test_are_one_row_each_with_the_reason(self):
        self.assertEqual(
            {"hang": "unrehearsed timeout", "spin": "unrehearsed timeout", "crash": "unrehearsed crashed",
             "eat": "unrehearsed memory", "print": "unrehearsed too-much-output", "leave": "unrehearsed timeout",
             "fail": "failed", "fine": "kept"},
            self.rehearsing("hang", "spin", "crash", "eat", "print", "leave", "fail", "fine"))

    def test_that_take_the_host_with_them_take_nobody_elses_results(self):
        others = [f"other{number}" for number in range(12)]
        found = self.rehearsing("murder", *others)
        self.assertEqual("unrehearsed worker-died", found.pop("murder"))
        self.assertEqual(dict.fromkeys(others, "kept"), found)

    def assert_nothing_is_lost(self, kill):
        """Though `kill` ends the host that serves, of which it is given the process, between two images."""
        root = self.image("one")
        program = host.Host(str(REAL_HOST))
        limits = host.Limits()
        self.addCleanup(serving.close)
        before = serving.rehearse(program, str(root), limits)
        kill(serving._kept.server._process)
        after = serving.rehearse(program, str(root), limits)
        self.assertEqual((0, before.errors), (after.status, after.errors))

    def test_lose_nothing_to_a_host_that_dies_once(self):
        def kill(process):
            process.kill()
            process.wait()

        self.assert_nothing_is_lost(kill)

    def test_lose_nothing_to_a_host_that_dies_while_it_is_asked(self):
        def kill(process):
            os.kill(process.pid, signal.SIGSTOP)
            threading.Timer(0.2, process.kill).start()

        self.assert_nothing_is_lost(kill)


class LockedImages(RehearseTest):
    def test_are_one_row_with_who_holds_them_though_there_is_time_left(self):
        images = [self.image("free"), self.image("held", [UNFIXABLE])]
        (images[1] / "tmp").mkdir()
        with open(images[1] / "tmp/AccountMigrationInProgress", "wb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            self.rehearse(*images, "--timeout", 8, status=3)
        self.assertEqual({"free": ("kept", ""), "held": ("unrehearsed", "locked")}, self.verdicts())
        ((detail,),) = self.rows("SELECT detail FROM rehearsals WHERE cause = 'locked'")
        self.assertIn(f"process {os.getpid()} ", detail)
        self.rehearse(*images, "--again", status=1)

    def test_are_waited_for_no_longer_than_the_image_may_take(self):
        waits = {limit: host.Limits(seconds=limit).lock_seconds for limit in (0, 0.5, 2, 4, 60)}
        self.assertEqual({0: 5, 0.5: 0, 2: 1, 4: 2, 60: 5}, waits)


class HostileHosts(RehearseTest):
    def rehearsing(self, *kinds, status=3):
        program = self.scratch / "host"
        program.write_text(HOST)
        program.chmod(0o755)
        images = []
        for kind in kinds:
            images.append(self.image(kind))
            (images[-1] / "etc/passwd").write_text(f"{kind}:x:1:1::/:/bin/sh\n")
        self.rehearse("--host", program, "--plugin", program, "--timeout", 2, "--memory", "300M", "--max-output", "1M",
                      "--workers", 3, *images, status=status)
        return {name: " ".join(each).strip() for name, each in self.verdicts().items()}

    def test_are_one_row_each_with_the_reason(self):
        self.assertEqual(
            {"hang": "unrehearsed timeout", "spin": "unrehearsed timeout", "crash": "unrehearsed crashed",
             "eat": "unrehearsed memory", "talk": "unrehearsed too-much-output", "silent": "unrehearsed no-explanation",
             "quote": "unrehearsed no-explanation", "refuse": "refused", "fine": "kept"},
            self.rehearsing("hang", "spin", "crash", "eat", "talk", "silent", "quote", "refuse", "fine"))

    def test_that_take_their_worker_with_them_take_nobody_elses_results(self):
        others = [f"other{number}" for number in range(12)]
        found = self.rehearsing("murder", *others)
        self.assertEqual("unrehearsed worker-died", found.pop("murder"))
        self.assertEqual(dict.fromkeys(others, "kept"), found)

    def test_leave_no_process_behind(self):
        self.assertEqual({"orphan": "unrehearsed timeout"}, self.rehearsing("orphan"))

    def test_are_tried_again_when_asked(self):
        self.rehearsing("crash")
        program = self.scratch / "host"
        self.rehearse("--host", program, "--plugin", program, "--again", self.scratch / "crash", status=3)
        self.assertEqual([(1,)], self.rows("SELECT count(*) FROM rehearsals"))


if __name__ == "__main__":
    unittest.main()
