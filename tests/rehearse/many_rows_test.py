"""Result files of very many devices: what is made of them takes a minute of a core at most, and no more memory than for a few.
SIMULATED_DEVICES says how many."""

import json
import multiprocessing
import os
import subprocess
import tempfile
import unittest
import zlib
from pathlib import Path

from migration_rehearse.results import Results
from rehearse_case import REHEARSE, RehearseTest

DEVICES = int(os.environ.get("SIMULATED_DEVICES", 20_000))
DIFFERENT = 40  # of so many devices, one ends differently under the later release, and
LOSING = 10  # of so many, one loses accounts under both
MOST_SECONDS = 60
MOST_MEMORY = 256 << 20

# Devices that differ in everything; numbers are scattered as digests are.
SIMULATED = f"""
BEGIN;
CREATE TEMP TABLE devices AS WITH RECURSIVE counted (n) AS (SELECT 1 UNION ALL SELECT n + 1 FROM counted WHERE n < {DEVICES})
  SELECT n, printf('directory:%064x', n * 2654435761 % 4294967296) AS content, CAST(printf('%016d', n) AS BLOB) AS mark,
    n % {LOSING} = 0 AS is_losing, n % {DIFFERENT} = 1 AS is_different FROM counted;
INSERT INTO releases (version, digest, host, plugin, first_used) VALUES ('1', 'd', '', '', ''), ('2', 'e', '', '', '');
INSERT INTO images SELECT printf('/fleet/device-%07d', n), 'directory', '', content FROM devices;
INSERT INTO rehearsals (id, content, release, verdict, cause, detail, status, stored_version, accounts, kept, lost, seconds,
    processor_seconds, peak_memory, fingerprint)
  SELECT n + {DEVICES} * (release - 1), content, release, iif(is_losing OR is_new, 'lost', 'kept'), '', '', 0, n % 9, n % 40,
    n % 40, is_losing + is_new, 0.01 * (1 + n % 97), 0.01 * (1 + n % 89), (8 << 20) + n % 1000000,
    iif(is_new, CAST(printf('%016d', {DEVICES} + n) AS BLOB), mark)
  FROM (SELECT *, release = 2 AND is_different AS is_new FROM (SELECT 1 AS release UNION SELECT 2) CROSS JOIN devices);
INSERT INTO explanations SELECT fingerprint, document(id) FROM rehearsals
  WHERE id <= {DEVICES} OR (id - {DEVICES}) % {DIFFERENT} = 1;
INSERT INTO kinds (stage, action, code) SELECT 'load', 'changed', 'kind-' || n FROM devices WHERE n <= 40;
INSERT INTO facts SELECT rehearsals.id, kinds.id, 1 + rehearsals.id % 3 FROM rehearsals CROSS JOIN kinds
  WHERE (rehearsals.id * 7919 + kinds.id * 31) % 8 = 0;
INSERT INTO losses SELECT id, 'code-' || (id % {DEVICES}) % 31, lost FROM rehearsals WHERE lost > 0;
COMMIT;
"""


def document(number):
    """An explanation as it is kept."""
    changes = [{"key": f"Key {each}", "to": number * each} for each in range(5)]
    facts = [{"fact": "changed", "account": {"type": "Mail", "name": f"Account {number}"}, "changes": changes}]
    explanation = {"stages": [{"stage": "load", "facts": facts}], "result": {"success": True, "verdict": "kept"}}
    return zlib.compress(json.dumps({"console": [], "explanation": explanation}).encode(), 1)


def simulate(path):
    """In a process of its own, whose memory would else be counted as that of the programs that are measured."""
    with Results(path) as results:
        results.database.create_function("document", 1, document)
        results.database.executescript(f"PRAGMA synchronous = OFF; PRAGMA cache_size = -400000; {SIMULATED}")


class ManyRows(RehearseTest):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        place = tempfile.TemporaryDirectory()
        cls.addClassCleanup(place.cleanup)
        cls.place = Path(place.name)
        simulating = multiprocessing.Process(target=simulate, args=(cls.place / "results.sqlite",))
        simulating.start()
        simulating.join()
        assert simulating.exitcode == 0

    def assert_bounded(self, status, *arguments):
        """Runs a command, which must end with this status, in a minute of a core and little memory; answers what it printed."""
        with tempfile.TemporaryFile() as told:
            running = subprocess.Popen([REHEARSE, *map(str, arguments)], stdout=told, stderr=subprocess.STDOUT,
                                       env={**os.environ, "TMPDIR": str(self.place)})
            _, running.returncode, usage = os.wait4(running.pid, 0)
            told.seek(0)
            printed = told.read().decode()
        seconds, memory = usage.ru_utime + usage.ru_stime, usage.ru_maxrss << 10
        print(f"{arguments[0]} of {DEVICES:,} devices: {seconds:.1f} s of a core, {memory >> 20} MiB")
        self.assertEqual(status, os.waitstatus_to_exitcode(running.returncode), printed)
        self.assertLess(seconds, MOST_SECONDS)
        self.assertLess(memory, MOST_MEMORY)
        return printed

    def test_are_reported(self):
        page = self.place / "report.html"
        self.assert_bounded(0, "report", self.place / "results.sqlite", "--output", page)
        losing = DEVICES // LOSING + -(-(DEVICES - 1) // DIFFERENT)
        self.assertIn(f'"images":{DEVICES},"verdicts":{{"kept":{DEVICES - losing},"lost":{losing}}}', page.read_text())

    def test_are_compared(self):
        results, listed = self.place / "results.sqlite", self.place / "listed"
        told = self.assert_bounded(1, "compare", results, results, "--earlier", "d", "--output", listed, "--gate",
                                   "none-lost,none-newly-lost,none-different,all-rehearsed,none-slower=1.5")
        different = -(-(DEVICES - 1) // DIFFERENT)
        self.assertRegex(told, rf"\n +{different:,}  kept → lost;")
        for rule, devices in (("lost", different + DEVICES // LOSING), ("newly-lost", different), ("different", different)):
            self.assertIn(f"gate: {devices:,} devices break none-{rule}, ", told)
        with open(listed, encoding="utf-8") as lines:
            self.assertEqual(4 * different + DEVICES // LOSING, sum(1 for _ in lines))


if __name__ == "__main__":
    unittest.main()
