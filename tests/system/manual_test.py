"""The manual pages and the completions tell of every option and command that the programs have, and of no other."""

import os
import re
import subprocess
import unittest
from pathlib import Path

from accountctl_case import ACCOUNTCTL, CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest
from device import plain_environment
from device_case import HOST

SOURCES = Path(os.environ["SOURCE_TREE"])
PAGES = {
    HOST: "migration-host.8",
    ACCOUNTCTL: "accountctl.1",
    HOST.with_name("migration-rehearse"): "migration-rehearse.1",
}


def help_of(program):
    return subprocess.run([program, "--help"], capture_output=True, text=True, check=True).stdout


def words_of(page):
    """The page's words, without the marks of its language."""
    return re.sub(r"\\f[A-Z]|[\"]", "", page.replace(r"\-", "-"))


class Manual(unittest.TestCase):
    def test_is_well_formed(self):
        for page in PAGES.values():
            ended = subprocess.run(
                ["mandoc", "-T", "lint", "-W", "warning", SOURCES / "docs/man" / page],
                capture_output=True, text=True, check=False,
            )
            self.assertEqual((0, ""), (ended.returncode, ended.stdout))

    def test_tells_of_every_option(self):
        for program, page in PAGES.items():
            text = (SOURCES / "docs/man" / page).read_text()
            told = re.findall(r"^\.TP\n\.B[IR]? (--[a-z-]+)", words_of(text), re.MULTILINE)
            self.assertEqual(re.findall(r"^ +(--[a-z-]+)", help_of(program), re.MULTILINE), told)

    def test_tells_of_every_command(self):
        text = words_of((SOURCES / "docs/man/accountctl.1").read_text())
        commands = text[text.index(".SH COMMANDS") : text.index(".SH OPTIONS")]
        told = re.findall(r"^\.TP\n\.BI? ([a-z]+)", commands, re.MULTILINE)
        self.assertEqual(re.findall(r"^  ([a-z]+) ", help_of(ACCOUNTCTL), re.MULTILINE), told)

    def test_tells_of_every_exit_status(self):
        for program, page in PAGES.items():
            text = (SOURCES / "docs/man" / page).read_text()
            section = text[text.index(".SH EXIT STATUS") :]
            section = section[: section.index(".SH", 1)]
            helped = help_of(program)
            told = re.findall(r"^\.B (\d)$", section, re.MULTILINE)
            self.assertEqual(re.findall(r"\b(\d) ", helped[helped.index("Exit status") :].replace("\n", " ")), told)


class Completion(AccountctlTest):
    """Tried in the shell itself: what it would offer for the last word."""

    ASK = """
        source "$1"; shift
        COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1))
        compopt() { :; }
        "$COMPLETE" "$1" "${COMP_WORDS[COMP_CWORD]}" "${COMP_WORDS[COMP_CWORD - 1]}"
        if ((${#COMPREPLY[@]})); then printf '%s\\n' "${COMPREPLY[@]}"; fi
    """

    def offered(self, program, *words):
        asked = subprocess.run(
            ["bash", "-c", self.ASK, "bash", SOURCES / "system/completions" / program.name, program, *words],
            env={**plain_environment(), "COMPLETE": "_" + program.name.replace("-", "_")},
            capture_output=True, text=True, check=True, cwd=self.tree.root,
        )
        self.assertEqual("", asked.stderr)
        return asked.stdout.splitlines()

    def test_is_registered_for_each_program(self):
        for program in PAGES:
            asked = 'source "$1" && complete -p "$2"'
            file = SOURCES / "system/completions" / program.name
            subprocess.run(["bash", "-c", asked, "bash", file, program.name], check=True, stdout=subprocess.DEVNULL)

    def test_of_options(self):
        for program in PAGES:
            self.assertEqual(re.findall(r"^ +(--[a-z-]+)", help_of(program), re.MULTILINE), self.offered(program, "--"))
        self.assertEqual(["--shared-resources"], self.offered(HOST, "--sh"))

    def test_of_directories_and_files(self):
        self.assertEqual(["var"], self.offered(HOST, "--root", "v"))
        self.assertEqual(["var"], self.offered(HOST, "--root", "=", "v"))
        self.assertEqual(["etc/group", "etc/passwd"], sorted(self.offered(HOST, "--trace", "etc/")))
        self.assertEqual(["etc/passwd"], self.offered(ACCOUNTCTL, "verify", "etc/p"))
        self.assertEqual([], self.offered(HOST, "x"))

    def test_of_commands(self):
        self.assertEqual(re.findall(r"^  ([a-z]+) ", help_of(ACCOUNTCTL), re.MULTILINE), self.offered(ACCOUNTCTL, ""))
        self.assertEqual(["remove", "rename"], sorted(self.offered(ACCOUNTCTL, "re")))

    def test_of_identifiers_of_the_device_that_is_meant(self):
        self.put(HOME_MAIL, CLOUD, {**DIRECTORY, "Identifier": "L 1"})
        for device in (["--root", self.tree.root], ["--root", "=", self.tree.root]):
            self.assertEqual(["M1", "V1", "C1", "K1", "L\\ 1"], self.offered(ACCOUNTCTL, *device, "show", ""))
        self.assertEqual(["C1"], self.offered(ACCOUNTCTL, "--json", "--root", self.tree.root, "enable", "C"))

    def test_of_types_and_data_classes(self):
        self.assertEqual(["CalDAV", "CardDAV"], self.offered(ACCOUNTCTL, "add", "Ca"))
        self.assertEqual(["Subscribed\\ Calendar"], self.offered(ACCOUNTCTL, "add", "Sub"))
        self.assertEqual(["Contacts", "ContactsSearch"], self.offered(ACCOUNTCTL, "enable", "M1", "Con"))


if __name__ == "__main__":
    unittest.main()
