"""What programs left that were killed while they saved: the next run removes it, says so, and removes nothing else."""

import os
import plistlib
import resource
import time
import unittest

from device import CURRENT_VERSION, SETTINGS, TEMPORARY, run_host
from device_case import HOST, DeviceTest, can_trace_calls, strace

CONTENT = plistlib.dumps({"Version": 3, "Accounts": [{"Type": "LDAP", "Class": "L", "Identifier": "L"}]}, fmt=plistlib.FMT_BINARY)
AN_HOUR_AGO = time.time() - 3600


class Sweeping(DeviceTest):
    def setUp(self):
        super().setUp()
        self.swept = self.device(Version=CURRENT_VERSION, Accounts=[])
        self.directory = self.swept.path(TEMPORARY)
        self.directory.mkdir(mode=0o700)

    def leave(self, name, content=CONTENT, mode=0o600, when=AN_HOUR_AGO):
        path = self.directory / name
        path.write_bytes(content)
        path.chmod(mode)
        os.utime(path, (when, when))
        return path

    def names(self):
        return sorted(os.listdir(self.directory))

    def line_of(self, path):
        return f"migration-host: a program was killed while it saved accounts; what it left was removed: {path}"


class Leftovers(Sweeping):
    def test_whole_in_part_and_empty_go_with_a_line(self):
        left = [self.leave("fileAAAAAA"), self.leave("fileBBBBB1", CONTENT[:20]), self.leave("filecccccc", CONTENT[:3]), self.leave("file000000", b"")]
        run = self.swept.migrate(HOST)
        self.assertEqual((0, []), (run.status, self.names()))
        self.assertEqual(sorted(map(self.line_of, left)), sorted(line for line in run.errors if "killed" in line))

    def test_are_told_in_the_explanation(self):
        left = self.leave("fileAAAAAA")
        self.assertIn(f"  swept: {left}, which a program that was killed had left", self.swept.migrate(HOST, "--explain").output)

    def test_stay_in_a_rehearsal_which_foretells_it(self):
        left = self.leave("fileAAAAAA")
        run = self.swept.migrate(HOST, "--dry-run")
        self.assertIn(self.line_of(left), run.errors)
        self.assertEqual(["fileAAAAAA"], self.names())

    def test_go_also_with_snapshots(self):
        self.leave("fileAAAAAA")
        self.swept.migrate(HOST, "--snapshots", self.scratch / "snapshots")
        self.assertEqual([], self.names())

    @unittest.skipUnless(can_trace_calls(), "strace cannot trace here")
    def test_of_a_host_that_was_killed_as_it_saved_go_with_the_next_run(self):
        self.swept.write_plist(SETTINGS, {"Version": 3, "Accounts": []})
        killed = run_host(*strace("-o", os.devnull, "-e", "inject=renameat:signal=KILL:when=2"), HOST, "--root", self.swept.root)
        self.assertNotEqual(0, killed.status)
        [name] = [name for name in self.names() if name.startswith("file")]
        run = self.swept.migrate(HOST)
        self.assertEqual((0, []), (run.status, self.names()))
        self.assertIn(self.line_of(self.directory / name), run.errors)


class OtherFiles(Sweeping):
    def assert_stays(self, path):
        self.assertEqual([], self.swept.migrate(HOST).errors)
        self.assertTrue(os.path.lexists(path), path)

    def test_of_much_more_than_a_run_reads_stay_and_keep_no_run_from_its_end(self):
        for number in range(100):
            path = self.leave(f"file{number:06}", CONTENT)
            os.truncate(path, 256 << 20)
            os.utime(path, (AN_HOUR_AGO, AN_HOUR_AGO))
        seconds = 10
        run = self.swept.migrate(HOST, prepare=lambda: resource.setrlimit(resource.RLIMIT_CPU, (seconds, seconds)))
        self.assertEqual((0, 100), (run.status, len(self.names())), run.errors)

    def test_of_other_names_stay(self):
        for name in ("fileAAAAA", "fileAAAAAAA", "FileAAAAAA", "fileAAAA.A", "fileAAAAA\n", "file", "xfileAAAAA", "fileÄÄÄ"):
            self.assert_stays(self.leave(name))

    def test_that_are_no_property_list_stay(self):
        self.assert_stays(self.leave("fileAAAAAA", b"notes of another program"))

    def test_that_others_may_read_stay(self):
        self.assert_stays(self.leave("fileAAAAAA", mode=0o644))

    def test_that_are_newer_than_the_run_stay(self):
        self.assert_stays(self.leave("fileAAAAAA", when=time.time() + 3600))

    def test_links_stay_and_so_does_where_they_lead(self):
        target = self.leave("target")
        link = self.directory / "fileAAAAAA"
        link.symlink_to(target)
        self.assert_stays(link)
        self.assertTrue(target.exists())

    def test_directories_stay(self):
        (self.directory / "fileAAAAAA").mkdir()
        self.assert_stays(self.directory / "fileAAAAAA")

    def test_pipes_stay_and_nobody_waits_for_them(self):
        os.mkfifo(self.directory / "fileAAAAAA", 0o600)
        self.assert_stays(self.directory / "fileAAAAAA")

    @unittest.skipUnless(os.getuid() == 0, "giving files away takes root")
    def test_of_another_user_stay(self):
        path = self.leave("fileAAAAAA")
        os.chown(path, 4242, 4242)
        self.assert_stays(path)

    def test_in_a_directory_that_is_named_for_the_run_stay(self):
        elsewhere = self.scratch / "elsewhere"
        elsewhere.mkdir()
        self.leave("fileAAAAAA").rename(elsewhere / "fileAAAAAA")
        self.swept.migrate(HOST, environment={"TMPDIR": str(elsewhere)})
        self.assertEqual(["fileAAAAAA"], os.listdir(elsewhere))


if __name__ == "__main__":
    unittest.main()
