"""The result file: one SQLite database, filled as results come, and safe to be stopped at any time.

An image is known by its path and by its contents; a rehearsal belongs to contents and a release, so the same image under
the same release stands there once. Where several processes are to write, each has a file of its own, and `merge` makes
one of them.
"""

import os
import sqlite3
import time
from typing import NamedTuple

from migration_rehearse.faults import NO_CONTENTS

APPLICATION = 0x4D524831
SCHEMA_VERSION = 2
SCHEMA = """
CREATE TABLE releases (
  id INTEGER PRIMARY KEY,
  version TEXT NOT NULL,           -- as the host tells it
  digest TEXT NOT NULL UNIQUE,     -- of host, plug-in, libraries and resources
  host TEXT NOT NULL, plugin TEXT NOT NULL,  -- the digest of each by itself
  first_used TEXT NOT NULL);       -- UTC
CREATE TABLE images (
  path TEXT PRIMARY KEY,
  kind TEXT NOT NULL,              -- directory, archive, or nothing where there is none
  signature TEXT NOT NULL,         -- by which an archive is known without being read again
  content TEXT NOT NULL) WITHOUT ROWID;
CREATE INDEX images_by_content ON images (content);
CREATE TABLE rehearsals (
  id INTEGER PRIMARY KEY,
  content TEXT NOT NULL,
  release INTEGER NOT NULL REFERENCES releases,
  verdict TEXT NOT NULL,           -- kept, lost, not saved, failed, refused, unrehearsed
  cause TEXT NOT NULL,             -- why it is unrehearsed
  detail TEXT NOT NULL,
  status INTEGER,                  -- the host's exit status; negative: the signal that ended it
  stored_version INTEGER,
  accounts INTEGER,                -- after the run
  kept INTEGER, changed INTEGER, added INTEGER, converted INTEGER, folded INTEGER, dropped INTEGER, lost INTEGER,
  seconds REAL NOT NULL, processor_seconds REAL NOT NULL,
  peak_memory INTEGER NOT NULL,    -- bytes; 0 where it is not known
  fingerprint BLOB NOT NULL,       -- of the explanation and the console; empty where there is none
  UNIQUE (content, release));
CREATE TABLE explanations (
  fingerprint BLOB PRIMARY KEY,
  document BLOB NOT NULL) WITHOUT ROWID;  -- zlib, JSON: {"console": [...], "explanation": {...}}
CREATE TABLE kinds (
  id INTEGER PRIMARY KEY,
  stage TEXT NOT NULL, action TEXT NOT NULL, code TEXT NOT NULL,
  UNIQUE (stage, action, code));
CREATE TABLE facts (
  rehearsal INTEGER NOT NULL REFERENCES rehearsals, kind INTEGER NOT NULL REFERENCES kinds,
  count INTEGER NOT NULL,
  PRIMARY KEY (rehearsal, kind)) WITHOUT ROWID;
CREATE TABLE losses (
  rehearsal INTEGER NOT NULL REFERENCES rehearsals, code TEXT NOT NULL,
  count INTEGER NOT NULL,
  PRIMARY KEY (rehearsal, code)) WITHOUT ROWID;
"""
COUNTS = ("kept", "changed", "added", "converted", "folded", "dropped", "lost")
MEASURED = ("verdict", "cause", "detail", "status", "stored_version", "accounts", "seconds", "processor_seconds",
            "peak_memory", "fingerprint")
COLUMNS = ("content", "release", *MEASURED, *COUNTS)
LARGEST = (1 << 63) - 1
SECONDS_BETWEEN_COMMITS = 0.25


class ResultFault(Exception):
    """The result file cannot be used as it is asked."""


class Release(NamedTuple):
    id: int
    version: str
    digest: str

    def __str__(self):
        return f"{self.version} ({self.digest[:12]})"


class Results:
    """One result file, open. With `read_only` it must be there."""

    def __init__(self, path, read_only=False):
        self.path = str(path)
        self._committed = time.monotonic()
        self._kinds = {}
        try:
            self.database = self._open(read_only)
            self._check_schema(read_only)
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure

    def __enter__(self):
        return self

    def __exit__(self, kind, *_):
        """What came is kept, unless the file itself is what failed."""
        try:
            if kind is None or not issubclass(kind, ResultFault):
                self.commit()
        finally:
            self.database.close()

    def _open(self, read_only):
        if read_only and not os.path.exists(self.path):
            raise ResultFault(f"{self.path}: there is no such file")
        mode = "ro" if read_only else "rwc"
        place = os.path.abspath(self.path).replace("%", "%25").replace("?", "%3f").replace("#", "%23")
        return sqlite3.connect(f"file:{place}?mode={mode}", uri=True, isolation_level=None, timeout=30)

    def _check_schema(self, read_only):
        if self._pragma("application_id") == 0 and not self._tables() and not read_only:
            self.database.executescript(
                f"BEGIN IMMEDIATE; {SCHEMA} PRAGMA application_id = {APPLICATION};"
                f" PRAGMA user_version = {SCHEMA_VERSION}; COMMIT;")
        if self._pragma("application_id") != APPLICATION:
            raise ResultFault(f"{self.path}: this is no result file")
        if self._pragma("user_version") != SCHEMA_VERSION:
            raise ResultFault(f"{self.path}: its schema is of version {self._pragma('user_version')},"
                              f" and this program knows {SCHEMA_VERSION}")

    def _pragma(self, name):
        return self.database.execute(f"PRAGMA {name}").fetchone()[0]

    def _tables(self):
        return self.database.execute("SELECT count(*) FROM sqlite_schema").fetchone()[0]

    def change(self, statement, values=()):
        """Part of what the next commit keeps. Raises ResultFault where the disk is full or fails."""
        try:
            if not self.database.in_transaction:
                self.database.execute("BEGIN IMMEDIATE")
            return self.database.execute(statement, values)
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure

    def _change_all(self, statement, rows):
        try:
            self.database.executemany(statement, rows)
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure

    def commit(self):
        try:
            if self.database.in_transaction:
                self.database.execute("COMMIT")
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure
        self._committed = time.monotonic()

    def commit_if_due(self):
        if time.monotonic() - self._committed > SECONDS_BETWEEN_COMMITS:
            self.commit()

    def rows(self, query, values=()):
        """An iterator over what the query finds; nothing of it is gathered. Raises ResultFault."""
        try:
            yield from self.database.execute(query, values)
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure

    def row(self, query, values=()):
        return next(self.rows(query, values), None)

    def release(self, version, digest, host="", plugin=""):
        """The release with this digest, made where it is new, of a host and a plug-in with digests of their own."""
        self.change("INSERT INTO releases (version, digest, host, plugin, first_used) VALUES (?, ?, ?, ?, datetime('now'))"
                    " ON CONFLICT DO NOTHING", (version, digest, host, plugin))
        self.commit()
        return self._release("digest = ?", digest)

    def releases(self):
        return [Release(*row) for row in self.rows("SELECT id, version, digest FROM releases ORDER BY id")]

    def chosen_release(self, beginning=""):
        """The release whose digest or version begins so; without a beginning, the last that was first used."""
        fitting = [each for each in self.releases()
                   if each.digest.startswith(beginning) or each.version == beginning]
        if not fitting:
            raise ResultFault(f"{self.path}: no release {beginning} is in it" if beginning
                              else f"{self.path}: nothing was rehearsed yet")
        if beginning and len(fitting) > 1:
            raise ResultFault(f"{self.path}: {beginning} could be any of {', '.join(map(str, fitting))}")
        return fitting[-1]

    def _release(self, condition, *values):
        return Release(*self.row(f"SELECT id, version, digest FROM releases WHERE {condition}", values))

    def remembered(self, path):
        """The signature and the content of an image that was met before; else two empty texts."""
        return self.row("SELECT signature, content FROM images WHERE path = ?", (path,)) or ("", "")

    def verdict(self, content, release):
        """What came of these contents under this release: a verdict and a cause; None where nothing did yet."""
        return self.row("SELECT verdict, cause FROM rehearsals WHERE content = ? AND release = ?", (content, release.id))

    def add_image(self, identified):
        """Keeps what an image is. That it was not there is forgotten once it is."""
        path = shown(identified.path)
        self.change("DELETE FROM rehearsals WHERE content = (SELECT content FROM images WHERE path = ? AND content GLOB ?)"
                    " AND content != ?", (path, NO_CONTENTS + "*", identified.content))
        self.change("INSERT INTO images VALUES (?, ?, ?, ?) ON CONFLICT (path) DO UPDATE SET"
                    " kind = excluded.kind, signature = excluded.signature, content = excluded.content",
                    (path, identified.kind, identified.signature, identified.content))

    def add(self, content, release, rehearsed):
        """Keeps a rehearsal in place of an earlier one of the same contents under the same release."""
        self._forget(content, release)
        if rehearsed.fingerprint:
            self.change("INSERT INTO explanations VALUES (?, ?) ON CONFLICT DO NOTHING",
                        (rehearsed.fingerprint, rehearsed.document))
        values = [content, release.id, *(_storable(getattr(rehearsed, name)) for name in MEASURED)]
        values += [_storable(rehearsed.counts.get(name)) for name in COUNTS]
        marks = ", ".join("?" * len(COLUMNS))
        added = self.change(f"INSERT INTO rehearsals ({', '.join(COLUMNS)}) VALUES ({marks})", values).lastrowid
        facts = [(added, self._kind(fact), count) for fact, count in rehearsed.facts.items()]
        losses = [(added, code, count) for code, count in rehearsed.losses.items()]
        self._change_all("INSERT INTO facts VALUES (?, ?, ?)", facts)
        self._change_all("INSERT INTO losses VALUES (?, ?, ?)", losses)

    def _forget(self, content, release):
        earlier = self.row("SELECT id FROM rehearsals WHERE content = ? AND release = ?", (content, release.id))
        if earlier:
            for table, key in (("facts", "rehearsal"), ("losses", "rehearsal"), ("rehearsals", "id")):
                self.change(f"DELETE FROM {table} WHERE {key} = ?", earlier)

    def _kind(self, fact):
        if fact not in self._kinds:
            self.change("INSERT INTO kinds (stage, action, code) VALUES (?, ?, ?) ON CONFLICT DO NOTHING", fact)
            self._kinds[fact] = self.row("SELECT id FROM kinds WHERE (stage, action, code) = (?, ?, ?)", fact)[0]
        return self._kinds[fact]

    def merge(self, other):
        """Takes over what another result file has and this one has not. What both have stays as it is here; but an image that
        was there is known before one that was not, and what was rehearsed before what could not be."""
        Results(other, read_only=True).database.close()
        if os.path.samefile(self.path, other):
            raise ResultFault(f"{other}: a result file is not merged with itself")
        self.commit()
        try:
            self.database.execute("ATTACH ? AS other", (str(other),))
            self.database.executescript(f"BEGIN IMMEDIATE; {MERGE} COMMIT;")
        except sqlite3.Error as failure:
            raise ResultFault(f"{self.path}: {failure}") from failure
        self.database.execute("DETACH other")


# Every row of the other file gets a number above those of this one; releases and kinds are known by their names. What could
# not be rehearsed has neither facts nor losses.
MERGE = f"""
INSERT INTO main.releases (version, digest, host, plugin, first_used)
  SELECT version, digest, host, plugin, first_used FROM other.releases WHERE true ORDER BY id ON CONFLICT DO NOTHING;
INSERT INTO main.kinds (stage, action, code)
  SELECT stage, action, code FROM other.kinds WHERE true ON CONFLICT DO NOTHING;
INSERT INTO main.images SELECT * FROM other.images WHERE true ON CONFLICT (path) DO UPDATE
  SET kind = excluded.kind, signature = excluded.signature, content = excluded.content
  WHERE main.images.content GLOB '{NO_CONTENTS}*' AND excluded.content NOT GLOB '{NO_CONTENTS}*';
INSERT INTO main.explanations SELECT * FROM other.explanations WHERE true ON CONFLICT DO NOTHING;
CREATE TEMP TABLE taken AS
  SELECT theirs.id AS old, (SELECT coalesce(max(id), 0) FROM main.rehearsals) + theirs.id AS new, mine.id AS release
  FROM other.rehearsals theirs JOIN other.releases named ON named.id = theirs.release
  JOIN main.releases mine ON mine.digest = named.digest
  WHERE NOT EXISTS (SELECT 1 FROM main.rehearsals AS known WHERE known.content = theirs.content AND known.release = mine.id
    AND (known.verdict != 'unrehearsed' OR theirs.verdict = 'unrehearsed'));
CREATE INDEX temp.taken_by_old ON taken (old);
DELETE FROM main.rehearsals WHERE verdict = 'unrehearsed' AND EXISTS
  (SELECT 1 FROM other.rehearsals theirs JOIN taken ON taken.old = theirs.id
   WHERE theirs.content = main.rehearsals.content AND taken.release = main.rehearsals.release);
INSERT INTO main.rehearsals (id, {', '.join(COLUMNS)})
  SELECT taken.new, content, taken.release, {', '.join(COLUMNS[2:])}
  FROM taken JOIN other.rehearsals theirs ON theirs.id = taken.old;
INSERT INTO main.facts SELECT taken.new, mine.id, count
  FROM taken JOIN other.facts told ON told.rehearsal = taken.old JOIN other.kinds theirs ON theirs.id = told.kind
  JOIN main.kinds mine ON (mine.stage, mine.action, mine.code) = (theirs.stage, theirs.action, theirs.code);
INSERT INTO main.losses SELECT taken.new, code, count FROM taken JOIN other.losses ON rehearsal = taken.old;
DROP TABLE taken;
DELETE FROM main.rehearsals WHERE content GLOB '{NO_CONTENTS}*' AND content NOT IN (SELECT content FROM main.images);
"""


def shown(path):
    """A path as text, whatever its bytes are."""
    return os.fsencode(path).decode(errors="backslashreplace")


def _storable(value):
    """Versions and counts are a file's and may be above what a column holds."""
    return min(value, LARGEST) if isinstance(value, int) else value
