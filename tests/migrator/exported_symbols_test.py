"""The plug-in publishes what was reviewed and nothing else."""

import os
import subprocess
import unittest

PLUGIN = os.environ["ACCOUNTS_PLUGIN"]
REVIEWED = ["migrator::_UseGoogleMail()"]


class ExportedSymbols(unittest.TestCase):
    def test_are_the_reviewed_ones(self):
        output = subprocess.run(["nm", "-DC", "--defined-only", PLUGIN], check=True, capture_output=True, text=True)
        exported = sorted(line.split(" ", 2)[2] for line in output.stdout.splitlines())
        self.assertEqual(exported, REVIEWED)

    def test_the_plugin_finds_its_libraries_in_the_directory_above(self):
        output = subprocess.run(["readelf", "-dW", PLUGIN], check=True, capture_output=True, text=True)
        paths = [line.split("[")[1].split("]")[0] for line in output.stdout.splitlines() if "(RUNPATH)" in line]
        self.assertEqual([path.rstrip(":/") for path in paths], ["$ORIGIN/.."])


if __name__ == "__main__":
    unittest.main()
