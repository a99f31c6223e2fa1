"""That whole processes take no more than they did: counted, so that no busy machine fails them or lets them pass."""

import os
import subprocess
import tempfile
import unittest
from pathlib import Path

from device import CURRENT_VERSION
from process_counts import Processes, can_trace_calls

BUILD = Path(os.environ["BUILD"])
DEVICE = os.environ["BENCH_DEVICE"]
# Other processors have other ways to copy and compare, other kernels other pages at hand, and other machines other things
# beside a device that are looked for.
SLACK = 1.15
SLACK_OF_CALLS = 1.25
SLACK_OF_FAULTS = 1.4
# Instructions, calls of the kernel and page faults, as docs/PERFORMANCE.md has them.
MOST = {
    f"version {CURRENT_VERSION}": (6_600_000, 320, 250),
    "version 0": (13_170_000, 586, 292),
    "rehearsal with JSON": (14_180_000, 576, 294),
    "accountctl list": (7_790_000, 182, 247),
    "accountctl set": (8_310_000, 270, 270),
}


def make_device(root, accounts, version):
    subprocess.run([DEVICE, root, str(accounts), str(version)], check=True)


class ProcessCounts(unittest.TestCase):
    @unittest.skipUnless(can_trace_calls(), "strace cannot trace here")
    def test_stay_what_the_page_says(self):
        with tempfile.TemporaryDirectory(dir="/dev/shm") as directory:
            processes = Processes(BUILD, BUILD / "bench", directory, make_device)
            for name, (version, command, _, _) in processes.rows().items():
                counted = processes.count(version, command)
                print(f"\n{name}: {counted}", end="", flush=True)
                instructions, calls, faults = MOST[name]
                with self.subTest(name):
                    self.assertLessEqual(counted.instructions, instructions * SLACK)
                    self.assertLessEqual(counted.calls, calls * SLACK_OF_CALLS)
                    self.assertLessEqual(counted.faults, faults * SLACK_OF_FAULTS)

    def test_load_no_library_before_its_first_use(self):
        libraries = BUILD / "lib"
        announcer = libraries / "account-settings/modules/account-announcer.so"
        for binary in (BUILD / "bin/migration-host", libraries / "libaccountplatform.so", announcer):
            needed = subprocess.run(["ldd", binary], check=True, capture_output=True, text=True).stdout
            self.assertIn("libplist", needed)
            for library in ("libsystemd", "libicu"):
                self.assertNotIn(library, needed, binary)


if __name__ == "__main__":
    unittest.main()
