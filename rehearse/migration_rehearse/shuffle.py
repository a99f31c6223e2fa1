"""Numbers below a bound, shuffled by a key: each becomes another, no two the same, whichever came before.

A network of rounds shuffles the numbers of an even number of bits; one that it makes too large is shuffled again until it
fits, which still leads each to a place of its own. So that none stays where it is, what changes places are neighbours in
the order that this makes.
"""

import hashlib

ROUNDS = 10


class Shuffle:
    """Of the numbers from 0 below `size`, which is 2 at least, by a key of bytes."""

    def __init__(self, key, size):
        self._key = key
        self._size = size
        self._half = max(1, ((size - 1).bit_length() + 1) // 2)  # bits
        self._length = (self._half + 7) // 8

    def other(self, number):
        """What the number becomes."""
        return self._walk((self._walk(number, range(ROUNDS)) + 1) % self._size, range(ROUNDS - 1, -1, -1))

    def _walk(self, number, rounds):
        """Through the network, in the order of these rounds: backwards what came of forwards is the number again."""
        while True:
            number = self._through(number, rounds)
            if number < self._size:
                return number

    def _through(self, number, rounds):
        mask = (1 << self._half) - 1
        halves = [number >> self._half, number & mask]
        for each in rounds:
            halves[each % 2] ^= self._mixed(each, halves[1 - each % 2]) & mask
        return halves[0] << self._half | halves[1]

    def _mixed(self, each, half):
        seed = self._key + bytes([each]) + half.to_bytes(self._length, "big")
        return int.from_bytes(hashlib.shake_256(seed).digest(self._length), "big")
