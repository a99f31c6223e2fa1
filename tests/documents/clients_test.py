"""The programs that docs/CLIENTS.md shows, compiled and run: each language lists, changes and watches."""

import os
import re
import subprocess
import sys
import unittest
from pathlib import Path

from device import CURRENT_VERSION, SETTINGS, plain_environment
from device_case import DeviceTest

SOURCES = Path(os.environ["SOURCE_TREE"])
LIBRARIES = Path(os.environ["BUILD_TREE"]) / os.environ["LIBRARY_DIRECTORY"]
SANITIZE = os.environ["SANITIZE"]
HEADERS = [SOURCES / "client/include", SOURCES / "bindings/include"]
PAGE = (SOURCES / "docs/CLIENTS.md").read_text(encoding="utf-8")
STRICT = ["-Wall", "-Wextra", "-Wpedantic", "-Werror"]
COMPILERS = {"cpp": [os.environ["CXX"], "-std=c++17"],
             "c": ["clang-16" if "clang" in os.environ["CXX"] else "gcc", "-std=c11"]}


def program_of(title, language):
    section = re.search(rf"^## {title}\n(.*?)(?=^## |\Z)", PAGE, re.M | re.S)[1]
    return re.search(rf"^```{language}\n(.*?)^```$", section, re.M | re.S)[1]


class Programs(DeviceTest):
    def setUp(self):
        super().setUp()
        account = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L1", "DisplayName": "First"}
        self.tree = self.device(Version=CURRENT_VERSION, Accounts=[account])
        self.environment = {
            **plain_environment(), "LD_LIBRARY_PATH": str(LIBRARIES), "PYTHONPATH": str(SOURCES / "bindings/python"),
            "PYTHONDONTWRITEBYTECODE": "1",
        }

    def command(self, title, language):
        if language == "python" and SANITIZE:
            self.skipTest("the sanitizer's run time stands in the program, and Python has none")
        source = self.scratch / f"{title}.{language}"
        source.write_text(program_of(title, language), encoding="utf-8")
        if language == "python":
            return [sys.executable, source, self.tree.root]
        program = source.with_suffix(".program")
        # The library is C++, so its checks want the run time of C++ in a program in C, too.
        sanitize = [f"-fsanitize={SANITIZE}", "-fsanitize-link-c++-runtime", "-lstdc++"] if SANITIZE else []
        subprocess.run(
            [*COMPILERS[language], *STRICT, *sanitize, *(f"-I{path}" for path in HEADERS), source, "-o", program,
             f"-L{LIBRARIES}", f"-Wl,-rpath-link,{LIBRARIES}", "-laccountsettings-client"], check=True,
        )
        return [program, self.tree.root]

    def output_of(self, command):
        return subprocess.run(
            command, env=self.environment, stdin=subprocess.DEVNULL, capture_output=True, text=True, check=True
        ).stdout

    def test_take_twenty_lines_each(self):
        for title in ("List", "Change", "Watch"):
            for language in ("cpp", "c", "python"):
                lines = [line for line in program_of(title, language).splitlines() if line.strip()]
                self.assertLessEqual(len(lines), 20, f"{title}, {language}")

    def test_list_the_accounts(self):
        for language in ("cpp", "c", "python"):
            with self.subTest(language=language):
                self.assertEqual("L1 LDAP First\n", self.output_of(self.command("List", language)))

    def test_say_why_they_cannot(self):
        self.tree.write_plist(SETTINGS, {"Version": 3, "Accounts": []})
        for language in ("cpp", "c", "python"):
            with self.subTest(language=language):
                ended = subprocess.run(
                    self.command("List", language), env=self.environment, capture_output=True, text=True, check=False
                )
                self.assertEqual(1, ended.returncode)
                self.assertIn("have data version 3 and must be migrated before", ended.stderr)

    def test_change_the_accounts(self):
        for language, name in (("cpp", "Club"), ("c", "Directory"), ("python", "Club")):
            with self.subTest(language=language):
                self.assertEqual("1 saved\n", self.output_of(self.command("Change", language)))
                self.assertEqual(name, self.tree.read_plist(SETTINGS)["Accounts"][-1]["DisplayName"])

    def test_watch_the_accounts(self):
        for language in ("cpp", "c", "python"):
            with self.subTest(language=language):
                process = subprocess.Popen(
                    self.command("Watch", language), env=self.environment, stdin=subprocess.PIPE,
                    stdout=subprocess.PIPE, text=True,
                )
                with process:
                    self.assertEqual("watching\n", process.stdout.readline())
                    self.output_of(self.command("Change", "c"))
                    added = self.tree.read_plist(SETTINGS)["Accounts"][-1]["Identifier"]
                    self.assertEqual(f"added {added}\n", process.stdout.readline())
                    process.stdin.close()
                self.assertEqual(0, process.returncode)


class Headers(unittest.TestCase):
    def test_compile_alone_without_a_warning(self):
        for compiler in ("g++", "clang++-16"):
            for header in sorted(path for directory in HEADERS for path in directory.rglob("*.h")):
                for standard in ("c++17", "c++20", *(["c11", "c17"] if header.name == "account-settings.h" else [])):
                    language = "c++" if standard.startswith("c++") else "c"
                    subprocess.run(
                        [compiler, f"-std={standard}", *STRICT, "-fsyntax-only", *(f"-I{path}" for path in HEADERS),
                         "-include", header, "-x", language, os.devnull], check=True,
                    )


if __name__ == "__main__":
    unittest.main()
