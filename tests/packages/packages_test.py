"""The Debian packages as files: accepted by lintian, complete, and looking for libraries where the system has them."""

import re
import subprocess
import tempfile
import unittest
from pathlib import Path

from packages_case import debug_symbols_of, package_files, run


def field(name, file):
    return run("dpkg-deb", "--field", file, name).strip()


class Packages(unittest.TestCase):
    def test_are_accepted_by_lintian(self):
        options = ["--allow-root", "--no-cfg", "--tag-display-limit", "0", "--fail-on", "error,warning", "--pedantic"]
        run("lintian", *options, *package_files().values())

    def test_depend_on_what_their_programs_need_and_on_each_other_exactly(self):
        files = package_files()
        library = f"libaccountsettings1 (= {field('Version', files['libaccountsettings1'])})"
        for name in ("accountctl", "libaccountsettings-dev", "migration-host"):
            self.assertIn(library, field("Depends", files[name]))
        for needed in ("libc6", "libplist3", "libsystemd0", "libutf8proc2", "libicu72"):
            self.assertRegex(field("Depends", files["libaccountsettings1"]), rf"(^|, ){re.escape(needed)} \(")
        self.assertIn("systemd | systemd-standalone-sysusers", field("Depends", files["migration-host"]))

    def test_bring_the_client_and_the_documents_along_with_the_host(self):
        host = package_files()["migration-host"]
        self.assertEqual("accountctl", field("Recommends", host))
        self.assertEqual("account-settings-doc", field("Suggests", host))

    def test_have_their_debug_symbols_in_packages_of_their_own(self):
        with tempfile.TemporaryDirectory() as scratch:
            for name in ("accountctl", "libaccountsettings1", "migration-host"):
                run("dpkg-deb", "--extract", debug_symbols_of(name), Path(scratch) / name)
                run("dpkg-deb", "--extract", package_files()[name], Path(scratch) / name)
                symbols = list((Path(scratch) / name / "usr/lib/debug/.build-id").rglob("*.debug"))
                self.assertGreater(len(symbols), 0)
                self.assertIn(".debug_info", run("readelf", "--sections", "--wide", symbols[0]))
            program = Path(scratch) / "accountctl/usr/bin/accountctl"
            self.assertNotIn(".debug_info", run("readelf", "--sections", "--wide", program))
            identifier = re.search(r"Build ID: (\w\w)(\w+)", run("readelf", "--notes", program))
            self.assertTrue((Path(scratch) / "accountctl/usr/lib/debug/.build-id" / identifier[1] / f"{identifier[2]}.debug").is_file())

    def test_have_scripts_only_where_there_is_something_to_do(self):
        scripts = {"preinst", "postinst", "prerm", "postrm"}
        with tempfile.TemporaryDirectory() as scratch:
            for name, file in package_files().items():
                control = Path(scratch) / name
                run("dpkg-deb", "--control", file, control)
                expected = {"postinst", "postrm"} if name == "migration-host" else set()
                self.assertEqual(expected, {path.name for path in control.iterdir()} & scripts)

    def test_name_no_directory_to_look_for_libraries_in(self):
        with tempfile.TemporaryDirectory() as scratch:
            for name, file in package_files().items():
                run("dpkg-deb", "--extract", file, Path(scratch) / name)
            binaries = [
                path for path in Path(scratch).rglob("*")
                if path.is_file() and not path.is_symlink() and path.read_bytes()[:4] == b"\x7fELF"
            ]
            self.assertGreater(len(binaries), 9)
            for path in binaries:
                self.assertNotRegex(run("readelf", "--dynamic", path), "RUNPATH|RPATH")

    def test_hold_no_path_of_the_build(self):
        with tempfile.TemporaryDirectory() as scratch:
            for name, file in package_files().items():
                run("dpkg-deb", "--extract", file, Path(scratch) / name)
            found = subprocess.run(
                ["grep", "-rlF", str(Path(__file__).parents[2]), scratch], capture_output=True, text=True, check=False
            )
            self.assertEqual("", found.stdout)


if __name__ == "__main__":
    unittest.main()
