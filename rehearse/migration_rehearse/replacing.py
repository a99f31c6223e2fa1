"""Texts, numbers and data replaced by others of the same kind, length and script, the same each time for the same key.

A text is replaced word by word, a word being letters and digits in a row, and what stands between the words stays. So two
texts are equal, or begin with the same words, after they were replaced exactly where they did before; an address
stays an address, and the name in it the name that stands elsewhere. What the migration looks for in texts stays.

The key shuffles all words of one form among themselves, but for those that mean something to the migration. So words that
differ stay different, and what a word becomes is decided by the key alone, not by what came before it.
"""

import hashlib
import math
import re
from bisect import bisect_left

from migration_rehearse import alphabets
from migration_rehearse.alphabets import Alphabet
from migration_rehearse.shuffle import Shuffle
from migration_rehearse.vocabulary import FRAGMENTS, KEYS, READ_KEYS, TEXTS, names_credential

UUID = re.compile(r"\b[0-9A-Fa-f]{8}-(?:[0-9A-Fa-f]{4}-){3}[0-9A-Fa-f]{12}\b")
UUID_KIND = (14, 19)  # the places of the digits that tell of which kind it is
HEX_DIGITS, HEX_LETTERS, DIGITS = Alphabet("0123456789ABCDEF"), Alphabet("ABCDEF"), Alphabet("0123456789")
WORD = re.compile(r"[^\W_]+")
ESCAPES = re.compile(r"(?:%[0-9A-Fa-f]{2})+")
READ_TEXT = re.compile(r"\s*(?:[+-]?\d{1,20}|yes|no|true|false)\s*", re.I)
LEADING_INTEGER = re.compile(r"\s*[+-]?\d+")
SMALL_INTEGER = 100_000  # ports, counts and switches; what is larger may be somebody's number
RANGES = ((-(1 << 63), -1), (0, (1 << 63) - 1), (1 << 63, (1 << 64) - 1))  # that the numbers of property lists fit into
RESERVED = TEXTS | KEYS  # of these, words stay, and are what no other becomes
PIECE = 64  # letters that are shuffled at a time; no reserved word is longer


class CannotAnonymise(Exception):
    """The archive would not do, so there is none."""


class Replacer:
    """Replaces for one key. The texts that are `known` to the product beside its vocabulary stay, too. Raises
    CannotAnonymise for what nothing else can stand for."""

    def __init__(self, key, known=()):
        self._key = hashlib.blake2b(key).digest()
        self.known = TEXTS | frozenset(known)
        self._made = {}  # by kind and text

    @property
    def words(self):
        """Those that were replaced, and must not be found again."""
        return {text for _, text in self._made}

    @property
    def replacements(self):
        """What stands for them."""
        return set(self._made.values())

    def text(self, text, key=""):
        """The text in place of one that stands under a key."""
        if key in READ_KEYS:
            return self._read_text(text)
        if text and names_credential(key):
            return self._once("secret", text, self._secret)
        return text if text in self.known else self._replaced(text)

    def key(self, key):
        return key if key in KEYS else self._replaced(key)

    def integer(self, number, key=""):
        if key in READ_KEYS or number == 0 or (abs(number) < SMALL_INTEGER and not names_credential(key)):
            return number
        return int(self._once("number", str(number), self._number))

    def real(self, number, key=""):
        if key in READ_KEYS or not abs(number) >= SMALL_INTEGER or number in (float("inf"), float("-inf")):
            return number
        mantissa, _, exponent = repr(number).partition("e")
        whole, _, rest = mantissa.partition(".")
        digits = self._once("number", whole + rest if exponent else whole, self._number)
        return float(f"{digits[:len(whole)]}.{digits[len(whole):] or rest}e{exponent or 0}")

    def data(self, data):
        number = self._shuffled(f"data {len(data)}", int.from_bytes(data, "big"), 256 ** len(data))
        return number.to_bytes(len(data), "big")

    def _read_text(self, text):
        if READ_TEXT.fullmatch(text):
            return text
        number = LEADING_INTEGER.match(text)
        begin = number.end() if number else 0
        return text[:begin] + self._replaced(text[begin:])

    def _replaced(self, text):
        plain, escaped = _unescaped(text)
        kept, replaced = 0, []
        for fragment in FRAGMENTS.finditer(plain):
            replaced += [self._words(plain[kept : fragment.start()]), fragment[0]]
            kept = fragment.end()
        return _escaped("".join(replaced) + self._words(plain[kept:]), escaped)

    def _words(self, text):
        """Identifiers stay identifiers, in the same form."""
        kept, replaced = 0, []
        for uuid in UUID.finditer(text):
            replaced += [self._plain_words(text[kept : uuid.start()]), self._once("uuid", uuid[0], self._uuid)]
            kept = uuid.end()
        return "".join(replaced) + self._plain_words(text[kept:])

    def _plain_words(self, text):
        return WORD.sub(lambda word: self._plain_word(word[0]), text)

    def _plain_word(self, word):
        return word if word in RESERVED else self._once("word", word, self._word)

    def _once(self, kind, text, make):
        if (kind, text) not in self._made:
            made = make(text)
            if made == text:
                raise CannotAnonymise(f"nothing else can stand for a text of {len(text)} characters")
            self._made[kind, text] = made
        return self._made[kind, text]

    def _word(self, word):
        reserved = [each for each in RESERVED if len(each) == len(word)]
        return self._spelt("word", word, [alphabets.of_character(character) for character in word], reserved)

    def _secret(self, text):
        """Of the same length and script; of marks and blanks not even their places are told."""
        return self._spelt("secret", text, [alphabets.of_secret(character) for character in text])

    def _uuid(self, uuid):
        """In small letters the same as in capitals."""
        if uuid == uuid.lower():
            return self._spelt("uuid", uuid.upper(), _uuid_letters(uuid.upper())).lower()
        return self._spelt("uuid", uuid, _uuid_letters(uuid))

    def _number(self, digits):
        """Of the same length and sign, in the same range."""
        number, length = int(digits), len(digits.lstrip("-"))
        ranges = [each for each in RANGES if each[0] <= number <= each[1]]
        if not ranges:
            raise CannotAnonymise(f"a number of {length} digits is none of a property list")
        ends = [10 ** (length - 1), 10 ** length - 1] if number > 0 else [1 - 10 ** length, -(10 ** (length - 1))]
        least, most = max(ends[0], ranges[0][0]), min(ends[1], ranges[0][1])
        return str(least + self._shuffled(f"number {least} {most}", number - least, most - least + 1))

    def _spelt(self, kind, text, letters, reserved=()):
        """Another text, of which each letter is from the alphabet that stands at its place among `letters`."""
        pieces = [slice(begin, begin + PIECE) for begin in range(0, len(text), PIECE)]
        return "".join(self._spelt_piece(kind, text[piece], letters[piece], reserved) for piece in pieces)

    def _spelt_piece(self, kind, text, letters, reserved):
        excluded = sorted(_place(each, letters) for each in reserved
                          if all(letter in alphabet.places for letter, alphabet in zip(each, letters)))
        form = " ".join([kind, *(f"{alphabet.characters[0]}{len(alphabet)}" for alphabet in letters)])
        place, size = _place(text, letters), _size(letters)
        place = self._shuffled(form, place - bisect_left(excluded, place), size - len(excluded))
        for each in excluded:
            place += each <= place
        return _text(place, letters)

    def _shuffled(self, form, number, size):
        """Among the numbers below a size, for each form in a way of its own."""
        key = hashlib.blake2b(form.encode(errors="surrogatepass"), key=self._key).digest()
        return Shuffle(key, size).other(number) if size > 1 else number


def _uuid_letters(uuid):
    """The alphabets of an identifier's digits, of which some stay."""
    return [Alphabet(digit) if digit == "-" or place in UUID_KIND else HEX_DIGITS if uuid == uuid.upper() else
            DIGITS if digit.isdigit() else HEX_LETTERS if digit.isupper() else Alphabet("abcdef")
            for place, digit in enumerate(uuid)]


def _size(letters):
    """How many texts there are of letters from these alphabets."""
    return math.prod(map(len, letters))


def _place(text, letters):
    """The number of a text among them."""
    place = 0
    for letter, alphabet in zip(text, letters):
        place = place * len(alphabet) + alphabet.places[letter]
    return place


def _text(place, letters):
    """The text of this number."""
    text = []
    for alphabet in reversed(letters):
        place, letter = divmod(place, len(alphabet))
        text.append(alphabet.characters[letter])
    return "".join(reversed(text))


def words_of(text):
    """The words of which a text consists that are not an identifier's."""
    return WORD.findall(UUID.sub("", _unescaped(text)[0]))


def _unescaped(text):
    """A text with its percent escapes read, and which of its characters were escaped how: in capitals or not."""
    plain, escaped = "", {}
    kept = 0
    for run in ESCAPES.finditer(text):
        try:
            read = bytes.fromhex(run[0].replace("%", "")).decode()
        except UnicodeDecodeError:
            continue
        plain += text[kept : run.start()]
        escaped |= {len(plain) + place: run[0] == run[0].upper() for place in range(len(read))}
        plain += read
        kept = run.end()
    return plain + text[kept:], escaped


def _escaped(text, escaped):
    """The opposite: every character of a text has as many places as before."""
    def escape(character, is_upper):
        return "".join(f"%{byte:02X}" if is_upper else f"%{byte:02x}" for byte in character.encode())

    return "".join(escape(character, escaped[place]) if place in escaped else character
                   for place, character in enumerate(text))
