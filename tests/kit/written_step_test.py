"""A step as its author makes it: its own tests fail first; once it is written, every test of the house passes."""

import os
import re
import subprocess
import unittest

from kit_case import KitTest

SOURCE = "migrator/third_generation_steps.cpp"
TESTS = "tests/migrator/step_from_9C201_test.cpp"
UNWRITTEN = "  static_cast<void>(store);\n  return false;\n"
WRITTEN = """  for (const Account& account : store.allBasicAccounts()) {
    const std::optional<PropertyValue> colour = account->accountPropertyForKey("LabelColour");
    if (!colour) continue;
    account->setAccountProperty_forKey(*colour, "Label Colour");
    account->removeAccountPropertyForKey("LabelColour");
  }
  store.setDataVersion({new});
  store.saveAllAccounts();
  return true;
"""
FAILING = '  FAIL() << "to be written'
PASSING = """  load({account("LDAP", "LDAPAccount", "L", {{"LabelColour", "green"}})}, {old});
  migrate();
  EXPECT_EQ(value(0, "Label Colour"), PropertyValue{"green"});
  EXPECT_EQ(value(0, "LabelColour"), tests::kAbsent);
"""
KEYS = "tests/support/step_keys.plist"
NO_KEYS = "<key>9C201</key>\n\t<dict/>"
NAMED_KEYS = "<key>9C201</key><dict><key>LabelColour</key><array><string>green</string></array></dict>"
BUILD_OPTIONS = ["-G", "Ninja", "-DCMAKE_BUILD_TYPE=", f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}"]


class WrittenStep(KitTest):
    def run_in_tree(self, *command, expected=0):
        ended = subprocess.run(
            command, cwd=self.tree, stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False,
        )
        self.assertEqual(expected == 0, ended.returncode == 0, ended.stdout[-4000:])
        return ended.stdout

    def build(self, *targets):
        self.run_in_tree("cmake", "--build", "build", "--target", *targets)

    def tests(self, *selection, expected=0):
        ctest = ["ctest", "--test-dir", "build", "--output-on-failure", "--parallel", str(os.cpu_count())]
        return self.run_in_tree(*ctest, *selection, expected=expected)

    def rewrite(self, name, old_start, old_end, new):
        text = self.read(name)
        start = text.index(old_start)
        end = text.index(old_end, start) + len(old_end)
        (self.tree / name).write_text(text[:start] + new + text[end:])

    def write(self):
        old = int(re.search(r"kCurrentVersion = (\d+);", self.read("accountsettings/accounts_manager.h"))[1]) - 1
        self.rewrite(SOURCE, UNWRITTEN, "}", WRITTEN.replace("{new}", str(old + 1)) + "}")
        self.rewrite(TESTS, FAILING, ";\n", PASSING.replace("{old}", str(old)))
        self.rewrite(KEYS, NO_KEYS, "", NAMED_KEYS)

    def test_is_all_that_there_is_to_write(self):
        added = self.new_step("9C201")
        self.assertEqual(0, added.returncode, added.stderr)
        self.run_in_tree("cmake", "-S", ".", "-B", "build", *BUILD_OPTIONS)
        self.build("migrator_tests")
        told = self.tests("-R", "^StepFrom9C201|RandomStoresOfAStep", expected=1)
        for name in ("StampsItsVersionAndSaves", "UpgradesWhatItIsThereFor"):
            self.assertRegex(told, rf"StepFrom9C201.{name} \.*\*+Failed")
        self.assertRegex(told, r"RandomStoresOfAStep.GiveItSomethingToDo/\d+ .*\*+Failed")
        self.write()
        self.build("all")
        self.tests("--label-exclude", "^full$")


if __name__ == "__main__":
    unittest.main()
