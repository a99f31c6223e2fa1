"""What the fuzzers take for one input: counted, never timed, over the kept corpora."""

import os
import unittest
from pathlib import Path

from callgrind import outside

PROGRAMS = Path(os.environ["PROGRAMS"])
CORPORA = Path(__file__).parent / "corpus"
# Instructions for an input of the kept corpus, without what the engine and the sanitizers add: half as many again as it
# took when the figures of docs/RELIABILITY.md were taken.
MOST = {"property_list": 207_000, "whole_run": 2_030_000}


class Counts(unittest.TestCase):
    def test_leave_the_fuzzers_fast_enough_to_find_something(self):
        for name, most in MOST.items():
            inputs = CORPORA / name
            command = [PROGRAMS / f"{name}_fuzzer", inputs]
            [instructions] = outside("no library", command, "--toggle-collect=LLVMFuzzerTestOneInput")
            for_each = instructions / len(list(inputs.iterdir()))
            print(f"\n{name}: {for_each:,.0f} instructions for each input", end="", flush=True)
            with self.subTest(name):
                self.assertLessEqual(for_each, most)


if __name__ == "__main__":
    unittest.main()
