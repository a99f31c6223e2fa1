"""What people see who sit at a terminal: lines that fit it, emphasis, counts and hints; and whom they may mean by a word."""

import unicodedata
import unittest

from accountctl_case import ACCOUNTCTL, CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from terminal import LANGUAGES, on_terminal

LONG = "A name that nobody would give to an account who has ever seen it in a list of accounts of other people"
WORK = changed(HOME_MAIL, Identifier="0B6C-4F1C", DisplayName="Büro", Username="ines.kern", Hostname="mail.example.org")


# What a reader sees as one character, in columns of a terminal.
SEEN = {
    "\U0001f680": 2,  # a rocket
    "\U0001f468\u200d\U0001f469\u200d\U0001f467\u200d\U0001f466": 2,  # a family
    "\U0001f1e9\U0001f1ea": 2,  # a flag
    "\U0001f44d\U0001f3fd": 2,  # a thumb with a colour
    "\u2764\ufe0f": 2,  # a letter that is shown as a picture
    "ดี": 1,
    "ก็": 1,
    "न": 1,
    "ते": 1,
    "ש": 1,
    "ب": 1,
    "日": 2,
    "e\u0301": 1,
}


def columns_of(line):
    """How wide a terminal shows the line."""
    columns = 0
    for seen, width in SEEN.items():
        columns += width * line.count(seen)
        line = line.replace(seen, "")
    return columns + sum(2 if unicodedata.east_asian_width(each) in "WF" else 1 for each in line)


class TerminalTest(AccountctlTest):
    def on_terminal(self, *words, columns=80, environment=None):
        """The status, and the lines that are seen."""
        command = [ACCOUNTCTL, "--root", self.tree.root, *words]
        status, shown = on_terminal(*command, columns=columns, environment=environment)
        return status, shown.splitlines()


class Lists(TerminalTest):
    def setUp(self):
        super().setUp()
        self.put(changed(HOME_MAIL, DisplayName=LONG, Identifier="4F1C0B6C-0B6C-4F1C-8B6C-0123456789AB"), CLOUD,
                 changed(WORK, DisplayName="日本語" * 30))

    def plain(self, *words, **more):
        return self.on_terminal(*words, "--color=never", **more)[1]

    def test_fit_the_terminal_in_every_language(self):
        for columns in (80, 200):
            for language in LANGUAGES:
                with self.subTest(columns=columns, language=language):
                    lines = self.plain("list", columns=columns, environment={"LC_ALL": language})
                    self.assertEqual(7, len(lines))
                    self.assertLessEqual(max(map(columns_of, lines)), columns)

    def test_stay_in_line_whatever_script_the_names_are_in(self):
        self.put(*(changed(WORK, DisplayName=seen * length) for seen in SEEN for length in (3, 120)))
        for columns in (80, 200):
            for language in LANGUAGES:
                with self.subTest(columns=columns, language=language):
                    lines = self.plain("list", columns=columns, environment={"LC_ALL": language})[1:-1]
                    self.assertEqual(2 * len(SEEN), len(lines))
                    self.assertEqual(1, len({columns_of(line[: line.index("ines")]) for line in lines}))
                    self.assertLessEqual(max(map(columns_of, lines)), columns)

    def test_shorten_long_cells_in_the_middle(self):
        line = self.plain("list")[1]
        self.assertRegex(line, r"^4F1C[-0-9A-F]*…[-0-9A-F]*AB  Mail ")
        self.assertRegex(line, r"A name.*….*people")

    def test_shorten_nothing_where_that_is_wished_for(self):
        self.assertIn(LONG, "\n".join(self.plain("list", "--wide")))

    def test_shorten_nothing_in_a_pipe_however_the_terminal_is(self):
        piped = self.done("list", environment={"COLUMNS": "20"})
        self.assertIn(LONG, "\n".join(piped))
        self.assertEqual(self.done("list"), piped)

    def test_heed_the_width_that_is_wished_for(self):
        lines = self.plain("list", columns=200, environment={"COLUMNS": "70"})
        self.assertLessEqual(max(map(columns_of, lines)), 70)

    def test_count_accounts_and_their_children(self):
        self.assertEqual("5 accounts, 2 of them in others", self.plain("list")[-1])
        self.put(DIRECTORY)
        self.assertEqual("1 account", self.plain("list")[-1])

    def test_of_properties_and_types_fit_too(self):
        for words in (["show", "V1"], ["types"], ["help"], ["help", "add"]):
            with self.subTest(words=words):
                self.assertLessEqual(max(map(columns_of, self.plain(*words))), 80)


class Emphasis(TerminalTest):
    HEADING = "\x1b[1mIDENTIFIER  TYPE  CLASS  NAME  USER  ENABLED\x1b[0m"

    def heading(self, *words, **more):
        return next(line for line in self.on_terminal("list", *words, **more)[1] if "IDENTIFIER" in line)

    def test_stands_out_on_a_terminal(self):
        self.assertEqual(self.HEADING, self.heading())
        self.assertEqual(self.HEADING, self.heading("--color=auto", environment={"NO_COLOR": ""}))

    def test_is_left_away_where_it_is_not_wished_for(self):
        for words, environment in ((["--color=never"], {}), ([], {"NO_COLOR": "1"}), ([], {"TERM": "dumb"})):
            with self.subTest(words=words, environment=environment):
                self.assertNotIn("\x1b", self.heading(*words, environment=environment))

    def test_reaches_a_pipe_only_on_request(self):
        self.assertNotIn("\x1b", self.accountctl("list").output[0])
        for words in (["--color"], ["--color=always"]):
            self.assertEqual(self.HEADING, self.accountctl("list", *words, environment={"NO_COLOR": "1"}).output[0])


class Help(TerminalTest):
    def test_of_a_command_is_had_in_three_ways(self):
        for words in (["help", "enable"], ["enable", "--help"], ["enable", "-h"]):
            lines = self.on_terminal(*words)[1]
            self.assertEqual("Usage: accountctl [OPTION]... enable ID DATACLASS", lines[0])

    def test_hints_at_the_command_that_was_meant(self):
        for words in (["help", "enabel"], ["enabel", "--help"]):
            status, lines = self.on_terminal(*words)
            self.assertEqual((2, "accountctl: did you mean enable?"), (status, lines[-1]))


class Hints(TerminalTest):
    def hint(self, *words):
        status, lines = self.on_terminal(*words)
        self.assertEqual(2, status)
        return lines[1:]

    def test_name_what_was_meant(self):
        self.put(HOME_MAIL)
        self.assertEqual(["accountctl: did you mean list?"], self.hint("lsit"))
        self.assertEqual(["accountctl: did you mean --json?"], self.hint("list", "--jsn"))
        self.assertEqual(["accountctl: did you mean Notes?"], self.hint("enable", "M1", "note"))
        self.assertEqual(["accountctl: did you mean identifier?"], self.hint("list", "--columns=identifer"))
        self.assertEqual([], self.hint("elephant"))


class Words(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, DIRECTORY, WORK)

    def assert_meant(self, identifier, *words):
        for word in words:
            with self.subTest(word=word):
                self.assertEqual(f"Identifier  {identifier}", self.done("show", word)[0])

    def test_that_begin_an_identifier_mean_its_account(self):
        self.assert_meant("0B6C-4F1C", "0", "0b6c", "0B6C-4F1C")
        self.assert_meant("C1", "c")

    def test_that_name_an_account_mean_it(self):
        self.assert_meant("M1", "home", "Home", "ines@imap.example.com")
        self.assert_meant("0B6C-4F1C", "BÜRO", "bu\u0308ro", "ines.kern", "INES.KERN@mail.example.org")
        self.assert_meant("V1", "cirrant")

    def test_that_are_an_identifier_mean_nothing_else(self):
        self.put(changed(HOME_MAIL, Identifier="Home2", DisplayName="M1"), changed(WORK, Identifier="M1"), DIRECTORY)
        self.assert_meant("M1", "M1")

    def test_that_are_data_classes_mean_them_in_any_case(self):
        for word in ("notes", "NOTES", "com.vorlix.dataclass.Notes"):
            self.done("disable", "M1", word)
            self.assertEqual(1, len(self.accounts()[0]["Enabled Dataclasses"]))
            self.done("enable", "M1", word)
            self.assertEqual(2, len(self.accounts()[0]["Enabled Dataclasses"]))


if __name__ == "__main__":
    unittest.main()
