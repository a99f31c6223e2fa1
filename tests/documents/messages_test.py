"""Every message that a run can print stands in docs/MESSAGES.md: collected from the calls that say them."""

import re
import unittest
from pathlib import Path

TREE = Path(__file__).resolve().parents[2]
DOCUMENT = (TREE / "docs/MESSAGES.md").read_text(encoding="utf-8")
# Of each section of the page: where the messages come from, and the calls that make them.
SAID = {
    "On the console": (("migrator", "modules", "accountsettings"), r"writeToConsole\(|convertedAccounts\("),
    "By the host": (("host", "platform/linux/files"), r"\b(?:say|warn|tell|miss|fail|failWrongUse|refuse)\(|\bEnding\{|\bProblem\{|console->write\(|\bnoPlugin\("),
    "In the journal": (("accountsettings", "migrator"), r"\b_ASLogSystem\(\)\.log\("),
}
NOT_OF_A_RUN = ("host/options.cpp", "host/rehearsal_server.cpp")  # wrong use of the command line, or of the server
LITERAL = re.compile(r'"((?:[^"\\]|\\.)*)"(?:\s*"((?:[^"\\]|\\.)*)")*')
METHOD = re.compile(r"^[-+]\[")
PLACE = re.compile(r"%@|%s|%ld|%d")


def call_at(text, begin):
    """From there to the bracket that ends the call."""
    depth = 0
    for place in re.finditer(r'"(?:[^"\\]|\\.)*"|[({\[]|[)}\]]', text[begin:]):
        depth += {"(": 1, "{": 1, "[": 1, ")": -1, "}": -1, "]": -1}.get(place[0], 0)
        if depth == 0:
            return text[begin : begin + place.end()]
    return ""


def literals(call):
    joined = [re.sub(r'"\s*"', "", match[0])[1:-1].replace('\\"', '"') for match in LITERAL.finditer(call)]
    return [each for each in joined if not METHOD.match(each)]


def pieces(literal):
    """What is the same of it whatever it tells of."""
    stripped = (piece.strip(" :;,.()[]'") for piece in PLACE.split(literal))
    return [piece for piece in stripped if sum(character.isalpha() for character in piece) > 3]


def messages(section):
    """Of each call, the pieces of the longest text, as a pattern; and where it is called."""
    folders, calls = SAID[section]
    for path in sorted(path for folder in folders for path in (TREE / folder).rglob("*.cpp")):
        if str(path.relative_to(TREE)) in NOT_OF_A_RUN:
            continue
        text = path.read_text(encoding="utf-8")
        for found in re.finditer(calls, text):
            longest = pieces(max(literals(call_at(text, found.end() - 1)), key=len, default=""))
            if longest:
                yield ".*".join(map(re.escape, longest)), path.relative_to(TREE)


def rows(section):
    page = DOCUMENT.partition(f"\n## {section}\n")[2].partition("\n## ")[0]
    return re.findall(r"^\| `(.*?)` \|", page, re.M)


class Messages(unittest.TestCase):
    def test_stand_on_the_page_each_in_its_section(self):
        for section in SAID:
            for message, source in messages(section):
                with self.subTest(source=str(source)):
                    self.assertTrue(any(re.search(message, row) for row in rows(section)),
                                    f"docs/MESSAGES.md lacks, under {section}: {message}")

    def test_are_all_said_by_the_code(self):
        for section in SAID:
            said = [message for message, _ in messages(section)]
            self.assertGreater(len(said), 15)
            for row in rows(section):
                with self.subTest(section=section):
                    self.assertTrue(any(re.search(message, row) for message in said), f"nobody says: {row}")


if __name__ == "__main__":
    unittest.main()
