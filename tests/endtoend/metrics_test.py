"""--metrics FILE: the run in numbers, as a reader of OpenMetrics text has them."""

import os
import re
import stat
import time
import unittest

from device import CURRENT_VERSION, SETTINGS, TREE
from device_case import HOST, DeviceTest
from prometheus_client.openmetrics.parser import text_string_to_metric_families

CODES = re.findall(r'LossMeaning\{LossCode::\w+,\s*"([^"]+)"', (TREE / "records/loss.h").read_text(encoding="utf-8"))
ACCOUNT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "KEPT"}
DROPPED = {"Type": "Mail", "Class": "Unheard of", "Identifier": "GONE", "AccountPath": "says nothing", "DisplayName": "private"}


class Metrics(DeviceTest):
    def setUp(self):
        super().setUp()
        self.file = self.scratch / "metrics" / "accounts.prom"
        self.file.parent.mkdir()

    def migrate(self, device, *options, **how):
        run = device.migrate(HOST, "--metrics", self.file, *options, **how)
        families = text_string_to_metric_families(self.file.read_text(encoding="utf-8"))
        self.values = {(sample.name, *sample.labels.values()): sample.value for each in families for sample in each.samples}
        return run

    def assert_values(self, expected):
        self.assertEqual(expected, {key: self.values[key] for key in expected})

    def of(self, name):
        return {key[1]: value for key, value in self.values.items() if key[0] == "account_migration_" + name}

    def test_tell_of_a_run_that_kept_everything(self):
        before = time.time()
        self.migrate(self.device(Version=CURRENT_VERSION, Accounts=[ACCOUNT]))
        self.assertEqual({"kept": 1, "lost": 0, "not saved": 0}, self.of("verdict"))
        self.assert_values({("account_migration_success",): 1, ("account_migration_accounts", "kept"): 1})
        self.assertEqual({code: 0 for code in CODES}, self.of("losses"))
        seconds = self.values["account_migration_duration_seconds",]
        self.assertTrue(0 < seconds < 60)
        self.assertTrue(before < self.values["account_migration_end_time_seconds",] < time.time())

    def test_tell_of_losses_by_their_codes_and_name_no_account(self):
        self.migrate(self.device(Version=CURRENT_VERSION, Accounts=[ACCOUNT, DROPPED, {**DROPPED, "Identifier": "TOO"}, 7]))
        self.assertEqual({"kept": 0, "lost": 1, "not saved": 0}, self.of("verdict"))
        self.assertEqual({"dropped-unknown-class": 2, "dropped-no-record": 1},
                         {code: count for code, count in self.of("losses").items() if count})
        self.assert_values({("account_migration_accounts", "lost"): 3, ("account_migration_accounts", "dropped"): 3})
        self.assertNotRegex(self.file.read_text(encoding="utf-8"), "GONE|private")

    def test_tell_of_a_run_that_could_not_save(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[ACCOUNT])
        device.write("etc/group", "wheel:*:0:root\n")
        self.assertEqual(6, self.migrate(device).status)
        self.assertEqual({"kept": 0, "lost": 0, "not saved": 1}, self.of("verdict"))

    def test_tell_which_host_ran_on_which_device(self):
        device = self.device()
        self.migrate(device, "--dry-run")
        version = self.run_host("--version").output[0].split()[-1]
        self.assertEqual(1, self.values["account_migration_info", version, str(device.root), "true"])

    def test_have_types_units_and_an_end(self):
        self.migrate(self.device())
        lines = self.file.read_text(encoding="utf-8").splitlines()
        for line in ("# TYPE account_migration_verdict stateset", "# TYPE account_migration_duration_seconds gauge",
                     "# UNIT account_migration_duration_seconds seconds"):
            self.assertIn(line, lines)
        self.assertEqual("# EOF", lines[-1])

    def test_replace_the_file_in_one_step_readable_by_all(self):
        self.file.write_text("of the run before\n")
        before = self.file.stat().st_ino
        self.migrate(self.device())
        self.assertNotEqual(before, self.file.stat().st_ino)
        self.assertEqual(0o644, stat.S_IMODE(self.file.stat().st_mode))
        self.assertEqual([self.file.name], os.listdir(self.file.parent))

    def test_that_cannot_be_written_are_said_and_have_a_status(self):
        device = self.device(Version=3, Accounts=[])
        run = device.migrate(HOST, "--metrics", self.scratch / "missing" / "metrics")
        self.assertEqual(9, run.status)
        self.assertRegex(run.errors[-1], "^migration-host: the metrics could not be written: Could not restore .*: No such file")
        self.assertEqual(CURRENT_VERSION, device.read_plist(SETTINGS)["Version"])

    def test_that_cannot_be_written_do_not_hide_a_worse_status(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[DROPPED])
        run = device.migrate(HOST, "--strict", "--metrics", self.scratch / "missing" / "metrics")
        self.assertEqual(7, run.status)

    def test_are_for_a_run(self):
        run = self.run_host("--snapshots", self.scratch / "s", "--undo", "--metrics", self.file)
        self.assertEqual((2, ["migration-host: --metrics is for a run, and this is none (see --help)"]), (run.status, run.errors[:1]))

    def test_of_a_root_with_odd_characters_are_read_as_they_are(self):
        odd = self.scratch / 'a "quoted" \\ root'
        self.device().root.rename(odd)
        self.run_host("--root", odd, "--metrics", self.file)
        families = text_string_to_metric_families(self.file.read_text(encoding="utf-8"))
        self.assertEqual([str(odd)], [sample.labels["root"] for each in families for sample in each.samples if "root" in sample.labels])


if __name__ == "__main__":
    unittest.main()
