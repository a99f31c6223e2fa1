"""Archives of devices: in whatever form they come, the same as the directory; whatever is wrong with one is its own row."""

import io
import os
import signal
import subprocess
import tarfile
import unittest
import zipfile
from pathlib import Path

from device import PREFERENCES, SETTINGS, Device
from rehearse_case import KEPT, REHEARSE, UNFIXABLE, RehearseTest

from migration_rehearse import rehearsal, unpacker

PASSWD, GROUP = "etc/passwd", "etc/group"


def member(name, content=b"", kind=tarfile.REGTYPE, link=""):
    entry = tarfile.TarInfo(name)
    entry.type, entry.linkname, entry.size, entry.mode = kind, link, len(content), 0o755
    return entry, content


class ArchiveTest(RehearseTest):
    def archive(self, *members, name="archive.tar.gz"):
        with tarfile.open(self.scratch / name, "w:gz") as archive:
            for entry, content in members:
                archive.addfile(entry, io.BytesIO(content))
        return self.scratch / name

    def files_of(self, root):
        return [member(str(path.relative_to(root)), path.read_bytes()) for path in sorted(root.rglob("*"))
                if path.is_file()]

    def cause(self, *members, **bounds):
        return self.rehearsed(self.archive(*members), **bounds).cause


class Forms(ArchiveTest):
    def setUp(self):
        super().setUp()
        self.root = self.image("device", [KEPT, UNFIXABLE], version=2)
        self.expected = self.rehearsed(self.root)

    def assert_same(self, archive):
        found = self.rehearsed(archive)
        self.assertEqual(("lost", self.expected.document), (found.verdict, found.document), found)

    def test_of_compression_do_not_matter(self):
        for compression in ("", "gz", "bz2", "xz"):
            archive = self.scratch / f"archive.tar.{compression}".rstrip(".")
            with tarfile.open(archive, f"w:{compression}") as written:
                written.add(self.root, ".")
            self.assert_same(archive)

    def test_include_zip(self):
        with zipfile.ZipFile(self.scratch / "archive.zip", "w", zipfile.ZIP_DEFLATED) as archive:
            for path in sorted(self.root.rglob("*")):
                archive.write(path, path.relative_to(self.root))
        self.assert_same(self.scratch / "archive.zip")

    def test_may_have_the_device_below_a_directory_and_other_files_beside_it(self):
        (self.scratch / "notes").write_text("of whoever sent it")
        archive = self.scratch / "archive.tar"
        subprocess.run(["tar", "-cf", archive, "-C", self.scratch, "notes", "device"], check=True)
        self.assert_same(archive)

    def test_may_be_a_whole_image_of_which_a_copy_lies_deeper(self):
        copy = [member("srv/backup/" + entry.name, content) for entry, content in self.files_of(self.root)]
        found = self.rehearsed(self.archive(*copy[:-1], *self.files_of(self.root)))
        self.assertEqual(("lost", {"dropped": 1}), (found.verdict, {"dropped": sum(found.losses.values())}))

    def test_may_hold_only_what_a_run_reads(self):
        files = [(entry, content) for entry, content in self.files_of(self.root) if entry.name in (SETTINGS, PASSWD, GROUP)]
        self.assertEqual("lost", self.rehearsed(self.archive(*files)).verdict)

    def test_have_links_that_are_followed_as_on_the_device(self):
        for target in ("private/var", "/private/var", "./elsewhere/../private/var"):
            moved = [member("private/" + entry.name if entry.name.startswith("var/") else entry.name, content)
                     for entry, content in self.files_of(self.root)]
            found = self.rehearsed(self.archive(*moved, member("var", kind=tarfile.SYMTYPE, link=target)))
            self.assertEqual("lost", found.verdict, found)


class OneAfterAnother(ArchiveTest):
    """They are unpacked in one place."""

    def test_are_told_of_as_if_each_were_the_first(self):
        full, bare = self.legacy_image("full"), self.image("bare")
        (bare / PREFERENCES / "more").mkdir()
        odd = member("etc/vorlix/device-info.plist", kind=tarfile.DIRTYPE)
        archives = [self.archive(*self.files_of(full), name="1.tar.gz"), self.archive(*self.files_of(bare), name="2.tar.gz"),
                    self.archive(*self.files_of(bare), odd, name="3.tar.gz")]
        alone = [self.rehearsed_at_first(archive) for archive in archives]
        for number in (0, 1, 2, 0, 2, 1, 0):
            self.assertEqual(alone[number], self.rehearsed(archives[number]).document)

    def rehearsed_at_first(self, archive):
        rehearsal.scratch()
        vars(rehearsal._kept).pop("scratch").cleanup()
        return self.rehearsed(archive).document

    def test_leave_nothing_but_directories(self):
        scratch = self.scratch / "scratch"
        scratch.mkdir()
        unpacker.unpack(str(self.archive(*self.files_of(self.legacy_image("full")))), scratch)
        root = Path(unpacker.unpack(str(self.archive(*self.files_of(self.image("bare")))), scratch))
        self.assertEqual(["etc/group", "etc/passwd", SETTINGS],
                         sorted(str(path.relative_to(root)) for path in root.rglob("*") if path.is_file()))
        self.assertFalse((root / "var/mobile/Library/Mail").exists())
        self.assertEqual([], list((scratch / "staging").iterdir()))


class TheProcessThatUnpacks(ArchiveTest):
    def setUp(self):
        super().setUp()
        self.whole = self.archive(*self.files_of(self.image("device")), name="whole.tar.gz")
        self.expected = self.rehearsed(self.whole).document

    def process(self):
        """Of the last archive; the next is as it would be without it."""
        number = unpacker._kept.unpacker and unpacker._kept.unpacker._process
        self.assertEqual(self.expected, self.rehearsed(self.whole).document)
        return number

    def test_stays_for_the_next_archive(self):
        self.assertEqual(self.process(), self.process())

    def test_goes_with_an_archive_that_is_damaged(self):
        self.assertEqual("damaged-archive", self.rehearsed(self.damaged("none")).cause)
        self.assertIsNone(self.process())

    def test_is_ended_where_it_takes_too_long(self):
        os.kill(self.process(), signal.SIGSTOP)
        self.assertEqual("timeout", self.rehearsed(self.whole, seconds=0.5).cause)
        self.assertIsNone(self.process())

    def test_is_replaced_where_somebody_kills_it(self):
        killed = self.process()
        os.kill(killed, signal.SIGKILL)
        os.waitid(os.P_PID, killed, os.WEXITED | os.WNOWAIT)
        self.assertEqual(self.expected, self.rehearsed(self.whole).document)
        self.assertNotEqual(killed, self.process())

    def test_tells_of_long_names_in_short(self):
        found = self.rehearsed(self.archive(member("../" + "x" * 9000)))
        self.assertEqual("path-out", found.cause)
        self.assertLess(len(found.detail), 1000)


class Faults(ArchiveTest):
    def setUp(self):
        super().setUp()
        self.files = self.files_of(self.image("device"))

    def test_of_an_archive_that_is_cut_off_or_none(self):
        whole = self.archive(*self.files).read_bytes()
        (self.scratch / "cut").write_bytes(whole[: len(whole) // 2])
        self.damaged("none")
        (self.scratch / "empty").write_bytes(b"")
        for name in ("cut", "none", "empty"):
            self.assertEqual("damaged-archive", self.rehearsed(self.scratch / name).cause, name)

    def test_of_a_damaged_archive_tell_nothing_of_the_moment(self):
        self.assertEqual("Unrecognized archive format", self.rehearsed(self.damaged("none")).detail)

    def test_of_an_archive_with_its_bytes_changed_is_an_answer(self):
        whole = bytearray(self.archive(*self.files).read_bytes())
        for place in range(20, len(whole), 40):
            spoilt = bytearray(whole)
            spoilt[place] ^= 0xFF
            (self.scratch / "spoilt").write_bytes(spoilt)
            found = self.rehearsed(self.scratch / "spoilt")
            self.assertIn(found.verdict, ("kept", "lost", "not saved", "unrehearsed"))

    def test_of_a_bomb(self):
        bomb = member(SETTINGS, bytes(80 << 20))
        self.assertEqual("bomb", self.cause(*self.files, bomb, ratio=10))
        self.assertEqual("too-large", self.cause(*self.files, bomb, size=1 << 20))
        self.assertEqual("bomb", self.cause(*self.files, member("elsewhere/zeros", bytes(80 << 20)), ratio=10))

    def test_of_too_many_entries(self):
        many = [member(f"other/{number}") for number in range(30)]
        self.assertEqual("too-many-entries", self.cause(*self.files, *many, entries=20))

    def test_of_a_path_that_leads_out(self):
        for name in ("../../etc/passwd", "var/../../x", "/../x"):
            self.assertEqual("path-out", self.cause(*self.files, member(name, b"x")), name)

    def test_of_a_link_that_leads_out(self):
        for target in ("../../../../../../../../etc/passwd", "com.vorlix.accountsettings.plist"):
            entries = [each for each in self.files if each[0].name != SETTINGS]
            self.assertEqual("link-out", self.cause(*entries, member(SETTINGS, kind=tarfile.SYMTYPE, link=target)))

    def test_of_an_absolute_link_is_none_since_it_begins_at_the_devices_root(self):
        outside = self.scratch / "outside"
        outside.write_bytes(b"never read")
        entries = [each for each in self.files if each[0].name != SETTINGS]
        entries.append(member(PREFERENCES, kind=tarfile.DIRTYPE))
        found = self.rehearsed(self.archive(*entries, member(SETTINGS, kind=tarfile.SYMTYPE, link=str(outside))))
        self.assertEqual(("kept", 0), (found.verdict, found.accounts))

    def test_of_second_names_and_special_files_where_a_run_reads(self):
        entries = [each for each in self.files if each[0].name != SETTINGS]
        hard = member(SETTINGS, kind=tarfile.LNKTYPE, link="etc/passwd")
        self.assertEqual("hard-link", self.cause(*entries, hard))
        for kind in (tarfile.FIFOTYPE, tarfile.CHRTYPE, tarfile.BLKTYPE):
            self.assertEqual("special-file", self.cause(*entries, member(SETTINGS, kind=kind)))
        self.assertEqual("", self.cause(*self.files, member("dev/null", kind=tarfile.CHRTYPE)))

    def test_of_an_archive_without_a_device_or_with_two(self):
        self.assertEqual("no-device", self.cause(member("a", b"b")))
        copies = [member(f"{name}/{entry.name}", content + name.encode() * (entry.name == PASSWD))
                  for name in ("one", "two") for entry, content in self.files]
        self.assertEqual("several-devices", self.cause(*copies))

    def test_leave_nothing_behind_and_do_not_stop_the_others(self):
        temporary = self.scratch / "temporary"
        temporary.mkdir()
        (self.scratch / "damaged").write_bytes(b"x")
        bad = self.archive(*self.files, member("../x", b"x"), name="bad")
        good = self.archive(*self.files, name="good")
        self.rehearse(self.scratch / "damaged", bad, good, self.scratch / "device", status=3,
                      env={"TMPDIR": str(temporary), "PATH": "/usr/bin:/bin"})
        self.assertEqual([], list(temporary.iterdir()))
        self.assertEqual({"damaged": ("unrehearsed", "damaged-archive"), "bad": ("unrehearsed", "path-out"),
                          "good": ("kept", ""), "device": ("kept", "")}, self.verdicts())

    def test_of_a_full_temporary_directory_are_rows_and_nothing_is_unpacked_elsewhere(self):
        archive, volume, here = self.archive(*self.files), self.scratch / "small", self.scratch / "here"
        volume.mkdir()
        here.mkdir()
        flags = ["--mount"] if os.getuid() == 0 else ["--mount", "--user", "--map-root-user"]
        filled = ["unshare", *flags, "sh", "-c", 'mount -t tmpfs -o size=64k small "$0" &&'
                  ' { head -c 64k /dev/zero > "$0/full"; TMPDIR="$0" exec "$@"; }', volume]
        if subprocess.run([*filled, "true"], check=False).returncode != 0:
            self.skipTest("mounting a small volume is not allowed here")
        ended = subprocess.run([*filled, REHEARSE, "--results", self.file, archive, self.scratch / "device"], cwd=here,
                               stdout=subprocess.DEVNULL, check=False)
        self.assertEqual(3, ended.returncode)
        self.assertEqual({"archive.tar.gz": ("unrehearsed", "unpacking-failed"), "device": ("kept", "")}, self.verdicts())
        self.assertEqual([], list(here.iterdir()))

    def test_of_a_directory(self):
        empty = Device(self.scratch / "x").root.parent / "empty"
        empty.mkdir()
        self.assertEqual("no-device", self.rehearsed(empty).cause)
        self.assertEqual("not-an-image", self.rehearsed("/dev/null").cause)


if __name__ == "__main__":
    unittest.main()
