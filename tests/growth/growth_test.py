"""That no piece of a run costs more for each account the more accounts there are: counted, never timed."""

import math
import os
import unittest

from callgrind import of_pieces

PROGRAM = os.environ["BENCH_COUNT"]
# Multiples of a hundred, so that all are of the same accounts (see bench/account_generator.h).
FEW, MANY, VERY_MANY = 100, 400, 50_000
# A device with more pairs of a mail account and its calendar account is refused as hostile.
MOST_IN_PAIRS = 20_000
# A piece that walks all accounts for each costs four times as much an account. What is allowed beyond the same is for
# tables that grow in steps.
MOST = 1.1
# Among five hundred times as many even a walk that only compares addresses shows.
MOST_OF_VERY_MANY = 1.2
# Without what is libplist's: of a list of so many it takes as long to write one as the square of its values.
OF_VERY_MANY = ["load", "look-up", "merge", "save changed", "replace all"]
OF_MIXTURE = {
    "pairs": ["load", "save changed", "look-up", "remove all", "7A149", "7A150", "7A242", "8A293", "9A334"],
    "type": ["load", "save changed", "merge", "look-up", "insert", "add children", "replace all", "remove all", "7A150"],
    "family": ["load", "save changed", "merge", "replace all", "remove all", "remove alike", "7A241", "8F191"],
    "hosted": ["7A241", "8B117", "8C136"],
    "twins": ["load", "save changed", "look-up", "replace all", "remove all", "explain"],
}
OF_VERY_LARGE_MIXTURE = {"pairs": ["7A242"], "type": ["replace all"], "family": ["remove alike"], "hosted": ["8B117"],
                         "twins": ["explain"]}


def of_sorting(most, many):
    """Of mixtures that somebody makes up to keep a run busy, also what is sorted or found in a tree may grow."""
    return most * math.log(many) / math.log(FEW)


class Counting(unittest.TestCase):
    def assert_at_most(self, name, unit, before, after, most=MOST):
        with self.subTest(name):
            growth = after / before
            print(f"\n{name}: {before:.0f} and {after:.0f} instructions {unit}, {growth:.2f} times", end="", flush=True)
            self.assertLessEqual(growth, most)

    def assert_pieces_grow_at_most(self, names, many, most, mixture=""):
        populations = [f"{accounts}/{mixture}" if mixture else accounts for accounts in (FEW, many)]
        for name, (few, among_many) in of_pieces(PROGRAM, names, populations, "libplist").items():
            self.assert_at_most(f"{name} {mixture}".rstrip(), "an account", few / FEW, among_many / many, most)


class Growth(Counting):
    def test_of_every_piece_is_no_more_than_linear(self):
        self.assert_pieces_grow_at_most([], MANY, MOST)

    def test_of_one_change_does_not_come_from_the_children_of_other_accounts(self):
        changes = ["insert", "update", "remove"]
        counted = of_pieces(PROGRAM, changes, [f"{MANY}/0", f"{MANY}/20"], "libplist")
        self.assertEqual(set(changes), set(counted))
        for name, (without, beside) in counted.items():
            self.assert_at_most(name, "without and beside children", without, beside)

    def test_of_folding_replacing_and_removing_withstands_hostile_mixtures(self):
        for mixture, names in OF_MIXTURE.items():
            self.assert_pieces_grow_at_most(names, MANY, of_sorting(MOST, MANY), mixture)


class GrowthAmongVeryMany(Counting):
    def test_of_loading_finding_and_saving_is_no_more_than_linear(self):
        self.assert_pieces_grow_at_most(OF_VERY_MANY, VERY_MANY, MOST_OF_VERY_MANY)

    def test_of_folding_replacing_and_removing_withstands_hostile_mixtures(self):
        for mixture, names in OF_VERY_LARGE_MIXTURE.items():
            many = MOST_IN_PAIRS if mixture == "pairs" else VERY_MANY
            self.assert_pieces_grow_at_most(names, many, of_sorting(MOST_OF_VERY_MANY, many), mixture)


if __name__ == "__main__":
    unittest.main()
