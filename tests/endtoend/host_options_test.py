"""The host's command line: what is wrong use, and what each option leads to."""

import unittest

from device_case import PLUGINS, DeviceTest

OPTIONS = ["--root", "--home", "--shared-resources", "--resources", "--plugin", "--trace", "--snapshots", "--keep", "--restore"]
SWITCHES = ["--explain", "--dry-run"]


class WrongUse(DeviceTest):
    def assert_wrong(self, message, *arguments):
        run = self.run_host(*arguments)
        self.assertEqual((2, [], [f"migration-host: {message}"]), (run.status, run.output, run.errors))

    def test_an_unknown_option(self):
        self.assert_wrong("unknown option: --rot (see --help)", "--rot", self.scratch)

    def test_an_abbreviated_option(self):
        self.assert_wrong("unknown option: --plug (see --help)", "--plug=x")

    def test_a_short_option(self):
        self.assert_wrong("unknown option: -r (see --help)", "-r", self.scratch)

    def test_a_missing_value_at_the_end(self):
        for option in OPTIONS:
            with self.subTest(option=option):
                self.assert_wrong(f"{option} needs a value (see --help)", option)

    def test_a_missing_value_before_another_option(self):
        self.assert_wrong("--root needs a value (see --help)", "--root", "--trace", "x")

    def test_an_empty_value(self):
        for option in OPTIONS:
            with self.subTest(option=option):
                self.assert_wrong(f"{option} needs a value (see --help)", option, "")
                self.assert_wrong(f"{option} needs a value (see --help)", f"{option}=")

    def test_a_stray_argument(self):
        self.assert_wrong(f"unexpected argument: {self.scratch} (see --help)", self.scratch)

    def test_a_second_value_for_one_option(self):
        self.assert_wrong("--root is given twice (see --help)", "--root", "/", "--root", "/")

    def test_an_explanation_in_an_unknown_form(self):
        for form in ("--explain=yaml", "--explain="):
            self.assert_wrong("--explain is followed by nothing, =text, =json or =html (see --help)", form)

    def test_an_explanation_that_is_asked_for_twice(self):
        self.assert_wrong("--explain is given twice (see --help)", "--explain", "--explain=json")

    def test_a_rehearsal_that_is_asked_for_oddly(self):
        self.assert_wrong("--dry-run takes no value (see --help)", "--dry-run=yes")
        self.assert_wrong("--dry-run is given twice (see --help)", "--dry-run", "--dry-run")

    def test_a_run_only_if_needed_without_snapshots(self):
        self.assert_wrong("--if-needed needs --snapshots (see --help)", "--if-needed")

    def test_an_explanation_of_no_run(self):
        for instead in ("--list-snapshots", "--restore=x"):
            self.assert_wrong("--explain is for a run, and this is none (see --help)",
                              "--explain", "--snapshots", self.scratch, instead)

    def test_a_root_that_is_missing(self):
        root = self.scratch / "nowhere"
        self.assert_wrong(f"--root is no directory: {root} (see --help)", "--root", root)

    def test_a_root_that_is_a_file(self):
        root = self.scratch / "file"
        root.write_text("")
        self.assert_wrong(f"--root is no directory: {root} (see --help)", "--root", root)


class Answers(DeviceTest):
    def test_help_names_every_option(self):
        run = self.run_host("--help")
        self.assertEqual((0, []), (run.status, run.errors))
        for option in OPTIONS + SWITCHES:
            self.assertIn(f"  {option} ", "\n".join(run.output))

    def test_version_is_one_line(self):
        run = self.run_host("--version")
        self.assertEqual((0, []), (run.status, run.errors))
        self.assertRegex("\n".join(run.output), r"^migration-host \d+\.\d+\.\d+$")


class BaseDirectories(DeviceTest):
    def home(self, *arguments):
        run = self.run_host(
            "--plugin", PLUGINS / "directed_migrator.so", *arguments, environment={"TEST_PLUGIN": "directories"}
        )
        self.assertEqual(0, run.status)
        return run.errors

    def test_home_lies_under_the_root(self):
        root = self.device().root
        self.assertEqual([f"{root}/var/mobile"], self.home("--root", root))

    def test_home_can_be_set(self):
        root = self.device().root
        self.assertEqual(["/elsewhere"], self.home("--root", root, "--home=/elsewhere"))


if __name__ == "__main__":
    unittest.main()
