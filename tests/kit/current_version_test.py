"""The number of the current data version stands where it is declared, and where something is of that one version."""

import fnmatch
import re
import unittest

from device import CURRENT_VERSION
from kit_case import SOURCES, source_files

SOURCES_OF_TEXT = ("*.h", "*.cpp", "*.py", "*.md", "*.sh", "*.1", "*.8", "tools/*", "bench/*", "scripts/*", "run", "check")
NUMBER = rf"(?<![\w.])(?<!\[:){CURRENT_VERSION}U?(?![\w.]|-byte)"
AFTER_IT = rf"(?<![\w.]){CURRENT_VERSION + 1}U?(?![\w.])"
SAYS = re.compile(
    rf"(?i)version(?!_id).*{NUMBER}|{NUMBER}.*version|(?:putSettings|load|check|migrated)\(.*{NUMBER}"
    rf"|(?:range|below)\((?:0, )?{AFTER_IT}\)|version.*% {AFTER_IT}|DeviceForm\{{{NUMBER}"
)
# The files in which it may stand, and as what.
PLACES = {
    "accountsettings/accounts_manager.h": rf"kCurrentVersion = {NUMBER};",
    "migrator/*_generation_steps.cpp": rf"setDataVersion\({NUMBER}\)|// From data version \d+\.",
    "tests/migrator/*step*_test.cpp": r"",  # what one step reads and stamps
    "README.md": rf"data version (?:\d+ -> )?{NUMBER}",
    "docs/STEPS.md": r"",  # what each step reads and leaves
    "docs/FORMAT.md": rf"^Version {NUMBER} is current",
    "docs/EXPLAIN.md": rf"data version {NUMBER}|as version {NUMBER}|\"(?:v|storedV)ersion\": ?{NUMBER}",
    # What was measured on a device of that version.
    "docs/PERFORMANCE.md": r"",
    "docs/RELIABILITY.md": r"",
    "docs/SNAPSHOTS.md": r"",
    "CHANGELOG.md": r"",
}


def may_say(name, line):
    return any(fnmatch.fnmatch(name, place) and re.search(how, line) for place, how in PLACES.items())


class CurrentVersion(unittest.TestCase):
    maxDiff = None

    def lines(self):
        for name in source_files():
            if any(fnmatch.fnmatch(name, pattern) for pattern in SOURCES_OF_TEXT):
                for number, line in enumerate((SOURCES / name).read_text(encoding="utf-8").splitlines(), 1):
                    yield name, number, line

    def test_stands_nowhere_else(self):
        said = [f"{name}:{number}: {line.strip()}" for name, number, line in self.lines()
                if SAYS.search(line) and not may_say(name, line)]
        self.assertEqual([], said)

    def test_would_be_found(self):
        for line in (f"  putSettings({CURRENT_VERSION}, {{}});", f'{{"Version": {CURRENT_VERSION}}}',
                     f"testing::Range(0, {CURRENT_VERSION + 1})", f"saves as version {CURRENT_VERSION} |"):
            self.assertRegex(line, SAYS)
            self.assertFalse(may_say("tests/endtoend/some_test.py", line))


if __name__ == "__main__":
    unittest.main()
