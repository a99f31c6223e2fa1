"""The one line that says on a terminal how far a run, a rehearsal, a restore or a recovery is."""

import os
import re
import unittest

from accountctl_case import ACCOUNTCTL, DIRECTORY, HOME_MAIL, AccountctlTest
from device import SETTINGS
from device_case import HOST, PLUGINS, can_trace_calls, strace
from snapshots_case import SnapshotsTest
from terminal import LANGUAGES, on_terminal

WIPE = "\r\x1b[K"


class OfARun(SnapshotsTest):
    def shown(self, direction, *options, columns=80, language="C"):
        command = [HOST, "--root", self.device().root, "--plugin", PLUGINS / "directed_migrator.so", *options]
        environment = {"TEST_PLUGIN": direction, "LC_ALL": language}
        status, shown = on_terminal(*command, columns=columns, environment=environment)
        self.assertEqual(0, status)
        return shown

    def test_is_shown_on_one_line_of_a_terminal_and_taken_away(self):
        _, *lines = self.shown("work slowly").split(WIPE)
        self.assertEqual(1, lines.count("done\n"))
        self.assertIn(lines[-1], ("done\n", ""))  # the end of the process may take its time, too
        for line in lines:
            self.assertRegex(line, r"^(\d+ %, \d+ s left: slow(, 256 of 1000 accounts)?|done\n)?$")

    def test_goes_on_while_nothing_is_told(self):
        shares = [int(share) for share in re.findall(r"(\d+) %", self.shown("work slowly"))]
        self.assertGreater(len(shares), 2)
        self.assertEqual(sorted(shares), shares)

    def test_fits_the_terminal_in_every_language(self):
        for columns in (20, 80, 200):
            for language in LANGUAGES:
                with self.subTest(columns=columns, language=language):
                    lines = self.shown("work slowly", columns=columns, language=language).split(WIPE)
                    self.assertLess(max(map(len, lines)), columns)
                    self.assertIn("slow", "".join(lines))

    def test_is_shown_of_a_rehearsal_too(self):
        self.assertRegex(self.shown("work slowly", "--dry-run"), r"\d+ %, \d+ s left: slow")

    def test_is_not_shown_where_the_run_is_short(self):
        self.assertEqual("", self.shown("succeed"))

    def test_is_shown_nowhere_else(self):
        self.assertEqual(["done"], self.run_directed("work slowly", "--explain").errors)


@unittest.skipIf(os.environ["SANITIZE"], "a sanitizer looks for leaks in no traced program")
@unittest.skipUnless(can_trace_calls(), "no strace here, or it may trace nothing")
class OfARestore(SnapshotsTest):
    host = HOST

    def test_is_shown_where_it_takes_its_time(self):
        device = self.old_device()
        self.assertEqual(0, self.migrate(device).status)
        slow = strace("-o", "/dev/null", "-e", "inject=fsync:delay_enter=300000")
        status, shown = on_terminal(
            *slow, HOST, "--root", device.root, "--snapshots", self.snapshots, "--restore", "latest")
        self.assertEqual(0, status)
        self.assertRegex(shown, r"\d+ %, \d+ s left: the (present state is kept|files are brought back)")
        self.assertRegex(shown, r"\x1b\[Krestored snapshot \S+; the state before it is snapshot \S+\n$")


@unittest.skipIf(os.environ["SANITIZE"], "a sanitizer looks for leaks in no traced program")
@unittest.skipUnless(can_trace_calls(), "no strace here, or it may trace nothing")
class OfARecovery(AccountctlTest):
    def test_is_shown_where_it_takes_its_time(self):
        self.put(HOME_MAIL, DIRECTORY)
        copy = self.scratch / "copy.plist"
        copy.write_bytes(self.tree.read(SETTINGS))
        self.put(DIRECTORY)
        slow = strace("-o", "/dev/null", "-e", "inject=fsync:delay_enter=700000")
        status, shown = on_terminal(*slow, ACCOUNTCTL, "--root", self.tree.root, "recover", copy)
        self.assertEqual(0, status)
        self.assertRegex(shown, r"\d+ %, \d+ s left: the accounts are saved")
        self.assertEqual(["L1", "M1"], sorted(account["Identifier"] for account in self.accounts()))


if __name__ == "__main__":
    unittest.main()
