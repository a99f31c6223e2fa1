"""The manual pages and the completions tell of every option and command that the programs have, and of no other."""

import os
import pty
import re
import select
import signal
import subprocess
import time
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
        told = re.findall(r"^\.TP\n\.BI? ([a-z-]+)", commands, re.MULTILINE)
        self.assertEqual(re.findall(r"^  ([a-z][a-z-]+) ", help_of(ACCOUNTCTL), re.MULTILINE), told)

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
        self.assertEqual(["etc/passwd"], self.offered(ACCOUNTCTL, "check-modules", "etc/p"))
        self.assertEqual(["var"], self.offered(ACCOUNTCTL, "new-device", "v"))
        self.assertEqual([], self.offered(HOST, "x"))

    def test_of_commands(self):
        self.assertEqual(re.findall(r"^  ([a-z][a-z-]+) ", help_of(ACCOUNTCTL), re.MULTILINE), self.offered(ACCOUNTCTL, ""))
        self.assertEqual(["recover", "remove", "rename"], sorted(self.offered(ACCOUNTCTL, "re")))

    def test_of_identifiers_of_the_device_that_is_meant(self):
        self.put(HOME_MAIL, CLOUD, {**DIRECTORY, "Identifier": "L 1"})
        for device in (["--root", self.tree.root], ["--root", "=", self.tree.root]):
            self.assertEqual(["M1", "V1", "C1", "K1", "L\\ 1"], self.offered(ACCOUNTCTL, *device, "show", ""))
        self.assertEqual(["C1"], self.offered(ACCOUNTCTL, "--json", "--root", self.tree.root, "enable", "C"))

    def test_of_types_and_data_classes(self):
        self.assertEqual(["CalDAV", "CardDAV"], self.offered(ACCOUNTCTL, "add", "Ca"))
        self.assertEqual(["Subscribed\\ Calendar"], self.offered(ACCOUNTCTL, "add", "Sub"))
        self.assertEqual(["Contacts", "ContactsSearch"], self.offered(ACCOUNTCTL, "enable", "M1", "Con"))


class CompletionOfOtherShells(AccountctlTest):
    """Tried in fish and zsh themselves, with the same questions for both."""

    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD, {**DIRECTORY, "Identifier": "L 1"})
        self.path = f"{ACCOUNTCTL.parent}:{HOST.parent}:{os.environ['PATH']}"
        self.environment = {**plain_environment(), "PATH": self.path, "HOME": str(self.scratch), "TERM": "xterm"}

    def offered_by_fish(self, line):
        file = SOURCES / f"system/completions/fish/{line.split()[0]}.fish"
        asked = subprocess.run(
            ["fish", "--no-config", "-c", 'source $argv[1]; complete -C $argv[2]', str(file), line],
            env=self.environment, capture_output=True, text=True, check=True,
        )
        return [offer.split("\t")[0] for offer in asked.stdout.splitlines()]

    ZSH = """
        fpath=({directory} $fpath); autoload -Uz compinit; compinit -u -D; LISTMAX=1000
        compadd() {{ local -a found; builtin compadd -O found "$@"; print -rl -- $found >> {offers}; builtin compadd "$@" }}
        offer() {{ _main_complete; print done >> {offers} }}
        zle -C offer list-choices offer; bindkey '^X' offer; print ready > {offers}
    """

    def offered_by_zsh(self, line):
        offers = self.scratch / "offers"
        offers.unlink(missing_ok=True)
        child, terminal = pty.fork()
        if child == 0:
            os.execvpe("zsh", ["zsh", "-f", "-i"], self.environment)
        setup = self.ZSH.format(directory=SOURCES / "system/completions/zsh", offers=offers)
        self.type(terminal, "; ".join(each.strip() for each in setup.strip().splitlines()) + "\n", offers, "ready")
        self.type(terminal, line + "\x18", offers, "done")
        os.kill(child, signal.SIGKILL)
        os.waitpid(child, 0)
        os.close(terminal)
        return [offer for offer in offers.read_text().splitlines() if offer not in ("", "ready", "done")]

    def type(self, terminal, text, file, awaited):
        """Types at the shell until it has written the word; what it shows is of no interest."""
        os.write(terminal, text.encode())
        end = time.monotonic() + 60
        while time.monotonic() < end:
            if select.select([terminal], [], [], 0.05)[0]:
                os.read(terminal, 65536)
            if file.exists() and awaited in file.read_text().splitlines():
                return
        self.fail(f"the shell never said {awaited}")

    def assert_offered(self, offers, line):
        for shell in (self.offered_by_fish, self.offered_by_zsh):
            with self.subTest(shell=shell.__name__, line=line):
                self.assertEqual(sorted(offers), sorted(set(shell(line))))

    def test_of_commands(self):
        self.assert_offered(["recover", "remove", "rename"], "accountctl re")
        self.assert_offered(["list"], "accountctl help l")

    def test_of_identifiers_of_the_device_that_is_meant(self):
        for device in (f"--root {self.tree.root}", f"--root={self.tree.root}"):
            self.assert_offered(["M1", "V1", "C1", "K1", "L 1"], f"accountctl {device} show ")

    def test_of_types_and_data_classes(self):
        self.assert_offered(["CalDAV", "CardDAV"], "accountctl add Ca")
        self.assert_offered(["Contacts", "ContactsSearch"], "accountctl enable M1 Con")

    def test_of_every_option(self):
        for program in (HOST, ACCOUNTCTL):
            options = re.findall(r"^ +(--[a-z-]+)", help_of(program), re.MULTILINE)
            offered = self.offered_by_fish(f"{program.name} --")
            self.assertEqual(set(options), {offer.rstrip("=") for offer in offered})
            offered = self.offered_by_zsh(f"{program.name} --")
            self.assertEqual(set(options), {offer.rstrip("=") for offer in offered})


if __name__ == "__main__":
    unittest.main()
