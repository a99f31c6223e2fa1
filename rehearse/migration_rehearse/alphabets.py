"""Which characters may stand for each other: those of the same kind and length in every encoding, and where there are
enough of them, of the same script. Every character belongs to one alphabet only.

Most share one with their neighbours. Those that have nobody there share one with the like of their script, of any script,
or at last of a kind in the large; some that are nothing to be read, such as private ones, stay alone.
"""

import sys
import unicodedata
from functools import cache

BLOCK = 128  # code points that share a script
ALONE = ("Cc", "Cn", "Co", "Cs")  # categories


class Alphabet:
    """Characters, each with its place from 0."""

    def __init__(self, characters):
        self.characters = tuple(characters)
        self.places = {character: place for place, character in enumerate(self.characters)}

    def __len__(self):
        return len(self.characters)


PRINTABLE = Alphabet(map(chr, range(0x20, 0x7F)))


def of_character(character):
    """The alphabet to which it belongs."""
    if unicodedata.category(character) in ALONE:
        return Alphabet(character)
    return (_of_neighbours(ord(character) // BLOCK).get(character) or _of_lonely().get(character)
            or Alphabet(character))


def of_secret(character):
    """The same where nothing but the length shall be told."""
    return PRINTABLE if character in PRINTABLE.places else of_character(character)


@cache
def _of_neighbours(block):
    """The alphabets of those of a block that have neighbours, by each of them."""
    return _shared(_groups(_in_block(block), _looks))


@cache
def _of_lonely():
    """The alphabets of those that have none, by each of them."""
    blocks = (_groups(_in_block(block), _looks) for block in range(sys.maxunicode // BLOCK + 1))
    left = [members[0] for groups in blocks for members in groups if len(members) == 1]
    found = {}
    for likeness in (_of_script, _of_kind, _of_kind_in_the_large):
        found |= _shared(_groups(left, likeness))
        left = [character for character in left if character not in found]
    return found


def _shared(groups):
    return {character: alphabet for group in groups if len(group) > 1 for alphabet in (Alphabet(group),)
            for character in group}


def _groups(characters, likeness):
    groups = {}
    for character in characters:
        groups.setdefault(likeness(character), []).append(character)
    return groups.values()


def _in_block(block):
    return [character for character in map(chr, range(block * BLOCK, (block + 1) * BLOCK))
            if unicodedata.category(character) not in ALONE]


def _looks(character):
    """What its neighbours have in common with it: kind, length, and what becomes of it when it is normalised."""
    return (*_of_kind(character), unicodedata.is_normalized("NFC", character)
            or len(unicodedata.normalize("NFC", character).encode()))


def _of_script(character):
    return unicodedata.name(character, "").partition(" ")[0], *_of_kind(character)


def _of_kind(character):
    return unicodedata.category(character), len(character.encode())


def _of_kind_in_the_large(character):
    return unicodedata.category(character)[0], len(character.encode())
