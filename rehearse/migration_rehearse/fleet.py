"""The images of a result file under one release, counted: what a page or a comparison says of all of them.

Everything is counted by the database, and only what is shown is held in memory, however many images there are."""

import math
from typing import NamedTuple

from migration_rehearse.faults import CAUSES

MOST_NOTABLE = 20
BINS = 24
FIRST_STAGES = ("load", "exchange conversion", "mail conversion")
DEVICE = "path, verdict, cause, detail, stored_version, accounts, changed, lost, seconds, peak_memory, fingerprint, id"


class Device(NamedTuple):
    path: str
    verdict: str
    cause: str
    detail: str
    stored_version: int | None
    accounts: int | None
    changed: int | None
    lost: int | None
    seconds: float
    peak_memory: int
    fingerprint: bytes
    rehearsal: int


class Fleet:
    """The images of a result file that were rehearsed under a release."""

    def __init__(self, results, release):
        self.results = results
        self.release = release
        database = results.database
        database.execute("PRAGMA temp_store = FILE")
        database.execute(
            f"CREATE TEMP TABLE fleet AS SELECT {DEVICE} FROM images CROSS JOIN rehearsals USING (content)"
            " WHERE release = ?", (release.id,))
        database.execute("CREATE TEMP TABLE weights (rehearsal INTEGER PRIMARY KEY, images INTEGER, path TEXT)")
        database.execute("INSERT INTO weights SELECT id, count(*), min(path) FROM fleet GROUP BY id")

    def images(self):
        return self._number("SELECT count(*) FROM fleet")

    def verdicts(self):
        return dict(self._rows("SELECT verdict, count(*) FROM fleet GROUP BY verdict"))

    def versions(self):
        """The verdicts by stored version."""
        found = {}
        for version, verdict, count in self._rows(
                "SELECT stored_version, verdict, count(*) FROM fleet WHERE verdict != 'unrehearsed'"
                " GROUP BY stored_version, verdict ORDER BY stored_version"):
            found.setdefault(version, {})[verdict] = count
        return [{"version": version, "verdicts": verdicts} for version, verdicts in found.items()]

    def losses(self):
        query = ("SELECT code, sum(count * images) AS accounts, sum(images) AS devices"
                 " FROM losses JOIN weights USING (rehearsal) GROUP BY code ORDER BY accounts DESC, code")
        return [{"code": code, "accounts": accounts, "devices": devices} for code, accounts, devices in self._rows(query)]

    def unrehearsed(self):
        query = "SELECT cause, count(*) AS images FROM fleet WHERE cause != '' GROUP BY cause ORDER BY images DESC, cause"
        return [{"cause": cause, "images": images} for cause, images in self._rows(query)]

    def steps(self):
        """What each stage did, in the order in which a run has them."""
        query = ("SELECT stage, action, code, sum(images), sum(count * images) FROM facts"
                 " JOIN weights USING (rehearsal) JOIN kinds ON kinds.id = kind GROUP BY kind")
        return [{"stage": stage, "action": action, "code": code, "devices": devices, "accounts": accounts}
                for stage, action, code, devices, accounts in sorted(self._rows(query), key=in_order_of_a_run)]

    def distribution(self, column):
        """How many images have how much of a column: bins that grow by a constant factor, and a bin of zeros at most."""
        least, most, zeros = self.results.row(
            f"SELECT min({column}) FILTER (WHERE {column} > 0), max({column}), count(*) FILTER (WHERE {column} = 0)"
            " FROM fleet WHERE verdict != 'unrehearsed'")
        bins = [[0, 0, zeros]] if zeros and column == "accounts" else []
        if not least:
            return bins
        factor = max(math.log(most / least), 1e-9)
        counted = dict(self._rows(
            f"SELECT min(CAST(? * ln({column} / ?) / ? AS INTEGER), ?) AS bin, count(*) FROM fleet"
            f" WHERE {column} > 0 AND verdict != 'unrehearsed' GROUP BY bin", (BINS, float(least), factor, BINS - 1)))
        edge = [least * math.exp(factor * number / BINS) for number in range(BINS + 1)]
        if column != "seconds":
            edge = [round(value) for value in edge]
        return bins + [[edge[number], edge[number + 1], counted.get(number, 0)] for number in range(max(counted) + 1)]

    def slowest(self):
        return list(self._rows("SELECT path, seconds FROM fleet ORDER BY seconds DESC, path LIMIT ?", (MOST_NOTABLE,)))

    def strangest(self):
        """Those to which the rarest happened: for each kind of fact, how surprising it is that a device has it."""
        total = max(1, self._number("SELECT count(*) FROM weights"))
        self.results.database.execute("CREATE TEMP TABLE IF NOT EXISTS surprise (kind INTEGER PRIMARY KEY, bits REAL)")
        self.results.database.execute(
            "INSERT INTO surprise SELECT kind, log2(1.0 * ? / count(*)) FROM facts JOIN weights USING (rehearsal)"
            " GROUP BY kind", (total,))
        query = ("SELECT path, sum(bits) AS bits FROM facts JOIN weights USING (rehearsal) JOIN surprise USING (kind)"
                 " GROUP BY rehearsal ORDER BY bits DESC, path LIMIT ?")
        return [(path, bits) for path, bits in self._rows(query, (MOST_NOTABLE,)) if bits > 0]

    def behind_reasons(self):
        """Some devices of each reason of a loss and of each cause, with a number from 1 on among those of their reason."""
        return list(self._rows(
            "SELECT path, place FROM (SELECT path, row_number() OVER (PARTITION BY reason ORDER BY path) AS place FROM"
            " (SELECT code AS reason, path FROM losses JOIN weights USING (rehearsal)"
            " UNION ALL SELECT cause, path FROM fleet WHERE cause != '')) WHERE place <= ?", (MOST_NOTABLE,)))

    def devices(self, most, wanted):
        """At most so many: those with the wanted paths, by their ranks, the least first; then those that lose or could not be
        rehearsed, then others, by their paths."""
        database = self.results.database
        database.execute("CREATE TEMP TABLE wanted (path TEXT PRIMARY KEY, rank INTEGER)")
        database.executemany("INSERT INTO wanted VALUES (?, ?) ON CONFLICT DO UPDATE SET rank = min(rank, excluded.rank)", wanted)
        query = (f"SELECT * FROM (SELECT {DEVICE} FROM fleet LEFT JOIN wanted USING (path) ORDER BY rank IS NULL, rank,"
                 " verdict = 'kept', fingerprint, path LIMIT ?) ORDER BY path")
        return [Device(*row) for row in self._rows(query, (most,))]

    def codes(self, rehearsals):
        """The codes of the losses of each of these rehearsals."""
        found = {}
        for rehearsal in rehearsals:
            codes = [code for code, in self._rows("SELECT code FROM losses WHERE rehearsal = ? ORDER BY code", (rehearsal,))]
            if codes:
                found[rehearsal] = codes
        return found

    def document(self, fingerprint):
        """The explanation as it is kept, compressed; None where there is none."""
        row = self.results.row("SELECT document FROM explanations WHERE fingerprint = ?", (fingerprint,))
        return row and row[0]

    def _rows(self, query, values=()):
        return self.results.rows(query, values)

    def _number(self, query):
        return self.results.row(query)[0]


def in_order_of_a_run(fact):
    """Version steps are named by builds, which sort as they follow each other, between the conversions and the save."""
    stage = fact[0]
    if stage.startswith("_"):
        return (len(FIRST_STAGES), *fact[:3])
    return (FIRST_STAGES.index(stage) if stage in FIRST_STAGES else len(FIRST_STAGES) + 1, *fact[:3])


def causes_of(devices):
    return {device.cause: CAUSES.get(device.cause, "") for device in devices if device.cause}
