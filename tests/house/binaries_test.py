"""How every program, library and module is linked, built and installed, and what it exports.

What a library exports is reviewed, signature by signature: exported/NAME.txt is its public interface, and
exported/NAME.internal.txt what the house itself needs of it beyond that (the plug-in, the tools, the tests). A library
without lists exports nothing. After a change that was meant, write the lists anew, which puts what is new among the
internal, move what is public, and read the difference:

    python3 tests/house/binaries_test.py --write BUILD_TREE

What the client's library exports is listed in client/exported_symbols.map, too, under the version that brought it. The
same command lists what is new under the last version there, unless that was released; then the library is to be built
again, and the lists written again.
"""

import json
import os
import re
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

REVIEWED = Path(__file__).resolve().parent / "exported"
INTERNAL = ".internal"
SOURCES = Path(__file__).resolve().parent.parent.parent
CLIENT_MAP = SOURCES / "client" / "exported_symbols.map"
CHANGELOG = SOURCES / "CHANGELOG.md"
# Private to a class, and called by those of its operations that stand in the header.
CALLED_BY_INLINE_OPERATIONS = {
    "BasicAccount::acceptProperties", "Dictionary::editable", "DeviceLocalAccount::propertiesWithClass", "LogHandle::write",
}


def output_of(*command):
    ended = subprocess.run([str(part) for part in command], check=True, capture_output=True, text=True)
    return ended.stdout


def binaries_below(directory):
    """Every program, library and module, once, by the name that it was built under."""
    found = [path for path in sorted(directory.rglob("*")) if path.is_file() and not path.is_symlink()]
    return [path for path in found if is_elf(path)]


def is_elf(path):
    with path.open("rb") as file:
        return file.read(4) == b"\x7fELF"


def name_of(path):
    return path.name.split(".so")[0]


def is_program(path):
    return ".so" not in path.name


def exported_by(path):
    """Signatures, with the version that brought each; that of the first release of a library in C++ goes without saying."""
    lines = output_of("nm", "-DC", "--defined-only", path).splitlines()
    return sorted({re.sub(r"(@@|^)ACCOUNT(PLATFORM|SETTINGS)_1$", "", line.split(" ", 2)[2]) for line in lines} - {""})


def imported_by(path):
    return {line.split()[-1].split("@")[0] for line in output_of("nm", "-D", "--undefined-only", path).splitlines()}


def list_of(name, kind=""):
    return REVIEWED / f"{name}{kind}.txt"


def reviewed_for(name, kind=""):
    listed = list_of(name, kind)
    return listed.read_text(encoding="utf-8").splitlines() if listed.is_file() else []


def write_lists(libraries):
    for path in libraries:
        exported, name = exported_by(path), name_of(path)
        public = set(reviewed_for(name)) & set(exported)
        for kind, names in (("", public), (INTERNAL, set(exported) - public)):
            list_of(name, kind).unlink(missing_ok=True)
            if names:
                list_of(name, kind).write_text("\n".join(sorted(names)) + "\n", encoding="utf-8")


def marked_in(build_tree):
    """What the sources of the client's library mark as its interface, whether it is exported or not."""
    commands = json.loads((build_tree / "compile_commands.json").read_text(encoding="utf-8"))
    objects = [build_tree / re.search(r" -o (\S+)", each["command"])[1] for each in commands
               if Path(each["file"]).parent in (SOURCES / "client", SOURCES / "bindings")]
    lines = [line.split() for line in output_of("readelf", "-sW", *objects).splitlines()]
    names = {fields[7] for fields in lines if len(fields) == 8 and fields[4] in ("GLOBAL", "WEAK")
             and fields[5] == "DEFAULT" and fields[6] != "UND"
             and re.match(r"_Z(T[ISV])?NK?[RO]?8accounts|account_settings_", fields[7])}
    return set(output_of("c++filt", *sorted(names)).splitlines())


def versions_in(text):
    """The symbols of each version of the client's library, by its name; the last version comes last."""
    nodes = re.findall(r"^(\w+(?:\.\d+)*) \{\n(.*?)^\}", text, re.MULTILINE | re.DOTALL)
    return {name: set(re.findall(r'^ +"?(accounts::[^"]+|[^"]* for accounts::[^"]+|account_settings_\w+)"?;$', symbols,
                                 re.MULTILINE)) for name, symbols in nodes}


def is_released(version, changelog):
    release = ".".join([*version.rsplit("_", 1)[1].split("."), "0", "0"][:3])
    return f"## {release} (unreleased)" not in changelog


def map_of(versions):
    text = "/* The interface of the client's library, each symbol under the version that brought it. Written by\n"
    text += " * tests/house/binaries_test.py --write. */\n"
    before = ""
    for version, symbols in versions.items():
        cpp = "".join(f'      "{symbol}";\n' for symbol in sorted(symbols) if "::" in symbol)
        cpp = cpp and f'    extern "C++" {{\n{cpp}    }};\n'
        c = "".join(f"    {symbol};\n" for symbol in sorted(symbols) if "::" not in symbol)
        local = "" if before else "  local:\n    *;\n"
        text += f"{version} {{\n  global:\n{cpp}{c}{local}}}{before};\n"
        before = f" {version}"
    return text


def map_with(marked, text, changelog):
    """The map where this is the interface: what is new has come with the last version."""
    versions = versions_in(text)
    last = list(versions)[-1]
    new = marked.difference(*versions.values())
    if new and is_released(last, changelog):
        raise SystemExit(f"{last} was released: {CLIENT_MAP} needs another version for {sorted(new)}")
    versions[last] |= new
    return map_of({version: symbols & marked for version, symbols in versions.items()})


def private_members(header):
    """What a header declares as private: CLASS::NAME of each operation."""
    class_name, is_private = None, False
    for line in header.read_text(encoding="utf-8").splitlines():
        opened = re.match(r"class (?:\[\[\w+\]\] |ACCOUNT_\w+ )*(\w+)(?: final)?(?: :.*)? \{$", line)
        if opened:
            class_name, is_private = opened[1], True
        elif re.match(r" (?:public|protected):", line):
            is_private = False
        elif line == " private:":
            is_private = True
        elif line == "};":
            class_name = None
        elif class_name and is_private and (named := re.match(r"  (?:\S.*?[ *&])?(\w+)\(", line)):
            yield f"{class_name}::{named[1]}"


class Binaries(unittest.TestCase):
    maxDiff = None
    path = None  # the binary that is being looked at
    build_tree = Path(os.environ.get("BUILD_TREE", "."))
    library_directory = os.environ.get("LIBRARY_DIRECTORY", "lib")

    @classmethod
    def setUpClass(cls):
        installed = tempfile.TemporaryDirectory()
        cls.addClassCleanup(installed.cleanup)
        output_of("cmake", "--install", cls.build_tree, "--prefix", installed.name)
        trees = [cls.build_tree / "bin", cls.build_tree / cls.library_directory, Path(installed.name)]
        cls.binaries = [path for tree in trees for path in binaries_below(tree)]
        cls.libraries = [path for path in cls.binaries if not is_program(path)]

    def each(self, paths=None):
        for self.path in self.binaries if paths is None else paths:
            yield self.path

    def _formatMessage(self, *messages):
        return f"{self.path}: {super()._formatMessage(*messages)}"

    def test_are_all_there_built_and_installed(self):
        names = [name_of(path) for path in self.binaries]
        for name in ("migration-host", "accountctl", "libaccountplatform", "libaccountsettings", "accounts-migrator"):
            self.assertEqual(2, names.count(name), names)

    def test_look_for_libraries_only_relative_to_themselves(self):
        for path in self.each():
            dynamic = output_of("readelf", "-dW", path)
            self.assertNotIn("(RPATH)", dynamic)
            for line in re.findall(r"\(RUNPATH\).*\[(.*)\]", dynamic):
                for directory in line.split(":"):
                    self.assertRegex(directory, r"^\$ORIGIN(/|$)")

    def test_bind_everything_before_they_run_and_write_protect_it(self):
        for path in self.each():
            self.assertRegex(output_of("readelf", "-dW", path), r"\(FLAGS_1\).*NOW")
            self.assertIn("GNU_RELRO", output_of("readelf", "-lW", path))

    def test_have_no_executable_stack_and_no_segment_to_write_and_run(self):
        for path in self.each():
            segments = re.findall(r"^ *(\w+) +0x.* ([R ][W ][E ]) 0x", output_of("readelf", "-lW", path), re.MULTILINE)
            self.assertIn(("GNU_STACK", "RW "), segments)
            self.assertEqual([], [kind for kind, access in segments if "W" in access and "E" in access])

    def test_can_be_loaded_anywhere(self):
        for path in self.each():
            self.assertRegex(output_of("readelf", "-hW", path), r"Type: +DYN")

    def test_contain_no_relocation_of_code(self):
        for path in self.each():
            self.assertNotIn("TEXTREL", output_of("readelf", "-dW", path))

    @unittest.skipIf(os.environ.get("SANITIZE"), "sanitizers export what they need themselves")
    def test_export_what_was_reviewed_and_nothing_else(self):
        for path in self.each(self.libraries):
            name = name_of(path)
            self.assertEqual(sorted(reviewed_for(name) + reviewed_for(name, INTERNAL)), exported_by(path))

    def test_export_no_private_member(self):
        headers = [*SOURCES.glob("accountsettings/*.h"), *SOURCES.glob("platform/*.h")]
        private = {member for header in headers for member in private_members(header)}
        self.assertIn("AccountsManager::mergedRecords", private)
        for path in self.each(self.libraries):
            exported = {match[1] for line in exported_by(path) if (match := re.match(r"\w+::(\w+::\w+)", line))}
            self.assertEqual(set(), exported & private - CALLED_BY_INLINE_OPERATIONS)

    def test_of_a_list_are_still_built(self):
        built = {name_of(path) for path in self.libraries}
        self.assertLessEqual({listed.name.split(".")[0] for listed in REVIEWED.glob("*.txt")}, built)

    def test_guard_their_stack(self):
        for path in self.each():
            if name_of(path) in {"libaccountplatform", "libaccountsettings", "accounts-migrator", "migration-host"}:
                self.assertIn("__stack_chk_fail", imported_by(path))


class SymbolsOfTheClientsLibrary(unittest.TestCase):
    maxDiff = None

    @classmethod
    def setUpClass(cls):
        cls.marked = marked_in(Binaries.build_tree)
        cls.map = CLIENT_MAP.read_text(encoding="utf-8")

    def test_are_all_listed_once(self):
        listed = [symbol for symbols in versions_in(self.map).values() for symbol in symbols]
        self.assertGreater(len(listed), 100)
        self.assertEqual(sorted(self.marked), sorted(listed))

    def test_are_listed_as_they_are_written(self):
        self.assertEqual(self.map, map_of(versions_in(self.map)))

    def test_come_with_the_last_version_before_its_release_and_not_after(self):
        marked = self.marked | {"account_settings_added"}
        before = map_with(marked, self.map, "## 1.0.0 (unreleased)")
        self.assertEqual(marked, versions_in(before)["ACCOUNTSETTINGS_CLIENT_1"])
        with self.assertRaisesRegex(SystemExit, "ACCOUNTSETTINGS_CLIENT_1 was released.*account_settings_added"):
            map_with(marked, self.map, "## 1.1.0 (unreleased)\n\n## 1.0.0")
        next_version = self.map + "ACCOUNTSETTINGS_CLIENT_1.1 {\n} ACCOUNTSETTINGS_CLIENT_1;\n"
        after = versions_in(map_with(marked, next_version, "## 1.1.0 (unreleased)\n\n## 1.0.0"))
        self.assertEqual((self.marked, {"account_settings_added"}), tuple(after.values()))


class Compilation(unittest.TestCase):
    """Flags that leave no trace in a binary that happens to have no use for them."""

    @classmethod
    def setUpClass(cls):
        commands = json.loads((Binaries.build_tree / "compile_commands.json").read_text(encoding="utf-8"))
        cls.commands = [each["command"] for each in commands]

    def test_guards_the_stack(self):
        self.assertEqual([], [each for each in self.commands if "-fstack-protector-strong" not in each])

    def test_checks_the_buffers_of_library_calls_where_it_optimises(self):
        if not all(" -O2 " in each for each in self.commands) or os.environ.get("SANITIZE"):
            self.skipTest("only what is optimised, and no sanitizer, takes _FORTIFY_SOURCE")
        self.assertEqual([], [each for each in self.commands if "-D_FORTIFY_SOURCE=2" not in each])
        for path in binaries_below(Binaries.build_tree / Binaries.library_directory):
            if name_of(path) == "libaccountplatform":
                self.assertTrue([each for each in imported_by(path) if re.fullmatch(r"__\w+_chk", each)])


if __name__ == "__main__":
    if sys.argv[1:2] == ["--write"]:
        written = map_with(marked_in(Path(sys.argv[2])), CLIENT_MAP.read_text("utf-8"), CHANGELOG.read_text("utf-8"))
        CLIENT_MAP.write_text(written, encoding="utf-8")
        write_lists(path for path in binaries_below(Path(sys.argv[2]) / "lib"))
    else:
        unittest.main()
