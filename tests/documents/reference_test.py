"""The reference that is made from the headers: without a warning, and only where everything public is described."""

import os
import shutil
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

SOURCES = Path(os.environ["SOURCE_TREE"])
REFERENCE = Path(os.environ["BUILD_TREE"]) / "reference"


def run(*command, directory=None):
    return subprocess.run(
        [str(part) for part in command], cwd=directory, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT, text=True, check=False,
    )


def pages_in(directory):
    return {page.name: page.read_bytes() for page in (directory / "html").iterdir()}


class Reference(unittest.TestCase):
    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.scratch = Path(scratch.name)

    def shown(self, header):
        path = self.scratch / "header.h"
        path.write_text(header, encoding="utf-8")
        return run(sys.executable, "-B", SOURCES / "reference/filter.py", path).stdout.splitlines()[2:]

    def made_from(self, header):
        """What making a reference of that header alone says, and whether it succeeds."""
        (self.scratch / "input").mkdir(exist_ok=True)
        (self.scratch / "input/header.h").write_text(header, encoding="utf-8")
        settings = (REFERENCE / "Doxyfile").read_text(encoding="utf-8")
        settings += f'\nINPUT = "{self.scratch}/input"\nOUTPUT_DIRECTORY = "{self.scratch}"\nUSE_MDFILE_AS_MAINPAGE =\n'
        made = self.make(settings, SOURCES)
        return made.returncode == 0, made.stdout

    def make(self, settings, sources):
        (self.scratch / "Doxyfile").write_text(settings, encoding="utf-8")
        return run("doxygen", self.scratch / "Doxyfile", directory=sources / "reference")

    def test_is_made_without_a_warning(self):
        made = run("cmake", "--build", REFERENCE.parent, "--target", "docs")
        self.assertEqual(0, made.returncode, made.stdout)
        pages = "".join(page.read_text(encoding="utf-8") for page in (REFERENCE / "html").glob("*.html"))
        told = {"waits for nobody", "account_settings_watch_dispatch", "mayDropUnreadable", "brokenInstallation"}
        self.assertEqual(told, {each for each in {*told, "<script", "struct Content"} if each in pages})

    def test_is_the_same_wherever_the_sources_lie(self):
        run("cmake", "--build", REFERENCE.parent, "--target", "docs")
        elsewhere = self.scratch / "another place"
        for part in ("client/include", "bindings/include", "reference"):
            shutil.copytree(SOURCES / part, elsewhere / part)
        settings = (REFERENCE / "Doxyfile").read_text(encoding="utf-8").replace(str(SOURCES), str(elsewhere))
        self.make(f'{settings}\nOUTPUT_DIRECTORY = "{self.scratch}"\n', elsewhere)
        here, there = pages_in(REFERENCE), pages_in(self.scratch)
        self.assertEqual(sorted(here), sorted(there))
        self.assertEqual([], [name for name in here if here[name] != there[name]])

    def test_fails_where_something_public_is_not_described(self):
        described = "#pragma once\n\n// Rooms.\nnamespace rooms {\n// A room.\nclass Room {\n public:\n  int size();  // of it\n%s};\n}\n"
        self.assertEqual((True, ""), self.made_from(described % ""))
        succeeded, said = self.made_from(described % "\n  int doors();\n")
        self.assertFalse(succeeded)
        self.assertIn("doors() (function) of class rooms::Room is not documented", said)

    def test_takes_a_comment_for_all_that_stands_below_it(self):
        self.assertEqual(
            ["///@{", "/// Both.", "int a();", "int b();", "///@}", "", "int c();"],
            self.shown("// Both.\nint a();\nint b();\n\nint c();\n"),
        )

    def test_takes_a_comment_behind_a_declaration_for_its_own(self):
        self.assertEqual(["int a();  ///< one", "int b;  /**< two */"], self.shown("int a();  // one\nint b;  /* two */\n"))

    def test_leaves_out_what_is_internal(self):
        self.assertEqual(
            ["/// @cond", "struct Content;  ///< internal", "int content();", "/// @endcond", "", "int size();"],
            self.shown("struct Content;  // internal\nint content();\n\nint size();\n"),
        )


if __name__ == "__main__":
    unittest.main()
