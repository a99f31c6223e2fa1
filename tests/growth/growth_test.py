"""That no piece of a run costs more for each account the more accounts there are: counted, never timed."""

import os
import subprocess
import unittest

from callgrind import outside

PROGRAM = os.environ["GROWTH"]
# Multiples of a hundred, so that both are of the same accounts (see bench/account_generator.h).
FEW, MANY = 100, 400
# A piece that walks all accounts for each costs four times as much an account. What is allowed beyond the same is for
# tables that grow in steps.
MOST = 1.1


class Growth(unittest.TestCase):
    def test_of_every_piece_is_no_more_than_linear(self):
        names = subprocess.run([PROGRAM], check=True, capture_output=True, text=True).stdout.splitlines()
        options = ["--toggle-collect=measuredPiece", "--dump-after=measuredPiece"]
        counts = outside("libplist", [PROGRAM, FEW, MANY], *options)
        self.assertEqual(len(counts), 2 * len(names) + 1, "each piece is counted twice")
        for name, few, many in zip(names, counts[1::2], counts[2::2]):
            with self.subTest(name):
                growth = (many / MANY) / (few / FEW)
                print(f"\n{name}: {few / FEW:.0f} and {many / MANY:.0f} instructions an account, {growth:.2f} times", end="", flush=True)
                self.assertLessEqual(growth, MOST)


if __name__ == "__main__":
    unittest.main()
