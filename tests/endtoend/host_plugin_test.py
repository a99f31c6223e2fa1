"""What the host makes of a plug-in: its exit status and, where the plug-in cannot be used, one line that says why."""

import unittest

from device import Device
from device_case import PLUGINS, DeviceTest


class Results(DeviceTest):
    def test_success_exits_with_0(self):
        self.assertEqual((0, [], [], []), self.run_directed("succeed"))

    def test_failure_exits_with_1(self):
        self.assertEqual((1, [], [], []), self.run_directed("fail"))

    def test_a_thrown_failure_is_told_and_exits_with_1(self):
        self.assertEqual((1, [], ["migration-host: thrown on purpose"], []), self.run_directed("throw"))


class UnusablePlugins(DeviceTest):
    def assert_refused(self, pattern, plugin, direction=""):
        root = self.device(Version=3, Accounts=[]).root
        before = Device(root).entries(with_lock=True)
        run = self.run_host("--root", root, "--plugin", plugin, environment={"TEST_PLUGIN": direction})
        self.assertEqual((3, [], 1), (run.status, run.output, len(run.errors)), run.errors)
        self.assertRegex(run.errors[0], pattern)
        self.assertEqual(before, Device(root).entries(with_lock=True))

    def test_a_missing_file(self):
        self.assert_refused(r"^migration-host: cannot load the plug-in: .*nowhere\.so", self.scratch / "nowhere.so")

    def test_a_file_that_is_no_module(self):
        plugin = self.scratch / "text.so"
        plugin.write_text("This is no module.\n")
        self.assert_refused(r"^migration-host: cannot load the plug-in: .*text\.so", plugin)

    def test_a_directory(self):
        self.assert_refused(r"^migration-host: cannot load the plug-in: ", self.scratch)

    def test_a_module_without_a_migrator(self):
        plugin = PLUGINS / "no_plugin.so"
        self.assert_refused(
            rf"^migration-host: {plugin} is no migrator plug-in: it defines no class AccountsDataMigrator$", plugin
        )

    def test_a_module_whose_class_is_no_migrator(self):
        plugin = PLUGINS / "misnamed_class.so"
        self.assert_refused(
            rf"^migration-host: {plugin} is no migrator plug-in: its class AccountsDataMigrator is no migrator$", plugin
        )

    def test_a_module_that_makes_no_migrator(self):
        plugin = PLUGINS / "directed_migrator.so"
        self.assert_refused(
            rf"^migration-host: {plugin} is no migrator plug-in: it makes no migrator$", plugin, "make nothing"
        )


if __name__ == "__main__":
    unittest.main()
