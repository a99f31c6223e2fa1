"""That no piece of a run costs more for each account the more accounts there are: counted, never timed."""

import math
import os
import unittest

from callgrind import of_pieces

PROGRAM = os.environ["BENCH_COUNT"]
# Multiples of a hundred, so that both are of the same accounts (see bench/account_generator.h).
FEW, MANY = 100, 400
# A piece that walks all accounts for each costs four times as much an account. What is allowed beyond the same is for
# tables that grow in steps.
MOST = 1.1
# Of mixtures that somebody makes up to keep a run busy, also what is sorted or found in a tree may grow.
MOST_OF_MIXTURE = MOST * math.log(MANY) / math.log(FEW)
OF_MIXTURE = {
    "pairs": ["load", "save changed", "look-up", "remove all", "7A149", "7A150", "7A242", "8A293", "9A334"],
    "type": ["load", "save changed", "merge", "look-up", "insert", "add children", "replace all", "remove all", "7A150"],
    "family": ["load", "save changed", "merge", "replace all", "remove all", "7A241", "8F191"],
}


class Growth(unittest.TestCase):
    def assert_at_most(self, name, unit, before, after, most=MOST):
        with self.subTest(name):
            growth = after / before
            print(f"\n{name}: {before:.0f} and {after:.0f} instructions {unit}, {growth:.2f} times", end="", flush=True)
            self.assertLessEqual(growth, most)

    def test_of_every_piece_is_no_more_than_linear(self):
        for name, (few, many) in of_pieces(PROGRAM, [], [FEW, MANY], "libplist").items():
            self.assert_at_most(name, "an account", few / FEW, many / MANY)

    def test_of_one_change_does_not_come_from_the_children_of_other_accounts(self):
        changes = ["insert", "update", "remove"]
        counted = of_pieces(PROGRAM, changes, [f"{MANY}/0", f"{MANY}/20"], "libplist")
        self.assertEqual(set(changes), set(counted))
        for name, (without, beside) in counted.items():
            self.assert_at_most(name, "without and beside children", without, beside)

    def test_of_folding_replacing_and_removing_withstands_hostile_mixtures(self):
        for mixture, names in OF_MIXTURE.items():
            populations = [f"{FEW}/{mixture}", f"{MANY}/{mixture}"]
            for name, (few, many) in of_pieces(PROGRAM, names, populations, "libplist").items():
                self.assert_at_most(f"{name} of {mixture}", "an account", few / FEW, many / MANY, MOST_OF_MIXTURE)


if __name__ == "__main__":
    unittest.main()
