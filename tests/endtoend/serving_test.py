"""A host that rehearses device after device, each in a child of its own, as if it were started for it."""

import json
import os
import plistlib
import subprocess
import sys
import time
import unittest
from pathlib import Path
from typing import NamedTuple

from device import EXAMPLES, SETTINGS, Device, run_host
from device_case import HOST, PLUGINS
from golden_devices_test import ANSWERS, DEVICES
from random_devices import RECORDS_SWITCH, RandomDevice
from rehearsal_case import UUID, RehearsalTest, every_detail, masked

COUNT = int(os.environ.get("RANDOM_DEVICES", "36"))


class Answer(NamedTuple):
    head: dict
    output: str
    errors: str


class Server:
    def __init__(self, *options):
        self.process = subprocess.Popen([HOST, "--serve-rehearsals", *options], stdin=subprocess.PIPE,
                                        stdout=subprocess.PIPE, stderr=subprocess.PIPE)
        self.greeting = json.loads(self.process.stdout.readline() or "null")

    def send(self, **request):
        self.process.stdin.write(json.dumps(request).encode() + b"\n")
        self.process.stdin.flush()

    def answer(self):
        head = json.loads(self.process.stdout.readline())
        return Answer(head, *(self.process.stdout.read(head[part]).decode() for part in ("output", "errors")))

    def rehearse(self, root, **limits):
        self.send(root=str(root), **limits)
        return self.answer()

    def end(self):
        """Closes its input and answers its exit status and what it said."""
        _, errors = self.process.communicate(timeout=30)
        return self.process.returncode, errors.decode()

    def abandon(self):
        for end in (self.process.stdin, self.process.stdout, self.process.stderr):
            end.close()


class ServingTest(RehearsalTest):
    def server(self, *options):
        server = Server(*options)
        self.addCleanup(server.abandon)
        self.addCleanup(server.process.wait)
        self.addCleanup(server.process.kill)
        return server

    def directed(self, direction, name=None):
        """A device that directs the plug-in."""
        device = Device(self.scratch / (name or direction))
        device.write("etc/direction", direction)
        return device.root

    def directed_server(self):
        return self.server("--plugin", PLUGINS / "directed_migrator.so")


class Served(ServingTest):
    def assert_as_alone(self, server, device):
        known = set(UUID.findall(repr([path.read_bytes() for path in device.root.rglob("*") if path.is_file()])))
        before = every_detail(device.root)
        served = server.rehearse(device.root)
        alone = run_host(HOST, "--root", device.root, "--dry-run", "--explain=json")
        self.assertEqual(before, every_detail(device.root))
        self.assertEqual((alone.status, ""), (served.head["status"], served.head["stopped"]))
        self.assertEqual(self.told(alone.output, known), self.told(served.output.splitlines(), known))
        self.assertEqual(self.told(alone.errors, known), self.told(served.errors.splitlines(), known))

    def told(self, lines, known):
        return masked("\n".join(line for line in lines if '"time": ' not in line), known)

    def test_examples_are_told_of_as_alone(self):
        server = self.server()
        for example in sorted(EXAMPLES.iterdir()):
            with self.subTest(example=example.name):
                self.assert_as_alone(server, self.example(example.name))
        self.assertEqual((0, ""), server.end())

    def test_devices_of_every_version_are_told_of_as_alone_whichever_came_before(self):
        server = self.server()
        for directory in [*sorted(DEVICES.iterdir()), *sorted(DEVICES.iterdir(), reverse=True)]:
            with self.subTest(device=directory.name):
                device = self.device()
                for name, path in {**ANSWERS, "settings.plist": SETTINGS}.items():
                    device.path(path).unlink(missing_ok=True)
                    if (directory / name).exists():
                        device.write_plist(path, plistlib.loads((directory / name).read_bytes()))
                self.assert_as_alone(server, device)

    def test_random_devices_are_told_of_as_alone(self):
        server = self.server()
        for seed in range(COUNT):
            with self.subTest(seed=seed):
                device = Device(self.scratch / f"device-{seed}")
                device.set_mobile(os.getuid(), os.getgid())
                RandomDevice(seed).fill(device)
                self.assert_as_alone(server, device)

    def test_more_than_a_pipe_holds_is_told_as_alone(self):
        accounts = [{"Identifier": str(number), "Type": "CalDAV"} for number in range(300)]
        device = self.device(Version=0, Accounts=accounts)
        server = self.server()
        self.assert_as_alone(server, device)
        self.assertGreater(server.rehearse(device.root).head["output"], 1 << 16)

    def test_what_one_device_answers_is_no_answer_of_the_next(self):
        server, odd, plain = self.server(), self.example("first-generation"), self.example("legacy-files")
        odd.write_plist("etc/vorlix/device-info.plist", {"CPUArchitecture": "armv6", "RegionalBehaviorGoogleMail": True})
        odd.write_plist(RECORDS_SWITCH, {"ASSaveMigrationInformation": True})
        for device in (plain, odd, plain, odd):
            self.assert_as_alone(server, device)

    def test_what_is_no_directory_is_refused_as_alone(self):
        served = self.server().rehearse("/nowhere")
        alone = self.run_host("--root", "/nowhere", "--dry-run", "--explain=json")
        self.assertEqual((alone.status, alone.errors), (served.head["status"], served.errors.splitlines()))

    def test_what_it_cost_is_told(self):
        head = self.server().rehearse(self.example("current").root).head
        self.assertTrue(0 < head["seconds"] < 60 and 0 < head["processorSeconds"] < 60, head)
        self.assertGreater(head["peakMemory"], 1 << 20)

    def test_requests_may_come_before_the_answers(self):
        server, root = self.server(), str(self.example("current").root)
        for _ in range(50):
            server.send(root=root)
        self.assertEqual({0}, {server.answer().head["status"] for _ in range(50)})


class Breaking(ServingTest):
    """A device that breaks its run is lost alone."""

    def lost(self, direction, **limits):
        server = self.directed_server()
        answer = server.rehearse(self.directed(direction), **limits)
        self.assertEqual(0, server.rehearse(self.directed("", "fine")).head["status"])
        return answer.head["status"], answer.head["stopped"]

    def test_one_that_crashes_is_told_by_its_signal(self):
        status, stopped = self.lost("crash")
        self.assertEqual("", stopped)
        self.assertNotEqual(0, status)  # the signal, or what a sanitizer makes of it

    def test_one_that_hangs_is_ended_in_time(self):
        self.assertEqual((-9, "timeout"), self.lost("hang", seconds=0.5))

    def test_one_that_keeps_a_core_busy_is_ended_in_time(self):
        self.assertEqual((-9, "timeout"), self.lost("spin", seconds=0.5))

    def test_one_that_prints_for_ever_is_ended(self):
        self.assertEqual((-9, "too-much-output"), self.lost("print", output=1 << 20))

    def test_of_one_that_complains_for_ever_a_mebibyte_is_kept(self):
        server = self.directed_server()
        answer = server.rehearse(self.directed("talk"), seconds=1)
        self.assertEqual(("timeout", 1 << 20), (answer.head["stopped"], len(answer.errors)))

    def test_one_that_throws_has_its_own_status(self):
        self.assertEqual((1, ""), self.lost("throw"))

    def test_one_that_leaves_a_process_behind_leaves_none(self):
        server = self.directed_server()
        answer = server.rehearse(self.directed("leave"), seconds=1)
        self.assertEqual("timeout", answer.head["stopped"])  # the other holds its output open
        self.assertEqual([], children_of(server.process.pid))

    def test_one_that_kills_the_server_ends_it(self):
        server = self.directed_server()
        server.send(root=str(self.directed("murder")))
        self.assertEqual(-9, server.process.wait(timeout=30))


def children_of(process):
    return Path(f"/proc/{process}/task/{process}/children").read_text().split()


class Servers(ServingTest):
    def test_say_what_they_are(self):
        version = run_host(HOST, "--version").output[0].split()[-1]
        self.assertEqual({"serves": "rehearsals", "protocol": 1, "host": version}, self.server().greeting)

    def test_end_at_what_is_no_request(self):
        for request in (b"no JSON", b"{}", b'{"root": 7}', b'{"root": ""}', b'{"root": "/", "seconds": 0}',
                        b'{"root": "/", "memory": "lots"}'):
            server = self.server()
            server.process.stdin.write(request + b"\n")
            status, said = server.end()
            self.assertEqual(2, status, request)
            self.assertRegex(said, "^migration-host: no .*\n$")

    def test_without_a_plug_in_do_not_begin(self):
        server = self.server("--plugin", "/nowhere.so")
        self.assertIsNone(server.greeting)
        self.assertEqual(3, server.process.wait(timeout=30))

    def test_take_no_option_of_a_single_run(self):
        for option in (["--root", "/"], ["--dry-run"], ["--explain"], ["--strict"], ["--trace", "t"], ["--home", "/"],
                       ["--snapshots", "/var/s"]):
            run = self.run_host("--serve-rehearsals", *option)
            self.assertEqual(2, run.status)
            self.assertIn(f"--serve-rehearsals and {option[0]} exclude each other", run.errors[0])

    def test_end_with_who_asked_and_so_does_what_they_are_at(self):
        server = self.directed_server()
        server.send(root=str(self.directed("hang")))
        child = self.wait_for(lambda: children_of(server.process.pid))[0]
        server.abandon()
        self.assertEqual(1, server.process.wait(timeout=30))
        self.wait_for(lambda: not Path(f"/proc/{child}").exists())

    def test_that_are_killed_take_with_them_what_they_are_at(self):
        server = self.directed_server()
        server.send(root=str(self.directed("hang")))
        child = self.wait_for(lambda: children_of(server.process.pid))[0]
        server.process.kill()
        self.wait_for(lambda: not Path(f"/proc/{child}").exists())

    def wait_for(self, condition):
        deadline = time.monotonic() + 30
        while not (answer := condition()):
            self.assertLess(time.monotonic(), deadline)
            time.sleep(0.02)
        return answer


if __name__ == "__main__":
    sys.exit(unittest.main())
