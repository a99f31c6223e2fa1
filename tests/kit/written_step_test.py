"""A step as its author makes it: the kit's tests fail first, and pass once the step is written."""

import os
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
  store.setDataVersion(13);
  store.saveAllAccounts();
  return true;
"""
FAILING = '  FAIL() << "to be written'
PASSING = """  load({account("LDAP", "LDAPAccount", "L", {{"LabelColour", "green"}})}, 12);
  migrate();
  EXPECT_EQ(value(0, "Label Colour"), PropertyValue{"green"});
  EXPECT_EQ(value(0, "LabelColour"), tests::kAbsent);
"""
BUILD_OPTIONS = ["-G", "Ninja", "-DCMAKE_BUILD_TYPE=", f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}"]


class WrittenStep(KitTest):
    def run_in_tree(self, *command, expected=0):
        ended = subprocess.run(
            command, cwd=self.tree, stdin=subprocess.DEVNULL,
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, check=False,
        )
        self.assertEqual(expected == 0, ended.returncode == 0, ended.stdout[-4000:])
        return ended.stdout

    def build(self):
        self.run_in_tree("cmake", "--build", "build", "--target", "migrator_tests", "product", "endtoend_fixtures")

    def generated_tests(self, expected=0):
        return self.run_in_tree("build/tests/migrator_tests", "--gtest_filter=StepFrom9C201.*", expected=expected)

    def golden_devices(self, expected=0):
        ctest = ["ctest", "--test-dir", "build", "--output-on-failure"]
        return self.run_in_tree(*ctest, "-R", "golden_devices", expected=expected)

    def rewrite(self, name, old_start, old_end, new):
        text = self.read(name)
        start = text.index(old_start)
        end = text.index(old_end, start) + len(old_end)
        (self.tree / name).write_text(text[:start] + new + text[end:])

    def test_passes_the_tests_that_came_with_it(self):
        added = self.new_step("9C201")
        self.assertEqual(0, added.returncode, added.stderr)
        self.run_in_tree("cmake", "-S", ".", "-B", "build", *BUILD_OPTIONS)
        self.build()
        told = self.generated_tests(expected=1)
        for name in ("StampsItsVersionAndSaves", "IsTheFirstOfAFileOfVersion12", "UpgradesWhatItIsThereFor"):
            self.assertIn(f"[  FAILED  ] StepFrom9C201.{name}", told)
        self.golden_devices(expected=1)
        self.rewrite(SOURCE, UNWRITTEN, "}", WRITTEN + "}")
        self.rewrite(TESTS, FAILING, ";\n", PASSING)
        self.build()
        self.assertIn("0 of 4 tests failed.", self.generated_tests())
        self.golden_devices()


if __name__ == "__main__":
    unittest.main()
