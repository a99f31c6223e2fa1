"""Every command that the documents show is run, on a device of the test's own, and prints what they say.

A block of ```sh is run as it stands and must succeed. A block of ```console holds commands after "$ " and what they
print; a line of "..." stands for any lines, and "..." in a line for any text. Blocks of one document follow each other
on one device, a copy of the example "first-generation". What cannot be run here stands below a line
<!-- not run: REASON -->, and commands stand in no other blocks.
"""

import os
import re
import shutil
import subprocess
import sys
import unittest
from pathlib import Path

from accountctl_case import ACCOUNTCTL
from device import plain_environment
from device_case import HOST, DeviceTest

SOURCES = Path(os.environ["SOURCE_TREE"])
DOCUMENTS = [
    "README.md", "CONTRIBUTING.md", "docs/ACCOUNTCTL.md", "docs/ARCHITECTURE.md", "docs/CONFIGURATION.md",
    "docs/EXPLAIN.md", "docs/FLEET.md", "docs/FORMAT.md", "docs/INTEGRATION.md", "docs/MESSAGES.md", "docs/MODULES.md", "docs/OPERATIONS.md", "docs/RELIABILITY.md", "docs/SNAPSHOTS.md",
    "docs/CLIENTS.md",
]
# It tells of a device after its update.
MIGRATED = "docs/OPERATIONS.md"
BLOCK = re.compile(r"^(?:<!-- not run: (?P<reason>[^\n]+) -->\n)?```(?P<language>[a-z]*)\n(?P<text>.*?)^```$", re.M | re.S)
MIGRATE = "migration-host --home /var/mobile --snapshots /var/lib/account-settings/snapshots"
PROGRAMS = re.compile(
    r"^(?:sudo )?(?:migration-host|migration-rehearse|accountctl|\./|tools/|cmake|ctest|cpack|apt|dpkg|systemctl|journalctl)"
    r"(?!.*\[OPTION\])", re.M,  # a synopsis is no command
)
# Whatever device a command names, it is the test's own that it gets.
WRAPPER = """#!/bin/sh
case " $* " in
  *" --root "* | *" --help "* | *" --version "* | *" --serve-rehearsals "* | *" new-device "*) exec "{program}" "$@" ;;
  *) exec "{program}" --root "{root}" "$@" ;;
esac
"""


def blocks(document):
    return [match.groupdict() for match in BLOCK.finditer((SOURCES / document).read_text(encoding="utf-8"))]


def steps(console):
    """The commands of a console block, each with the lines that it is to print."""
    found = []
    for line in console.splitlines():
        if line.startswith("$ "):
            found.append((line[2:], []))
        elif found[-1][0].endswith("\\") and not found[-1][1]:
            found[-1] = (found[-1][0] + "\n" + line, [])
        else:
            found[-1][1].append(line)
    return found


def pattern_of(lines):
    """What the shown lines stand for."""
    parts = [r"(?:.*\n)*?" if line == "..." else re.escape(line).replace(r"\.\.\.", ".*") + r"\n" for line in lines]
    return "".join(parts)


# What the sanitizers keep beside a program's memory is more than any limit of it.
REHEARSE = """#!/bin/sh
case "$SANITIZE $1" in
  ' '* | *' merge' | *' report' | *' compare') exec "{program}" "$@" ;;
  *' anonymise') shift; exec "{program}" anonymise --memory 0 "$@" ;;
  *) exec "{program}" --memory 0 "$@" ;;
esac
"""


class Documents(DeviceTest):
    def setUp(self):
        super().setUp()
        self.tree = self.example("first-generation")
        # The places that documents speak of, each as this test has it.
        self.places = {
            "/mnt/image": self.tree.root,
            "/var/mobile": self.tree.root / "var/mobile",
            "/var/lib/account-settings": self.tree.root / "var/lib/account-settings",
            "/etc/vorlix": self.tree.root / "etc/vorlix",
            "/srv/images": self.scratch / "images",
            "/tmp": self.scratch / "tmp",
        }
        shutil.copytree(self.tree.root, self.places["/srv/images"] / "one")
        programs = self.scratch / "programs"
        for directory in (programs, self.scratch / "tmp", self.scratch / "work"):
            directory.mkdir()
        rehearse = HOST.with_name("migration-rehearse")
        for program, text in ((HOST, WRAPPER), (ACCOUNTCTL, WRAPPER), (rehearse, REHEARSE)):
            wrapper = programs / program.name
            wrapper.write_text(text.format(program=program, root=self.tree.root))
            wrapper.chmod(0o755)
        self.environment = {**plain_environment(), "PATH": f"{programs}:{os.environ['PATH']}", "LC_ALL": "C.UTF-8"}

    def prepare_as_run_does(self):
        """What ./run leaves of a fresh tree, seen from there; answers what it printed."""
        work = self.scratch / "work"
        (work / "build/release").mkdir(parents=True)
        (work / "build/release/bin").symlink_to(HOST.parent)
        ended = subprocess.run([sys.executable, SOURCES / "scripts/migrate_examples.py", HOST, "build/devices"], cwd=work,
                               env=plain_environment(), capture_output=True, text=True, check=True)
        return ended.stdout

    def test_the_example_in_the_readme_is_what_run_prints(self):
        printed = self.prepare_as_run_does()
        (shown,) = [block["text"] for block in blocks("README.md") if block["text"].startswith("first-generation: ")]
        self.assertIn(shown, printed)

    def test_the_commands_that_run_prints_are_those_of_the_readme(self):
        told = re.findall(r"^  (build/.*)$", (SOURCES / "run").read_text(encoding="utf-8"), re.M)
        self.assertEqual(3, len(told))
        self.assertIn("\n".join(told) + "\n", [block["text"] for block in blocks("README.md")])

    def here(self, text):
        names = "|".join(map(re.escape, self.places))
        return re.sub(rf"(?<![\w/])({names})\b", lambda match: str(self.places[match[1]]), text)

    def there(self, text):
        for name in ("/mnt/image", "/tmp"):
            text = text.replace(str(self.places[name]), name)
        return text

    def run_shell(self, command):
        return subprocess.run(
            ["bash", "-e", "-c", self.here(command)], cwd=self.scratch / "work", env=self.environment,
            stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False,
            timeout=60,
        )

    def check(self, block):
        if block["reason"]:
            return
        if block["language"] == "sh":
            ended = self.run_shell(block["text"])
            self.assertEqual(0, ended.returncode, f"{block['text']}\n{ended.stdout}")
        elif block["language"] == "console":
            for command, shown in steps(block["text"]):
                printed = self.there(self.run_shell(command).stdout)
                self.assertRegex(printed, r"\A" + pattern_of(shown) + r"\Z", f"\n$ {command}\n{printed}")
        else:
            self.assertNotRegex(block["text"], PROGRAMS, "a command in a block that is not run")


def test_of(document):
    def test(self):
        if document == "README.md":
            self.prepare_as_run_does()
        if document == MIGRATED:
            self.assertEqual(0, self.run_shell(MIGRATE).returncode)
        for block in blocks(document):
            self.check(block)

    return test


for each in DOCUMENTS:
    setattr(Documents, "test_commands_in_" + Path(each).stem, test_of(each))


class Links(unittest.TestCase):
    def test_lead_somewhere(self):
        for document in [*DOCUMENTS, *(str(path.relative_to(SOURCES)) for path in (SOURCES / "docs").glob("*.md"))]:
            text = BLOCK.sub("", (SOURCES / document).read_text(encoding="utf-8"))
            for target in re.findall(r"\]\((?!https?:)([^)#]+)", text):
                self.assertTrue(((SOURCES / document).parent / target).exists(), f"{document}: {target}")


if __name__ == "__main__":
    unittest.main()
