"""Images rehearsed by the program as it is installed: what stands in the results, and how it ends."""

import contextlib
import fcntl
import os
import plistlib
import pty
import re
import shutil
import signal
import subprocess
import time
import unittest
from itertools import product
from pathlib import Path

from device_case import PLUGINS
from migration_rehearse.listing import absolute
from rehearsal_case import every_detail
from rehearse_case import KEPT, REHEARSE, UNFIXABLE, RehearseTest


class Rehearsals(RehearseTest):
    def test_of_images_that_lose_nothing_end_with_0(self):
        told = self.rehearse(self.image("one"), self.image("two", version=3))
        self.assertIn("2 images under release 1.", told)
        self.assertRegex(told, r"\n +2  nothing lost\n")
        self.assertEqual({"one": ("kept", ""), "two": ("kept", "")}, self.verdicts())

    def test_of_an_image_that_loses_an_account_end_with_1(self):
        told = self.rehearse(self.image("one"), self.image("two", [KEPT, UNFIXABLE]), status=1)
        self.assertRegex(told, r"\n +1  nothing lost\n +1  accounts lost\n")
        self.assertEqual([(1,)], self.rows("SELECT sum(count) FROM losses"))

    def test_of_an_image_that_is_not_there_end_with_3_and_the_others_are_done(self):
        told = self.rehearse("/nowhere/at all", self.image("one"), status=3)
        self.assertIn("missing: there is no such directory or file", told)
        self.assertEqual({"one": ("kept", ""), "at all": ("unrehearsed", "missing")}, self.verdicts())

    def test_change_nothing_in_an_image(self):
        images = [self.image("one", [KEPT, UNFIXABLE], version=0), self.legacy_image("two")]
        before = [every_detail(image) for image in images]
        self.rehearse(*images, status=1)
        self.assertEqual(before, [every_detail(image) for image in images])

    def test_tell_counts_versions_facts_and_what_they_cost(self):
        self.rehearse(self.image("one", [KEPT, UNFIXABLE], version=11), status=1)
        ((version, accounts, dropped, seconds, processor, memory),) = self.rows(
            "SELECT stored_version, accounts, dropped, seconds, processor_seconds, peak_memory FROM rehearsals")
        self.assertEqual((11, 1, 1), (version, accounts, dropped))
        self.assertTrue(0 < processor < 60 and 0 < seconds < 60 and 1 << 20 < memory < 1 << 30, (processor, memory))
        self.assertIn(("_migrateAccountsFrom9B176:", "saved"), [row[:2] for row in self.rows(
            "SELECT CASE stage WHEN 'save' THEN '_migrateAccountsFrom9B176:' ELSE stage END, action FROM kinds")])

    def test_keep_the_explanation_without_what_differs_from_run_to_run(self):
        root = self.image("one", [{"Type": "Mail", "Class": "IMAPAccount"}], version=0)
        self.rehearse(root)
        explanation = self.document(root)["explanation"]
        self.assertNotIn(str(root), repr(explanation))
        self.assertIn("(new 1)", repr(explanation))
        self.assertIn("'/var/mobile/Library/Preferences/com.vorlix.accountsettings.plist'", repr(explanation))


class Lists(RehearseTest):
    def test_name_each_place_in_one_way(self):
        for path in map("".join, product("/.a\n", repeat=5)):
            self.assertEqual(str(Path(path).absolute()), absolute(path))
        self.assertEqual("", absolute(""))

    def test_name_images_line_by_line(self):
        images = self.fleet(3)
        listed = self.scratch / "list"
        listed.write_text("\n".join(map(str, images[1:])) + "\n")
        self.rehearse("--list", listed, images[0], status=1)
        self.assertEqual(3, len(self.verdicts()))

    def test_name_an_image_by_its_place_wherever_they_are_read(self):
        root = self.image("one")
        self.rehearse("one", "./one/", root, "one/../one", cwd=self.scratch, text="one\n")
        self.assertEqual({(str(root),), (f"{root}/../one",)}, set(self.rows("SELECT path FROM images")))

    def test_divide_images_by_the_names_that_they_have_there(self):
        self.fleet(9)
        for place in ("here", "elsewhere"):
            (self.scratch / place).mkdir()
            shutil.copytree(self.scratch, self.scratch / place, ignore=shutil.ignore_patterns("here", "elsewhere"), dirs_exist_ok=True)
            self.rehearse(*(f"device-{each}" for each in range(9)), "--shard", "1/2", cwd=self.scratch / place, status=1)
        paths = [Path(path) for path, in self.rows("SELECT path FROM images")]
        here, elsewhere = [{path.name for path in paths if path.parent.name == place} for place in ("here", "elsewhere")]
        self.assertEqual(here, elsewhere)

    def test_come_by_standard_input_with_any_name(self):
        odd = self.image("two\nlines")
        self.rehearse("--list", "-", "--null", text=f"{odd}\0{self.image('plain')}\0")
        self.assertEqual({"two\nlines", "plain"}, set(self.verdicts()))

    def test_name_what_is_no_text(self):
        root = self.image("one").rename(self.scratch / os.fsdecode(b"\xff"))
        self.rehearse("--list", "-", text=None if not root else f"{self.image('two')}\n")
        subprocess.run([REHEARSE, "--results", self.file, root], check=True, stdout=subprocess.DEVNULL)
        self.assertEqual({r"\xff", "two"}, set(self.verdicts()))

    def test_are_divided_into_shards_that_together_are_everything(self):
        images = self.fleet(9)
        parts = []
        for shard in ("1/3", "2/3", "3/3"):
            part = self.scratch / f"part{shard[0]}"
            subprocess.run([REHEARSE, "--results", part, "--shard", shard, *images], stdout=subprocess.DEVNULL)
            parts.append(set(self.verdicts(part)))
        self.assertEqual(9, sum(map(len, parts)))
        self.assertEqual({image.name for image in images}, set.union(*parts))

    def test_of_more_images_need_no_more_memory(self):
        few, many = self.peak_with(200), self.peak_with(10_000)
        self.assertLess((many - few) * 1024 / 9_800, 105)  # bytes an image: less than a list with its path would take

    def test_that_are_devices_with_explanations_need_no_more_memory(self):
        devices = self.fleet(400)
        few, many = self.peak_of(devices[:50]), self.peak_of(devices)
        self.assertLess((many - few) * 1024 / 350, 2048)  # bytes an image: half of what is kept of one in the results

    def peak_with(self, count):
        """The program's memory, in KiB, with so many images that are not there."""
        return self.peak_of(f"/nowhere/{number}" for number in range(count))

    def peak_of(self, images):
        listed = self.scratch / "many"
        listed.write_text("".join(f"{image}\n" for image in images))
        results = self.scratch / "many.sqlite"
        results.unlink(missing_ok=True)
        running = subprocess.Popen([REHEARSE, "--results", results, "--list", listed], stdout=subprocess.DEVNULL)
        _, status, usage = os.wait4(running.pid, 0)
        running.returncode = os.waitstatus_to_exitcode(status)
        return usage.ru_maxrss


class Again(RehearseTest):
    def test_does_nothing_twice(self):
        images = self.fleet(4)
        self.rehearse(*images, status=1)
        before = self.rows("SELECT id, seconds FROM rehearsals")
        self.assertIn("Nothing was left to rehearse.", self.rehearse(*images, status=1))
        self.assertEqual(before, self.rows("SELECT id, seconds FROM rehearsals"))

    def test_knows_contents_at_another_place(self):
        root = self.image("one")
        self.rehearse(root)
        shutil.copytree(root, self.scratch / "two", copy_function=shutil.copy2)
        self.assertIn("Nothing was left", self.rehearse(root, self.scratch / "two"))
        self.assertEqual(2, len(self.verdicts()))
        self.assertEqual([(1,)], self.rows("SELECT count(*) FROM rehearsals"))

    def test_does_what_changed(self):
        self.rehearse(self.image("one"))
        self.rehearse(self.image("one", [KEPT, UNFIXABLE]), status=1)
        self.assertEqual({"one": ("lost", "")}, self.verdicts())

    def test_forgets_that_an_image_was_not_there(self):
        place = self.scratch / "one"
        self.rehearse(place, status=3)
        self.rehearse(self.image("one"))
        self.assertEqual([("kept",)], self.rows("SELECT verdict FROM rehearsals"))
        shutil.copy(self.file, self.scratch / "later")
        self.command("compare", self.file, self.scratch / "later", "--gate", "all-rehearsed")

    def test_does_all_under_another_release(self):
        root = self.image("one")
        self.rehearse(root)
        resources = self.scratch / "resources"
        shutil.copytree(REHEARSE.parent.parent / os.environ["DATA_DIRECTORY"] / "account-settings", resources)
        types = resources / "AccountTypesProperties.plist"
        types.write_bytes(plistlib.dumps(plistlib.loads(types.read_bytes())))  # the same as text
        self.rehearse(root, "--resources", resources)
        self.assertEqual([(2,)], self.rows("SELECT count(*) FROM rehearsals"))
        self.assertEqual([(2,)], self.rows("SELECT count(*) FROM releases"))

    def test_goes_on_where_it_was_killed(self):
        images = self.fleet(400)
        running = subprocess.Popen([REHEARSE, "--results", self.file, "--workers", "1", *images],
                                   stdout=subprocess.DEVNULL)
        self.wait_for_some_results()
        running.kill()
        running.wait()
        done = self.rows("SELECT count(*) FROM rehearsals")[0][0]
        self.assertTrue(0 < done < 400, done)
        self.assertIn(f"Rehearsed {400 - done} now", self.rehearse(*images, status=1))
        self.assertEqual(400, len(self.verdicts()))

    def test_keeps_what_came_while_another_image_hangs(self):
        images = [self.image(kind, [{**KEPT, "Identifier": kind}]) for kind in ("hang", "fine", "well")]
        for image in images:
            (image / "etc/direction").write_text(image.name)
        running = subprocess.Popen([REHEARSE, "--results", self.file, "--plugin", PLUGINS / "directed_migrator.so",
                                    "--timeout", "300", "--workers", "2", *images], stdout=subprocess.DEVNULL)
        self.addCleanup(running.wait)
        self.addCleanup(running.kill)
        self.wait_for_some_results(2)
        self.assertEqual({"fine", "well"}, set(self.verdicts()))

    def wait_for_some_results(self, least=1):
        deadline = time.monotonic() + 60
        while time.monotonic() < deadline:
            if self.file.exists() and self.file.stat().st_size and self.count() >= least:
                return
            time.sleep(0.02)
        self.fail("no results")

    def count(self):
        try:
            return self.rows("SELECT count(*) FROM rehearsals")[0][0]
        except Exception:  # the file is being made
            return 0

    def test_leaves_no_worker_when_killed(self):
        self.kill_at_work()

    def kill_at_work(self, **more):
        """Ends with no worker left."""
        slow = self.scratch / "slow-host"
        slow.write_text('#!/bin/sh\nif [ "$1" = --version ]; then echo migration-host 9; else touch "$0-began"; sleep 60; fi\n')
        slow.chmod(0o755)
        running = subprocess.Popen([REHEARSE, "--results", self.file, "--host", slow, "--plugin", slow,
                                    self.image("one")], stdout=subprocess.DEVNULL, **more)
        self.wait_for((self.scratch / "slow-host-began").exists)
        workers = children_of(running.pid)
        running.send_signal(signal.SIGKILL)
        running.wait()
        self.wait_for(lambda: not any(is_alive(worker) for worker in workers))

    def test_removes_what_a_killed_one_left_and_nothing_else(self):
        temporary = self.scratch / "temporary"
        temporary.mkdir()
        environment = {**os.environ, "TMPDIR": str(temporary)}
        self.kill_at_work(env=environment)
        (left,) = temporary.iterdir()
        others = [temporary / name for name in ("migration-rehearse-longer_than_ours", "migration-rehearse-held_one",
                                                "another-12345678")]
        for other in others:
            other.mkdir()
        (temporary / "migration-rehearse-linkedto").symlink_to(self.image("two"))
        with holding(others[1]):
            self.rehearse(self.image("one"), env=environment)
        self.assertFalse(left.exists())
        self.assertEqual({*others, temporary / "migration-rehearse-linkedto"}, set(temporary.iterdir()))
        self.assertTrue((self.scratch / "two/etc").is_dir())

    def wait_for(self, condition):
        deadline = time.monotonic() + 30
        while not (answer := condition()):
            self.assertLess(time.monotonic(), deadline)
            time.sleep(0.02)
        return answer


@contextlib.contextmanager
def holding(directory):
    descriptor = os.open(directory, os.O_RDONLY)
    fcntl.flock(descriptor, fcntl.LOCK_EX)
    yield
    os.close(descriptor)


def children_of(process):
    return [int(each) for each in Path(f"/proc/{process}/task/{process}/children").read_text().split()]


def is_alive(process):
    try:
        return Path(f"/proc/{process}/stat").read_text().rsplit(")", 1)[1].split()[0] != "Z"
    except FileNotFoundError:
        return False


class Hosts(RehearseTest):
    def test_that_serve_and_hosts_that_are_started_for_each_image_come_to_the_same(self):
        images = [*self.fleet(20), self.legacy_image("legacy"), self.image("empty", [])]
        self.rehearse(*images, status=1)
        other = self.scratch / "other"
        self.rehearse(*images, *self.host_alone(), status=1, results=other)
        self.assertEqual(self.told(other), self.told())


class Workers(RehearseTest):
    def test_however_many_come_to_the_same(self):
        images = self.mixed_fleet(20)
        self.rehearse(*images, "--workers", 1, status=3)
        other = self.scratch / "other"
        self.rehearse(*reversed(images), "--workers", 5, status=3, results=other)
        self.assertEqual(self.told(), self.told(other))

    def test_that_are_no_root_rehearse_as_the_devices_own_user(self):
        if os.getuid() == 0:
            self.skipTest("root may be anybody")
        self.rehearse(self.image("one", mobile=(501, 501)))
        self.assertEqual({"one": ("kept", "")}, self.verdicts())


class Telling(RehearseTest):
    def test_of_progress_is_for_a_terminal(self):
        images = self.fleet(30)
        shown = self.on_terminal([REHEARSE, "--results", self.file, "--workers", "1", *self.host_alone("sleep 0.1"),
                                  *images])
        self.assertRegex(shown, r"\r\x1b\[K\d+ of 30 \(\d+ %\), \d+ a second, \d+ s left, \d+ with losses")

    def on_terminal(self, command):
        ours, theirs = pty.openpty()
        running = subprocess.Popen(command, stdout=subprocess.DEVNULL, stderr=theirs, stdin=subprocess.DEVNULL)
        os.close(theirs)
        shown = b""
        try:
            while block := os.read(ours, 4096):
                shown += block
        except OSError:  # the other end is closed
            pass
        running.wait()
        os.close(ours)
        return shown.decode()

    def test_is_one_line_for_wrong_use(self):
        for arguments, message in (([], "no images are named"), (["--shard", "3/2"], "3/2 is no shard"),
                                   (["--memory", "lots"], "lots is no size"), (["--list", "/nowhere"], "/nowhere: No such"),
                                   (["--result", "x"], "unrecognized arguments")):
            told = self.rehearse(*arguments, status=2)
            self.assertRegex(told, f"^migration-rehearse: .*{re.escape(message)}")
            self.assertEqual(1, told.count("\n"))

    def test_of_a_temporary_directory_that_cannot_be_used_ends_with_5(self):
        for wrong in ("/nowhere", "/dev/null"):
            told = self.rehearse(self.image("one"), status=5, env={**os.environ, "TMPDIR": wrong})
            self.assertIn(f"{wrong}/migration-rehearse-", told)
            told = self.rehearse("--list", "-", status=5, text="/nowhere\n", env={**os.environ, "TMPDIR": wrong})
            self.assertIn(f"{wrong}: the list cannot be kept there", told)

    def test_of_a_host_that_cannot_be_used_ends_with_5(self):
        self.assertIn("no such program", self.rehearse("--host", "/nowhere", "/", status=5))
        self.assertIn("no plug-in", self.rehearse("--host", "/bin/true", "/", status=5))


if __name__ == "__main__":
    unittest.main()
