"""Rehearsals of random devices, and whether the verdicts are right; RANDOM_DEVICES says how many (default: a few dozen)."""

import json
import os
import sys
import unittest

from device import Device
from random_devices import RandomDevice
from reader import Reader
from rehearsal_case import RehearsalTest

COUNT = int(os.environ.get("RANDOM_DEVICES", "36"))


class RandomRehearsals(RehearsalTest):
    def test_tell_what_a_run_does(self):
        outcomes = set()
        for seed in range(COUNT):
            with self.subTest(seed=seed):
                device = Device(self.scratch / f"device-{seed}")
                device.set_mobile(os.getuid(), os.getgid())
                RandomDevice(seed).fill(device)
                reader = Reader(device)
                run = self.assert_foretold(device)
                reader.check(self, json.loads("\n".join(run.output)))
                self.assertNotIn("never shown", repr((run.output, run.events)))
                outcomes.add('"fact": "saved"' in "\n".join(run.output))
        self.assertEqual({True, False}, outcomes)


if __name__ == "__main__":
    sys.exit(unittest.main())
