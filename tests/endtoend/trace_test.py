"""The trace: one JSON object a line, in the order in which things happened, whatever stands in them."""

import calendar
import json
import os
import stat
import threading
import time
import unittest

from device_case import PLUGINS, DeviceTest

INCOMPLETE = "migration-host: the trace is incomplete: not every event could be written: "
TOLD = [
    {"event": "console", "message": "first"},
    {
        "event": "log",
        "subsystem": "com.example.test",
        "category": "log",
        "message": '-[Test tell] (7) "told"',
    },
    {"event": "preferences-changed", "domain": "com.example.domain", "key": "Key"},
    {"event": "cloud-tabs", "enabled": True},
    {"event": "cloud-tabs", "enabled": False},
    {"event": "console", "message": 'no UTF-8: \ufffd\ufffd\n"quoted"'},
    {"event": "result", "dataClass": "directed", "success": True, "verdict": "kept"},
]


class TraceTest(DeviceTest):
    def setUp(self):
        super().setUp()
        self.trace = self.scratch / "trace"

    def lines(self):
        return self.trace.read_text(encoding="utf-8").split("\n")

    def test_holds_each_event_in_order_on_a_line_of_its_own(self):
        run = self.run_directed("tell", "--trace", self.trace)
        self.assertEqual(0, run.status)
        self.assertEqual("", self.lines()[-1])
        self.assertEqual(TOLD, [json.loads(line) for line in self.lines()[1:-1]])

    def test_begins_with_what_is_run(self):
        before = time.time()
        self.run_directed("succeed", "--trace", self.trace, "--strict", "--explain=json", "--keep", "2", "--snapshots", self.scratch / "s")
        start = json.loads(self.lines()[0])
        given = ["--plugin=" + str(PLUGINS / "directed_migrator.so"), "--strict", "--explain=json", "--keep=2",
                 f"--snapshots={self.scratch / 's'}"]
        when = calendar.timegm(time.strptime(start.pop("time"), "%Y-%m-%dT%H:%M:%SZ"))
        self.assertTrue(int(before) <= when <= time.time())
        version = self.run_host("--version").output[0].split()[-1]
        self.assertEqual({"event": "start", "schema": 1, "run": 1, "version": version, "root": str(self.scratch / "device"),
                          "options": given}, start)

    def test_keeps_the_order_of_an_events_members(self):
        self.run_directed("tell", "--trace", self.trace)
        self.assertEqual('{"event":"result","dataClass":"directed","success":true,"verdict":"kept"}', self.lines()[-2])
        self.assertTrue(self.lines()[2].startswith('{"event":"log","subsystem":"com.example.test","category":"log",'))

    def test_passes_the_events_on(self):
        errors = self.run_directed("tell", "--trace", self.trace).errors
        self.assertEqual("first", errors[0])

    def test_tells_of_a_failed_run(self):
        self.assertEqual(1, self.run_directed("fail", "--trace", self.trace).status)
        self.assertEqual(
            ['{"event":"result","dataClass":"directed","success":false,"verdict":"kept"}', ""], self.lines()[1:]
        )

    def test_is_readable_by_its_owner_only(self):
        self.run_directed("succeed", "--trace", self.trace)
        self.assertEqual(0o600, stat.S_IMODE(self.trace.stat().st_mode))

    def test_is_appended_to(self):
        self.trace.write_text("earlier\n")
        self.run_directed("succeed", "--trace", self.trace)
        self.assertEqual(["earlier", "start", "result"], [line.split('"')[3] if '"' in line else line for line in self.lines()[:-1]])

    def test_numbers_the_runs_of_a_file(self):
        for _ in range(3):
            self.run_directed("tell", "--trace", self.trace)
        starts = [event for event in map(json.loads, self.lines()[:-1]) if event["event"] == "start"]
        self.assertEqual([1, 2, 3], [start["run"] for start in starts])

    def test_refuses_a_symbolic_link(self):
        self.trace.symlink_to(self.scratch / "target")
        run = self.run_directed("succeed", "--trace", self.trace)
        self.assertEqual(2, run.status)
        self.assertEqual(1, len(run.errors))
        self.assertRegex(run.errors[0], rf"^migration-host: Could not open the trace file {self.trace}: ")
        self.assertFalse((self.scratch / "target").exists())

    def test_refuses_a_directory(self):
        run = self.run_directed("succeed", "--trace", self.scratch)
        self.assertEqual((2, 1), (run.status, len(run.errors)))

    def test_that_cannot_be_written_is_said_to_be_incomplete(self):
        run = self.run_directed("succeed", "--trace", "/dev/full")
        self.assertEqual((9, [f"{INCOMPLETE}No space left on device (errno 28)"]), (run.status, run.errors))

    def test_whose_reader_goes_away_does_not_end_the_run(self):
        os.mkfifo(self.trace)
        reader = threading.Thread(target=read_a_little, args=[os.open(self.trace, os.O_RDONLY | os.O_NONBLOCK)])
        reader.start()
        run = self.run_directed("tell slowly", "--trace", self.trace)
        reader.join()
        self.assertEqual((9, f"{INCOMPLETE}Broken pipe (errno 32)"), (run.status, run.errors[-1]))


def read_a_little(pipe):
    """Reads until the first bytes come, then goes away."""
    deadline = time.monotonic() + 30
    with open(pipe, "rb", buffering=0) as stream:
        while not stream.read(1) and time.monotonic() < deadline:
            time.sleep(0.01)


if __name__ == "__main__":
    unittest.main()
