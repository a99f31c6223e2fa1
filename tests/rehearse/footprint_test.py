"""What the program takes for the contents of an image is all that a run reads of it."""

import os
import re
import subprocess
import unittest
from random import Random

from device import LEGACY_EXCHANGE, PREFERENCES
from device_case import HOST, can_trace_calls, strace
from migration_rehearse.footprint import DIRECTORIES, FILES, identifiers_in, look_at, resolved, target_of
from rehearse_case import RehearseTest

# What a rehearsal asks for and cannot depend on: whether another run holds its lock.
LOCK = "tmp/AccountMigrationInProgress"


class Footprint(RehearseTest):
    @unittest.skipUnless(can_trace_calls(), "system calls cannot be traced here")
    def test_names_every_file_that_a_run_opens(self):
        root = self.legacy_image("device")
        calls = self.scratch / "calls"
        subprocess.run([*strace("-o", calls, "-e", "trace=openat,openat2,open"), HOST, "--root", root, "--dry-run"],
                       check=True, capture_output=True)
        opened = {path[len(str(root)) + 1 :] for path in re.findall(r'"([^"]*)"', calls.read_text())
                  if path.startswith(str(root) + "/")}
        known = {*FILES, *DIRECTORIES, LOCK}
        known |= {path.rsplit("/", number)[0] for path in known for number in range(1, path.count("/") + 1)}
        self.assertEqual(set(), opened - known)

    def test_finds_the_identifiers_that_a_search_from_left_to_right_finds(self):
        plainly = re.compile(r"[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")
        one = "01234567-89AB-4CDE-8F01-23456789ABCD"
        random = Random(1)
        for _ in range(2000):
            pieces = random.choices([one, one[:8], one[8:], one[13:], one[:24], "-4", "x", "é"], k=8)
            text = "".join(pieces)
            expected = [(match.start(), match[0]) for match in plainly.finditer(text)]
            self.assertEqual(expected, list(identifiers_in(text)), text)

    def test_changes_with_every_file_that_is_in_it(self):
        root = self.image("device")
        seen = {look_at(root).digest}
        for path in FILES:
            (root / path).parent.mkdir(parents=True, exist_ok=True)
            (root / path).write_text("something else")
            seen.add(look_at(root).digest)
        self.assertEqual(len(FILES) + 1, len(seen))

    def test_changes_with_kind_mode_and_second_name(self):
        root = self.image("device")
        place, seen = root / FILES[0], {look_at(root).digest}
        os.chmod(place, 0o600)
        seen.add(look_at(root).digest)
        os.link(place, root / "another name")
        seen.add(look_at(root).digest)
        place.unlink()
        os.mkfifo(place)
        seen.add(look_at(root).digest)
        self.assertEqual(4, len(seen))

    def test_follows_links_within_the_device_only(self):
        root = self.image("device")
        (root / "private").mkdir()
        (root / "var").rename(root / "private/var")
        before = look_at(root).digest
        (root / "var").symlink_to("/private/var")
        self.assertEqual("private/var/mobile", resolved("var/mobile", target_of(root)))
        self.assertNotEqual(before, look_at(root).digest)
        (root / "out").symlink_to("../../etc")
        (root / "round").symlink_to("round")
        self.assertEqual([None, None], [resolved(path, target_of(root)) for path in ("out/passwd", "round")])

    def test_is_the_same_wherever_else_anything_changes(self):
        root = self.image("device")
        before = look_at(root).digest
        (root / PREFERENCES / "com.vorlix.other.plist").write_text("x")
        (root / LEGACY_EXCHANGE).with_suffix(".tmp").write_text("x")
        self.assertEqual(before, look_at(root).digest)


if __name__ == "__main__":
    unittest.main()
