"""What tools/new-step changes in the source tree, and what it refuses."""

import plistlib
import re
import shutil
import subprocess
import unittest

from kit_case import KitTest

CHAIN = "migrator/version_steps.cpp"
DEVICES = "tests/endtoend/devices"


class NewStep(KitTest):
    PARTS = (
        ".clang-format", "README.md", "accountsettings/", "docs/", "examples/devices/", "migrator/",
        "tests/endtoend/devices/", "tests/migrator/", "tests/support/step_keys.plist", "tools/new-step",
    )

    def setUp(self):
        super().setUp()
        self.before = self.contents()
        self.old = self.current_version()

    def current_version(self):
        return int(re.search(r"kCurrentVersion = (\d+);", self.read("accountsettings/accounts_manager.h"))[1])

    def rows(self):
        row = r"^    \{(\d+), \"(\w+):\", \".*\",\s+&AccountsDataMigrator::(\w+)\},$"
        return re.findall(row, self.read(CHAIN), re.MULTILINE)

    def add(self, release):
        added = self.new_step(release)
        self.assertEqual((0, ""), (added.returncode, added.stderr))
        return added.stdout

    def assert_refused(self, message, *arguments):
        refused = self.new_step(*arguments)
        self.assertEqual((1, f"new-step: {message}\n"), (refused.returncode, refused.stderr))
        self.assertEqual(self.before, self.contents())

    def test_stands_at_the_end_of_the_chain(self):
        rows = self.rows()
        self.add("9C201")
        name = "_migrateAccountsFrom9C201"
        self.assertEqual([*rows, (str(self.old), name, name)], self.rows())
        self.assertEqual(self.old + 1, self.current_version())

    def test_stands_in_the_file_of_its_generation(self):
        self.add("9C201")
        self.assertIn("::_migrateAccountsFrom9C201(", self.read("migrator/third_generation_steps.cpp"))
        header = self.read("migrator/accounts_data_migrator.h")
        third = header[header.index("Third generation") :]
        self.assertLess(third.index("From9B176("), third.index("From9C201("))

    def test_of_a_new_generation_has_a_file_of_its_own(self):
        self.add("10A77")
        self.assertIn("::_migrateAccountsFrom10A77(", self.read("migrator/fourth_generation_steps.cpp"))
        header = self.read("migrator/accounts_data_migrator.h")
        self.assertLess(header.index("Fourth generation (fourth_generation_steps.cpp)"), header.index("From10A77("))

    def test_brings_a_device_of_its_version(self):
        self.add("9C201")
        device = self.tree / DEVICES / f"version-{self.old + 1:02}"
        settings = plistlib.loads((device / "settings.plist").read_bytes())
        expected = plistlib.loads((device / "expected.plist").read_bytes())
        self.assertEqual((self.old + 1, settings["Accounts"]), (settings["Version"], expected["Accounts"]))

    def test_keeps_the_current_example_current(self):
        self.add("9C201")
        settings = "var/mobile/Library/Preferences/com.vorlix.accountsettings.plist"
        example = plistlib.loads(self.read(f"examples/devices/current/{settings}").encode())
        self.assertEqual(self.old + 1, example["Version"])

    def test_has_a_place_for_the_keys_that_it_names(self):
        self.add("9C201")
        self.add("9C202")
        keys = plistlib.loads(self.read("tests/support/step_keys.plist").encode())
        self.assertEqual(["9C201", "9C202"], list(keys)[-2:])

    def test_raises_the_version_that_the_documents_show(self):
        self.add("9C201")
        self.assertIn(f"Version {self.old + 1} is current.", self.read("docs/FORMAT.md"))
        for document in ("README.md", "docs/EXPLAIN.md", "docs/FORMAT.md"):
            self.assertNotRegex(self.read(document), rf"data version (0 -> )?{self.old}\b")

    def test_is_followed_by_the_next_one(self):
        self.add("9C201")
        self.add("9C202")
        self.assertEqual(self.old + 2, self.current_version())
        self.assertEqual([str(self.old), str(self.old + 1)], [row[0] for row in self.rows()[-2:]])

    def test_changes_nothing_but_the_files_that_it_names(self):
        named = {line for line in self.add("9C201").split("\n\n")[0].splitlines()}
        after = self.contents()
        self.assertEqual(named, {str(path) for path in after if after[path] != self.before.get(path)})

    @unittest.skipUnless(shutil.which("clang-format-16"), "needs clang-format-16")
    def test_is_formatted_as_the_house_wants_it(self):
        self.add("9C201")
        self.add("10A77")
        changed = [path for path in self.contents() if path.suffix in (".cpp", ".h") and path not in self.before]
        changed += [path for path in self.contents() if str(path).startswith("migrator/")]
        sources = [path for path in changed if path.suffix in (".cpp", ".h")]
        subprocess.run(["clang-format-16", "--dry-run", "-Werror", *sources], cwd=self.tree, check=True)

    def test_tells_what_is_to_be_written(self):
        told = self.add("9C201").split("\n\n")[1]
        for name in ("migrator/third_generation_steps.cpp", "tests/migrator/step_from_9C201_test.cpp"):
            self.assertIn(name, told)

    def test_is_refused_for_a_release_that_is_not_the_next(self):
        self.assert_refused("the chain ends with 9B176, and 9B176 is no later release", "9B176")
        self.assert_refused("the chain ends with 9B176, and 8Z999 is no later release", "8Z999")
        self.assert_refused("a release is written like 9C201, not 9c201", "9c201")
        self.assert_refused("a release is written like 9C201, not ../9C201", "../9C201")
        self.assert_refused("there is no name for the generation of 13A1; add it to GENERATIONS", "13A1")

    def test_is_refused_where_the_sources_are_not_as_they_were(self):
        path = self.tree / "accountsettings/accounts_manager.h"
        path.write_text(path.read_text().replace("kCurrentVersion = ", "kCurrentVersion{"))
        self.before = self.contents()
        refused = self.new_step("9C201")
        self.assertEqual(1, refused.returncode)
        self.assertIn("accounts_manager.h is not as it is expected: nothing matches", refused.stderr)
        self.assertEqual(self.before, self.contents())

    def test_says_how_it_is_used(self):
        self.assertEqual(2, self.new_step().returncode)
        self.assertIn("tools/new-step RELEASE", self.new_step("--help").stdout)


if __name__ == "__main__":
    unittest.main()
