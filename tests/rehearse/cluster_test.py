"""The same work on a Dask cluster of three workers, one of which is killed in the middle: the same results."""

import os
import subprocess
import sys
import time
import unittest

from device_case import PLUGINS
from rehearse_case import KEPT, REHEARSE, RehearseTest

MODULES = REHEARSE.parent.parent / os.environ["DATA_DIRECTORY"] / "account-settings" / "rehearse"


class Cluster(RehearseTest):
    def start(self, module, *arguments, modules=MODULES):
        log = open(self.scratch / f"{module}.log", "ab")
        running = subprocess.Popen(
            [sys.executable, "-m", f"distributed.cli.{module}", "--no-dashboard", *map(str, arguments)],
            stdin=subprocess.DEVNULL, stdout=log, stderr=log, cwd=self.scratch,
            env={**os.environ, "PYTHONPATH": str(modules)},
        )
        self.addCleanup(log.close)
        self.addCleanup(running.wait)
        self.addCleanup(running.kill)
        return running

    def cluster(self, workers, modules=MODULES):
        file = self.scratch / "scheduler.json"
        self.start("dask_scheduler", "--host", "127.0.0.1", "--port", 0, "--scheduler-file", file)
        started = [self.start("dask_worker", "--scheduler-file", file, "--nthreads", 1, "--no-nanny", modules=modules)
                   for _ in range(workers)]
        from distributed import Client
        with Client(scheduler_file=str(file), timeout=60) as client:
            client.wait_for_workers(workers, timeout=120)
            return client.scheduler.address, started

    def test_gives_the_same_results_though_a_worker_dies(self):
        images = self.mixed_fleet(60)
        address, (_, doomed, _) = self.cluster(3)
        running = subprocess.Popen([REHEARSE, "--results", self.file, "--scheduler", address, *images],
                                   stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)
        self.wait_for_results(5)
        doomed.kill()
        told, _ = running.communicate(timeout=200)
        self.assertEqual(3, running.returncode, told)
        local = self.scratch / "local"
        self.rehearse(*images, results=local, status=3)
        self.assertEqual(63, len(self.verdicts()))
        self.assertEqual(self.told(local), self.told())

    def test_keeps_what_came_while_another_image_hangs(self):
        images = [self.image(kind, [{**KEPT, "Identifier": kind}]) for kind in ("hang", "fine", "well")]
        for image in images:
            (image / "etc/direction").write_text(image.name)
        address, _ = self.cluster(2)
        running = subprocess.Popen([REHEARSE, "--results", self.file, "--scheduler", address, "--timeout", "300",
                                    "--plugin", PLUGINS / "directed_migrator.so", *images], stdout=subprocess.DEVNULL)
        self.addCleanup(running.wait)
        self.addCleanup(running.kill)
        self.wait_for_results(2)
        self.assertEqual({"fine", "well"}, set(self.verdicts()))

    def wait_for_results(self, count):
        deadline = time.monotonic() + 100
        while time.monotonic() < deadline:
            try:
                if self.rows("SELECT count(*) FROM rehearsals")[0][0] >= count:
                    return
            except Exception:  # the file is being made
                pass
            time.sleep(0.01)
        self.fail("no results")

    def test_that_lacks_the_program_is_said(self):
        address, _ = self.cluster(1, modules=self.scratch)
        self.assertIn("lacks migration_rehearse", self.rehearse("--scheduler", address, self.image("one"), status=5))

    def test_that_is_not_there_is_said(self):
        self.assertIn("no scheduler", self.rehearse("--scheduler", "tcp://127.0.0.1:9", self.image("one"), status=5))


if __name__ == "__main__":
    unittest.main()
