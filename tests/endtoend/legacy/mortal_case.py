"""What the tests of interrupted runs share: the real host with a plug-in that dies before a chosen change."""

import os
import signal
import subprocess
from pathlib import Path

from device import LEGACY_EXCHANGE, LEGACY_MAIL, plain_environment
from legacy_case import HOST, LegacyCase, delivery, exchange, exchange_file, incoming, mail_file

MORTAL = Path(os.environ["TEST_PLUGINS"]) / "mortal_migrator.so"
PLUGIN = Path(os.environ["BUILD_TREE"]) / os.environ["LIBRARY_DIRECTORY"] / "account-settings" / "accounts-migrator.so"


class MortalCase(LegacyCase):
    def legacy_device(self, **more):
        device = self.device(
            mail=mail_file([incoming("M1"), incoming("G1", "GmailAccount")], [delivery("D1")]),
            exchange_=exchange_file(exchange("E1")),
            **more,
        )
        for path in (LEGACY_MAIL, LEGACY_EXCHANGE):
            device.write(path + ".original", "old")
        return device

    def run_until(self, device, change, *options):
        """Runs the migrator until right before the change of that number; answers the changes that were made."""
        run = device.migrate(HOST, "--plugin", MORTAL, *options, environment=self.mortality(change))
        made = [line.split(" ", 1) for line in self.changes.read_text().splitlines()]
        return run, [(verb, os.path.relpath(path, device.root)) for verb, path in made]

    def mortality(self, change, death=signal.SIGKILL):
        self.changes = self.scratch / "changes"
        return {
            "REAL_PLUGIN": str(PLUGIN),
            "DIE_BEFORE": str(change),
            "DIE_OF": str(int(death)),
            "CHANGES": str(self.changes),
        }

    def start(self, device, *options, environment=()):
        process = subprocess.Popen(
            [HOST, "--root", device.root, *options],
            env={**plain_environment(), **dict(environment)},
            stdin=subprocess.DEVNULL,
            stderr=subprocess.DEVNULL,
        )
        self.addCleanup(process.wait)
        self.addCleanup(process.kill)
        return process
