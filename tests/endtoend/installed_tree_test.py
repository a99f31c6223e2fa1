"""The installed tree, moved to where nobody installed it: it runs there, and other programs build and run on it."""

import os
import subprocess
import unittest
from pathlib import Path

from device import CURRENT_VERSION, EXAMPLES, SETTINGS, lines, plain_environment
from device_case import DeviceTest

BUILD_TREE = Path(os.environ["BUILD_TREE"])
LIBRARY_DIRECTORY = os.environ["LIBRARY_DIRECTORY"]
SOURCES = EXAMPLES.parent / "list-accounts"
CLIENTS = Path(__file__).resolve().parent / "clients"
IDENTIFIER = "55E4F607-1829-43A4-95B6-C7D8E9FA0B05"
NOTES = "com.vorlix.Dataclass.Notes"


def run(*command, **environment):
    ended = subprocess.run(
        [str(part) for part in command],
        env={**plain_environment(), **environment},
        stdin=subprocess.DEVNULL,
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        check=False,
    )
    if ended.returncode != 0:
        raise AssertionError(f"{command} failed:\n{ended.stdout.decode(errors='replace')}")
    return lines(ended.stdout)


class InstalledTree(DeviceTest):
    def setUp(self):
        super().setUp()
        run("cmake", "--install", BUILD_TREE, "--prefix", self.scratch / "first")
        self.prefix = self.scratch / "somewhere" / "else"
        self.prefix.parent.mkdir()
        (self.scratch / "first").rename(self.prefix)
        self.library = self.prefix / LIBRARY_DIRECTORY

    def dynamic_section(self, path):
        return run("readelf", "--dynamic", path)

    def test_holds_no_path_of_the_build(self):
        for path in [self.prefix / "bin" / "migration-host", *self.library.rglob("*.so")]:
            with self.subTest(path=path):
                dynamic = self.dynamic_section(path)
                self.assertNotIn(str(BUILD_TREE), "\n".join(dynamic))
                needs_the_house = any("(NEEDED)" in line and "[libaccount" in line for line in dynamic)
                self.assertEqual(needs_the_house, any("(RUNPATH)" in line and "[$ORIGIN" in line for line in dynamic))

    def test_offers_no_header_of_what_the_library_keeps_to_itself(self):
        headers = self.prefix / "include" / "account-settings" / "accountsettings"
        offered = {path.name for path in headers.iterdir()}
        self.assertIn("accounts_manager.h", offered)
        self.assertEqual(set(), offered & {"file_paths.h", "record_changes.h", "change_tracker.h"})

    def test_migrates_a_device(self):
        device = self.example("current")
        before = device.read_plist(SETTINGS)
        migrated = device.migrate(self.prefix / "bin" / "migration-host")
        self.assertEqual((0, before), (migrated.status, device.read_plist(SETTINGS)))

    def test_uses_its_own_plugin_and_resources(self):
        device = self.example("current")
        (self.library / "account-settings" / "accounts-migrator.so").unlink()
        self.assertEqual(3, device.migrate(self.prefix / "bin" / "migration-host").status)

    def test_migrates_without_what_only_dates_and_languages_need(self):
        device = self.example("first-generation")
        (self.library / "account-settings" / "platform-icu.so").unlink()
        self.assertEqual(0, device.migrate(self.prefix / "bin" / "migration-host").status)
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])

    def build_with_cmake(self):
        build = self.scratch / "with-cmake"
        run(
            "cmake", "-G", "Ninja", "-S", SOURCES, "-B", build,
            f"-DCMAKE_PREFIX_PATH={self.prefix}", f"-DCMAKE_CXX_COMPILER={os.environ['CXX']}", *self.sanitizer_options(),
        )
        run("cmake", "--build", build)
        return build / "list-accounts"

    def sanitizer_options(self):
        flags = self.sanitizer_flags()
        return [f"-DCMAKE_CXX_FLAGS={' '.join(flags)}"] if flags else []

    def sanitizer_flags(self):
        sanitizers = os.environ["SANITIZE"]
        return [f"-fsanitize={sanitizers}"] if sanitizers else []

    def build_with_pkg_config(self, package, source):
        program = self.scratch / source.stem
        options = run(
            "pkg-config", "--cflags", "--libs", package, PKG_CONFIG_PATH=str(self.library / "pkgconfig")
        )[0].split()
        run(
            os.environ["CXX"], source, *self.sanitizer_flags(), *options,
            f"-Wl,-rpath,{self.library}", "-o", program,
        )
        return program

    def assert_lists_and_switches(self, program):
        device = self.example("current")
        settings = device.read_plist(SETTINGS)
        listed = run(program, device.root)
        self.assertEqual(
            [f"{each['Identifier']}  {each['Type']}  {each['DisplayName']}" for each in settings["Accounts"][:3]],
            [line for line in listed if not line.startswith(" ")][:3],
        )
        run(program, device.root, IDENTIFIER, NOTES)
        settings["Accounts"][1]["Enabled Dataclasses"].remove(NOTES)
        self.assertEqual(settings, device.read_plist(SETTINGS))

    def test_serves_a_program_built_with_cmake(self):
        self.assert_lists_and_switches(self.build_with_cmake())

    def test_serves_a_program_built_with_pkg_config(self):
        self.assert_lists_and_switches(self.build_with_pkg_config("account-settings-client", SOURCES / "main.cpp"))

    def test_offers_what_is_published_to_programs_that_include_it_or_look_it_up(self):
        program = self.build_with_pkg_config("account-settings", CLIENTS / "published_functions.cpp")
        device = self.device()
        self.assertEqual(["Gmail"], run(program, device.root))
        device.write_plist("etc/vorlix/device-info.plist", {"RegionalBehaviorGoogleMail": True})
        self.assertEqual(["Google Mail"], run(program, device.root))


if __name__ == "__main__":
    unittest.main()
