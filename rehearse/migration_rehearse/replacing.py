"""Texts, numbers and data replaced by others of the same kind, length and script, the same each time for the same key.

A text is replaced word by word, a word being letters and digits in a row, and what stands between the words stays. So two
texts are equal, or begin with the same words, after they were replaced exactly where they did before; an address
stays an address, and the name in it the name that stands elsewhere. What the migration looks for in texts stays.
"""

import hashlib
import re
import unicodedata
from functools import cache

from migration_rehearse.vocabulary import FRAGMENTS, KEYS, READ_KEYS, TEXTS, names_credential

UUID = re.compile(r"\b[0-9A-Fa-f]{8}-(?:[0-9A-Fa-f]{4}-){3}[0-9A-Fa-f]{12}\b")
WORD = re.compile(r"[^\W_]+")
ESCAPES = re.compile(r"(?:%[0-9A-Fa-f]{2})+")
READ_TEXT = re.compile(r"\s*(?:[+-]?\d{1,20}|yes|no|true|false)\s*", re.I)
LEADING_INTEGER = re.compile(r"\s*[+-]?\d+")
SMALL_INTEGER = 100_000  # ports, counts and switches; what is larger may be somebody's number
BLOCK = 128  # code points that share a script, and a length in bytes
TOLD = 4  # characters from which a word that is left would tell something


class Replacer:
    """Replaces for one key. The texts that are `known` to the product beside its vocabulary stay, too; `words` are those
    that were replaced and must not be found again."""

    def __init__(self, key, known=()):
        self._key = hashlib.blake2b(key).digest()
        self.known = TEXTS | frozenset(known)
        self._made = {}
        self._taken = set()
        self.words = set()

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
        if key in READ_KEYS or (abs(number) < SMALL_INTEGER and not names_credential(key)):
            return number
        digits = self._once("number", str(abs(number)), self._digits)
        return int(digits) * (-1 if number < 0 else 1)

    def real(self, number, key=""):
        if key in READ_KEYS or not abs(number) >= SMALL_INTEGER or number in (float("inf"), float("-inf")):
            return number
        mantissa, _, exponent = repr(abs(number)).partition("e")
        whole, dot, rest = mantissa.partition(".")
        replaced = self._digits(whole) + dot + rest + ("e" + exponent if exponent else "")
        return float(replaced) * (-1 if number < 0 else 1)

    def data(self, data):
        stream = hashlib.shake_256(self._key + b"data" + data).digest(len(data))
        return stream

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
        return WORD.sub(lambda word: self._once("word", word[0], self._word), text)

    def _once(self, kind, text, make):
        """What `make` makes of a text and a number: the first that is no other's, and says nothing of the text."""
        if (kind, text) not in self._made:
            made = next(each for each in (make(text, attempt) for attempt in range(10_000))
                        if (kind, each) not in self._taken and _may_replace(kind, each, text))
            self._made[kind, text] = made
            self._taken.add((kind, made))
            self.words.add(text)
        return self._made[kind, text]

    def _choices(self, kind, text, attempt):
        """Numbers without end that only the key, the text and the attempt decide."""
        number = 0
        while True:
            seed = f"{kind}\0{attempt}\0{number}\0{text}".encode(errors="surrogatepass")
            yield from hashlib.blake2b(seed, key=self._key).digest()
            number += 1

    def _word(self, word, attempt):
        return "".join(_one_like(character, choice)
                       for character, choice in zip(word, _pairs(self._choices("word", word, attempt))))

    def _secret(self, text, attempt):
        """Of the same length and script; of marks and blanks not even their places are told."""
        return "".join(_one_like(character if character.isalnum() or ord(character) > 127 else "a", choice)
                       for character, choice in zip(text, _pairs(self._choices("secret", text, attempt))))

    def _uuid(self, uuid, attempt):
        choices = self._choices("uuid", uuid.upper(), attempt)
        digits = "".join("-" if character == "-" else f"{choice % 16:x}" for character, choice in zip(uuid, choices))
        digits = digits[:14] + uuid[14] + digits[15:19] + uuid[19] + digits[20:]
        return digits if uuid.lower() == uuid else digits.upper()

    def _digits(self, digits, attempt=0):
        choices = self._choices("number", digits, attempt)
        return "".join(str(choice % 9 + 1 if place == 0 else choice % 10)
                       for place, (_, choice) in enumerate(zip(digits, choices)))


def _may_replace(kind, made, text):
    """Whether it is another text and means nothing to the migration; of a number, whether it fits where that did."""
    if kind == "number":
        return made != text and max(int(made).bit_length(), 63) == max(int(text).bit_length(), 63)
    return (made != text or len(text) < TOLD) and made not in TEXTS


def _pairs(choices):
    return ((high << 8) + low for high, low in zip(choices, choices))


def _one_like(character, choice):
    alike = _alike(character)
    return alike[choice % len(alike)]


@cache
def _alike(character):
    """The characters of the same kind, script and length; the character alone where there is no other."""
    category = unicodedata.category(character)
    begin = ord(character) // BLOCK * BLOCK
    found = [chr(code) for code in range(begin, begin + BLOCK)
             if unicodedata.category(chr(code)) == category
             and len(chr(code).encode(errors="surrogatepass")) == len(character.encode(errors="surrogatepass"))
             and unicodedata.normalize("NFC", chr(code)) == chr(code)]
    return found if character in found and category[0] in "LN" else [character]


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
