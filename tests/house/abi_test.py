"""That programs and modules which were built with a release still run with these libraries: what each offers to others,
down to the layout of its structures, is held against abi/NAME.abi.xz, a description of what was offered.

What is added passes. What is changed or gone does not, and needs a new number of the library, whose description is
then written anew, from a release build:

    python3 tests/house/abi_test.py --write build/release
"""

import lzma
import os
import re
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

DESCRIPTIONS = Path(__file__).resolve().parent / "abi"
LIBRARY_DIRECTORY = os.environ.get("LIBRARY_DIRECTORY", "lib")
# Each library with where its headers are installed.
LIBRARIES = {
    "libaccountplatform": "account-settings",
    "libaccountsettings": "account-settings",
    "libaccountsettings-client": "account-settings-client",
}
# Neither where it was built nor what is behind the headers; what is left says what a program relies on.
TERSE = [
    "--exported-interfaces-only", "--drop-private-types", "--drop-undefined-syms", "--no-corpus-path",
    "--no-comp-dir-path", "--no-show-locs", "--no-elf-needed", "--no-parameter-names", "--no-write-default-sizes",
]


def run(*command):
    return subprocess.run([str(part) for part in command], capture_output=True, text=True, check=False)


def install_headers(build_tree, prefix):
    installed = run("cmake", "--install", build_tree, "--component", "development", "--prefix", prefix)
    if installed.returncode != 0:
        raise AssertionError(installed.stderr)
    return Path(prefix) / "include"


def library(build_tree, name):
    return build_tree / LIBRARY_DIRECTORY / f"{name}.so"


def description(build_tree, includes, name):
    described = run("abidw", *TERSE, "--headers-dir", includes / LIBRARIES[name], library(build_tree, name))
    if described.returncode != 0:
        raise AssertionError(described.stderr)
    return described.stdout


def kept(name):
    return DESCRIPTIONS / f"{name}.abi.xz"


def write_descriptions(build_tree):
    with tempfile.TemporaryDirectory() as prefix:
        includes = install_headers(build_tree, prefix)
        for name in LIBRARIES:
            kept(name).write_bytes(lzma.compress(description(build_tree, includes, name).encode(), preset=9))


class BinaryInterface(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        scratch = tempfile.TemporaryDirectory()
        cls.addClassCleanup(scratch.cleanup)
        cls.scratch = Path(scratch.name)
        cls.build_tree = Path(os.environ["BUILD_TREE"])
        includes = install_headers(cls.build_tree, cls.scratch / "prefix")
        cls.present = {name: description(cls.build_tree, includes, name) for name in LIBRARIES}

    def comparison(self, before, after):
        files = []
        for name, text in (("before.abi", before), ("after.abi", after)):
            files.append(self.scratch / name)
            files[-1].write_text(text, encoding="utf-8")
        return run("abidiff", "--no-added-syms", *files)

    def after(self, pattern, replacement):
        """The comparison where the next release of the client's library had another description in one place."""
        present = self.present["libaccountsettings-client"]
        changed, count = re.subn(pattern, replacement, present, count=1)
        self.assertEqual(1, count, pattern)
        return self.comparison(present, changed)

    def assert_fails(self, telling, compared):
        self.assertNotEqual(0, compared.returncode)
        self.assertRegex(compared.stdout, telling)

    def test_is_as_it_was_described(self):
        for name in LIBRARIES:
            with self.subTest(library=name):
                compared = self.comparison(lzma.decompress(kept(name).read_bytes()).decode(), self.present[name])
                self.assertEqual((0, ""), (compared.returncode, compared.stderr), compared.stdout)

    def test_may_grow_by_functions_and_codes(self):
        symbol = r"(    <elf-symbol name='account_settings_)free('.*\n)"
        self.assertEqual(0, self.after(symbol, r"\1added\2\g<0>").returncode)
        code = r"( *<enumerator name=')brokenInstallation(' value=')\d+('/>\n)"
        self.assertEqual(0, self.after(code, r"\g<0>\1added\g<2>99\3").returncode)

    def test_fails_where_a_function_is_gone(self):
        symbol = r" *<elf-symbol name='account_settings_watch_dispatch'.*\n"
        self.assert_fails("account_settings_watch_dispatch", self.after(symbol, ""))

    def test_fails_where_a_code_means_something_else(self):
        self.assert_fails("Code::busy", self.after(r"(<enumerator name='busy' value=')\d+", r"\g<1>99"))

    def test_fails_where_a_field_is_gone(self):
        field = r" *<data-member .*\n *<var-decl name='mayBeMissing'.*\n *</data-member>\n"
        self.assert_fails("mayBeMissing", self.after(field, ""))

    def test_fails_where_a_structure_grows(self):
        size = r"(<class-decl name='OpenOptions' size-in-bits=')\d+"
        self.assert_fails("type size changed", self.after(size, r"\g<1>512"))

    def test_fails_where_a_parameter_is_of_another_type(self):
        function = r"(<function-decl name='account_settings_open'.*\n(?:.*\n)*? *<parameter type-id=')type-id-\d+'"
        self.assert_fails("parameter 1", self.after(function, r"\1type-id-1'"))

    def test_gives_every_symbol_the_version_that_brought_it(self):
        for name in LIBRARIES:
            lines = run("nm", "-D", "--defined-only", library(self.build_tree, name)).stdout.splitlines()
            version = name.removeprefix("lib").upper().replace("-", "_")
            symbols = [line.split(" ", 2)[2] for line in lines if " A " not in line]
            self.assertGreater(len(symbols), 20)
            self.assertEqual([], [each for each in symbols if not re.search(rf"@@{version}_\d+(\.\d+)*$", each)])


if __name__ == "__main__":
    if sys.argv[1:2] == ["--write"]:
        write_descriptions(Path(sys.argv[2]))
    else:
        unittest.main()
