"""The result file by itself: merged, full, and not one at all."""

import hashlib
import os
import resource
import sqlite3
import subprocess
import unittest

from device_case import HOST
from migration_rehearse.results import Release, ResultFault, Results
from migration_rehearse.rehearsal import Identified, Rehearsed
from rehearse_case import REHEARSE, RehearseTest

FACTS = {("load", "loaded", ""): 1, ("save", "saved", ""): 2}


class ResultFiles(RehearseTest):
    def filled(self, name, contents, digest="d", facts=FACTS):
        path = self.scratch / name
        with Results(path) as results:
            release = results.release("1", digest)
            for content in contents:
                results.add(content, release, Rehearsed("lost", losses={"code": 3}, facts=facts, fingerprint=b"f" * 16))
        return path

    def counts(self, path):
        return [self.rows(f"SELECT count(*) FROM {table}", path)[0][0] for table in ("rehearsals", "facts", "losses")]

    def test_merged_have_what_any_had_once(self):
        first, second = self.filled("first", "abc"), self.filled("second", "bcde")
        self.command("merge", first, second)
        self.assertEqual([5, 10, 5], self.counts(first))
        self.command("merge", first, second)
        self.assertEqual([5, 10, 5], self.counts(first))

    def test_merged_keep_releases_and_facts_apart_by_their_names(self):
        first = self.filled("first", "a")
        second = self.filled("second", "a", "other", {("load", "dropped", "x"): 7, **FACTS})
        self.command("merge", self.scratch / "new", first, second)
        rows = self.rows("SELECT digest, stage, action, code, count FROM facts JOIN kinds ON kinds.id = kind JOIN"
                         " rehearsals ON rehearsals.id = rehearsal JOIN releases ON releases.id = release",
                         self.scratch / "new")
        self.assertIn(("other", "load", "dropped", "x", 7), rows)
        self.assertEqual(5, len(rows))

    def known(self, name, path, kind, content, rehearsed):
        """A result file that knows one image."""
        with Results(self.scratch / name) as results:
            results.add_image(Identified(path, kind, "", content))
            results.add(content, results.release("1", "d"), rehearsed)
        return self.scratch / name

    def test_merged_know_an_image_by_who_found_it(self):
        rehearsed = Rehearsed("lost", losses={"code": 3}, facts=FACTS)
        for order in (("missed", "found"), ("found", "missed")):
            self.known("missed", "/x", "", "none:x", Rehearsed("unrehearsed", "missing"))
            self.known("found", "/x", "directory", "x", rehearsed)
            told = self.command("merge", "-".join(order), *order, self.filled("of no image", "abc"), cwd=self.scratch)
            self.assertTrue(told.endswith(": 1 rehearsals\n"), told)
            self.assertEqual({"x": ("lost", "")}, self.verdicts(self.scratch / "-".join(order)), order)

    def test_merged_have_what_was_rehearsed_in_place_of_what_could_not_be(self):
        for order in (("good", "bad"), ("bad", "good")):
            self.known("bad", "/x", "directory", "x", Rehearsed("unrehearsed", "timeout"))
            self.known("good", "/x", "directory", "x", Rehearsed("lost", losses={"code": 3}, facts=FACTS))
            self.command("merge", "-".join(order), *order, cwd=self.scratch)
            self.assertEqual({"x": ("lost", "")}, self.verdicts(self.scratch / "-".join(order)), order)
            self.assertEqual([1, 2, 1], self.counts(self.scratch / "-".join(order)))

    def test_tell_host_and_plugin_apart(self):
        plugin = self.scratch / "other.so"
        plugin.write_bytes(self.plugin().read_bytes() + b"another build")
        self.rehearse("/nowhere", status=3)
        self.rehearse("/nowhere", "--plugin", plugin, status=3)
        (first, *one), (second, *other) = self.rows("SELECT digest, host, plugin FROM releases ORDER BY id")
        self.assertNotEqual(first, second)
        self.assertEqual([hashlib.sha256(each.read_bytes()).hexdigest() for each in (HOST, self.plugin())], one)
        self.assertEqual([one[0], hashlib.sha256(plugin.read_bytes()).hexdigest()], other)

    def test_of_shards_are_together_those_of_one_call(self):
        images = self.fleet(12)
        parts = [self.scratch / name for name in ("a", "b", "c")]
        for number, part in enumerate(parts, 1):
            subprocess.run([REHEARSE, "--results", part, "--shard", f"{number}/3", *images], stdout=subprocess.DEVNULL)
        self.command("merge", *parts)
        self.rehearse(*images, status=1)
        self.assertEqual(self.told(), self.told(parts[0]))

    def test_are_not_merged_with_what_is_none(self):
        (self.scratch / "none").write_text("no database at all, but long enough to be looked at" * 20)
        target = self.filled("target", "a")
        for other in ("none", "missing", "target"):
            self.command("merge", target, self.scratch / other, status=4)
        self.assertEqual([1, 2, 1], self.counts(target))

    def test_of_another_program_or_schema_are_left_alone(self):
        foreign = sqlite3.connect(self.scratch / "foreign")
        foreign.execute("CREATE TABLE mine (x)")
        foreign.close()
        for name, version in (("newer", 99), ("older", 1)):
            opened = sqlite3.connect(self.filled(name, "a"))
            opened.execute(f"PRAGMA user_version = {version}")
            opened.close()
        for name in ("foreign", "newer", "older"):
            with self.assertRaises(ResultFault):
                Results(self.scratch / name)

    def test_that_are_full_end_the_work_with_what_came_before(self):
        with self.assertRaisesRegex(ResultFault, "full"):
            with Results(self.file) as results:
                release = results.release("1", "d")
                results.database.execute("PRAGMA max_page_count = 60")
                for number in range(10_000):
                    results.add(str(number), release, Rehearsed("kept", facts=FACTS))
                    results.commit()
        kept = self.counts(self.file)[0]
        self.assertTrue(10 < kept < 10_000)
        with Results(self.file) as results:
            results.add("more", Release(1, "1", "d"), Rehearsed("kept"))
        self.assertEqual(kept + 1, self.counts(self.file)[0])

    def test_that_cannot_grow_end_the_program_with_4_and_it_goes_on_later(self):
        images = self.fleet(30)
        limit = 64 << 10  # bytes, and a fleet's results are more
        told = self.rehearse(*images, status=4, preexec_fn=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit)))
        self.assertRegex(told, "results.sqlite: ")
        self.rehearse(*images, status=1)
        self.assertEqual(30, len(self.verdicts()))

    def test_in_a_directory_that_is_not_there_end_with_4(self):
        self.assertIn("unable to open", self.rehearse("/", status=4, results=self.scratch / "no/where"))

    def test_have_any_name(self):
        odd = self.scratch / "a%20b?c#d é"
        self.rehearse(self.image("one"), results=odd)
        self.assertTrue(os.path.getsize(odd))


if __name__ == "__main__":
    unittest.main()
