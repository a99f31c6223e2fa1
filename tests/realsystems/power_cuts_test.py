"""Power cuts on real file systems: every state that a disk may be in after one is mounted by the kernel, and looked at.

While the host runs, each write and each flush below the file system is recorded. What was flushed is on the disk; of what
followed, until the next flush, the disk may hold nothing, all, or any part: whole writes or some of their sectors.
"""

import math
import os
import plistlib
import random
import re
import shutil
import subprocess
import sys
import tempfile
import unittest
from concurrent.futures import ProcessPoolExecutor
from contextlib import contextmanager
from pathlib import Path
from typing import NamedTuple

from device import (
    CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS, TEMPORARY, Device, exactly,
    run_host)
from recording_disk import RecordingDisk, between_flushes, can_be_had

HOST = Path(os.environ["MIGRATION_HOST"])
STATES = int(os.environ.get("POWER_CUTS", "5000"))  # of all pairs, at least
PAIRS = os.environ.get("PAIRS", "")  # an expression that the pairs to try are like, as in "btrfs, .*-with-snapshots"
FLUSHES = 60  # of a run, on an average of all file systems and scenarios
PATIENCE = 600  # seconds; a hang, not a machine that is busy with something else
MEGABYTE = 1 << 20
MOBILE = (501, 501)
SETTINGS_MODE = 0o600
SENTINEL = PREFERENCES + "/.removingOldAccounts"


class FileSystem(NamedTuple):
    """`torn` is the size of the pieces into which a cut may tear a write: what the file system takes for whole."""

    name: str
    make: list
    size: int
    options: str = "defaults"
    repair: tuple = ()  # what a start does before it mounts, where the kernel alone does not recover it
    torn: int = 512


FILE_SYSTEMS = [
    FileSystem("ext4-ordered", ["mkfs.ext4", "-q", "-J", "size=1"], 8 * MEGABYTE, "data=ordered"),
    FileSystem("ext4-writeback", ["mkfs.ext4", "-q", "-J", "size=1"], 8 * MEGABYTE, "data=writeback"),
    FileSystem("ext4-without-journal", ["mkfs.ext4", "-q", "-O", "^has_journal"], 8 * MEGABYTE,
               repair=("e2fsck", "-f", "-y")),
    FileSystem("xfs", ["mkfs.xfs", "-q", "--unsupported"], 64 * MEGABYTE),
    FileSystem("btrfs", ["mkfs.btrfs", "-q", "--mixed"], 32 * MEGABYTE, torn=4096),
]


class Scenario(NamedTuple):
    """A device, and the options of the host while the power is cut."""

    name: str
    version: int
    options: tuple = ()
    restores: bool = False

    def host_options(self):
        return [*(("--snapshots", "SNAPSHOTS") if "snapshots" in self.name or self.restores else ()), *self.options]


SCENARIOS = [
    *(Scenario(f"version-{version}", version) for version in (0, 6, CURRENT_VERSION)),
    *(Scenario(f"version-{version}-with-snapshots", version) for version in (0, 6, CURRENT_VERSION)),
    Scenario("restore", 6, ("--restore", "OLDEST"), restores=True),
]


def call(*command):
    subprocess.run([str(word) for word in command], check=True, capture_output=True)


@contextmanager
def mounted(file_system, disk, place):
    call("mount", "-o", f"loop,{file_system.options}", disk, place)
    try:
        yield Device(place)
    finally:
        call("umount", place)


def fill(device, version):
    """Accounts that carry a marker each, in the settings and in both legacy files."""
    markers = iter(range(1000))

    def marked(**account):
        return {**account, "Marker": f"account {next(markers)}"}

    device.set_mobile(*MOBILE)
    device.write_plist(SETTINGS, {"Version": version, "Accounts": [
        marked(Type="LDAP", Class="LDAPAccount", Identifier=f"L{number}", Password="x" * 100) for number in range(8)]})
    device.write_plist(LEGACY_MAIL, {"DeliveryAccounts": [], "MailAccounts": [
        marked(AccountType="IMAPAccount", AccountName="Home", uniqueId=f"M{number}") for number in range(3)]})
    device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [
        marked(DAAccountConfigurationClass="ASAccount", DAAccountDescription="Work",
               DAAccountConfigurationAccountID=f"E{number}") for number in range(2)]})
    for path in (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE):
        device.path(path).chmod(SETTINGS_MODE)
    for path in [device.root / "var/mobile", *(device.root / "var/mobile").rglob("*")]:
        os.chown(path, *MOBILE)


def options_for(scenario, device, options=None):
    snapshots = device.root / ".snapshots"
    stand_for = {"SNAPSHOTS": lambda: snapshots, "OLDEST": lambda: min(path.name for path in snapshots.glob("0*"))}
    words = scenario.host_options() if options is None else options
    return [stand_for.get(word, lambda word=word: word)() for word in words]


def run(scenario, device, options=None):
    return run_host(HOST, "--root", device.root, *options_for(scenario, device, options), timeout=PATIENCE)


def prepare(scenario, device):
    fill(device, scenario.version)
    if scenario.restores:
        ended = run(scenario, device, ["--snapshots", "SNAPSHOTS"])
        assert ended.status == 0, ended


def markers_of(path):
    """How often each marked account is in a file; nothing where there is none."""
    if not path.exists():
        return {}
    counts = {}
    waiting = [plistlib.loads(path.read_bytes())]
    while waiting:
        value = waiting.pop()
        if isinstance(value, dict):
            if "Marker" in value:
                counts[value["Marker"]] = counts.get(value["Marker"], 0) + 1
            waiting.extend(value.values())
        elif isinstance(value, list):
            waiting.extend(value)
    return counts


def files_of(device):
    """What matters of the device, but for identifiers that a run makes up; the copy aside is of whatever run came last."""
    paths = (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE, SENTINEL)
    made_up = re.compile(r"[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}")
    contents = {path: repr(exactly(device.read_plist(path))) for path in paths if device.path(path).exists()}
    return {path: made_up.sub("made up", content) for path, content in contents.items()}


class Recording(NamedTuple):
    """A run under which the disk was recorded: the disk before it, its writes from flush to flush, and what it ended with."""

    image: Path
    groups: list
    after: dict
    markers: dict
    restores: bool  # then the accounts that go back into legacy files are in the snapshot meanwhile


def record(file_system, scenario, scratch, place):
    image = scratch / "image"
    image.touch()
    os.truncate(image, file_system.size)
    call(*file_system.make, image)
    with mounted(file_system, image, place) as device:
        prepare(scenario, device)
        markers = {}
        for path in (SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE):
            markers |= markers_of(device.path(path))
    recorded = scratch / "recorded"
    shutil.copy(image, recorded)
    disk = RecordingDisk(recorded, scratch / "served", scratch / "journal")
    try:
        with mounted(file_system, disk.file, place) as device:
            ended = run(scenario, device)
            assert ended.status == 0, ended
            until = disk.journal.stat().st_size
            after = files_of(device)
    finally:
        disk.close()
    os.truncate(disk.journal, until)
    return Recording(image, list(between_flushes(disk.events())), after, markers, scenario.restores)


def torn(write, size, chance):
    offset, data = write
    return [(offset + at, data[at : at + size]) for at in range(0, len(data), size) if chance.random() < 0.5]


def some(group, size, chance):
    """A random part of the writes that the disk had not been told to keep: whole or torn."""
    kept = []
    for write in group:
        fate = chance.random()
        if fate < 0.4:
            kept.append(write)
        elif fate < 0.7:
            kept.extend(torn(write, size, chance))
    return kept


def states(groups, size, parts):
    """(what is on the disk for sure, as the number of groups; the further writes that got there) for each cut."""
    for number, group in enumerate([*groups, []]):
        yield number, []
        if group:
            for part in range(parts):
                yield number, some(group, size, random.Random(f"{number} {part}"))


def write_to(disk, writes):
    with open(disk, "r+b") as file:
        for offset, data in writes:
            file.seek(offset)
            file.write(data)


class Fault(Exception):
    """What a state after a cut shows and must not."""


def expect(condition, what):
    if not condition:
        raise Fault(what)


def look_at_what_the_cut_left(device, recording):
    settings = device.path(SETTINGS)
    expect(settings.exists(), "no settings file")
    version = device.read_plist(SETTINGS).get("Version")
    owner, mode = settings.stat().st_uid, settings.stat().st_mode & 0o7777
    expect((owner, mode) == (MOBILE[0], SETTINGS_MODE), f"settings of user {owner}, mode {mode:o}, version {version}")
    found = markers_of(settings)
    expect(all(count == 1 for count in found.values()), f"doubled: {found}")
    kept = (device.root / ".snapshots").glob("0*/[1-9]") if recording.restores else ()
    for path in (device.path(LEGACY_MAIL), device.path(LEGACY_EXCHANGE), *kept):
        found |= markers_of(path)
    expect(set(found) == set(recording.markers), f"lost: {set(recording.markers) - set(found)}")


def look_at_the_next_run(scenario, device, recording):
    ended = run(scenario, device)
    expect(ended.status == 0, f"the next run ends with {ended.status}: {ended.errors}")
    settings = device.path(SETTINGS)
    expect(markers_of(settings) == {marker: 1 for marker in recording.markers} or scenario.restores,
           f"after the next run: {markers_of(settings)}")
    expect(settings.stat().st_uid == MOBILE[0], f"after the next run the settings are of user {settings.stat().st_uid}")
    left = [path.name for path in device.path(TEMPORARY).iterdir()]
    expect("snapshots" not in scenario.name or not left, f"left in the temporary directory: {left}")
    if scenario.options or "snapshots" in scenario.name:
        expect(files_of(device) == recording.after, "the next run ends otherwise than one that nothing disturbed")


def look_at(file_system, scenario, recording, disk, place):
    if file_system.repair:
        subprocess.run([*file_system.repair, disk], capture_output=True, check=False)
    with mounted(file_system, disk, place) as device:
        look_at_what_the_cut_left(device, recording)
    with mounted(file_system, disk, place) as device:
        look_at_the_next_run(scenario, device, recording)


def try_cuts(file_system, scenario, parts):
    """How many states were looked at, and the faults found in them."""
    tried, faults = 0, []
    with tempfile.TemporaryDirectory(dir=work_place()) as name:
        scratch = Path(name)
        disk, place = scratch / "disk", scratch / "mounted"
        place.mkdir()
        recording = record(file_system, scenario, scratch, place)
        for number, further in states(recording.groups, file_system.torn, parts):
            call("cp", "--sparse=always", recording.image, disk)
            write_to(disk, [write for group in recording.groups[:number] for write in group] + further)
            tried += 1
            try:
                look_at(file_system, scenario, recording, disk, place)
            except (Fault, OSError, ValueError, plistlib.InvalidFileException, subprocess.SubprocessError) as fault:
                faults.append(f"{file_system.name}, {scenario.name}, flush {number}, {len(further)} writes: {fault!r}")
    return tried, faults, len(recording.groups)


def work_place():
    return "/dev/shm" if os.access("/dev/shm", os.W_OK) else None


def cuts_of(job):
    return try_cuts(*job)


class PowerCuts(unittest.TestCase):
    def test_leave_old_or_new_settings_and_the_next_run_ends_as_it_should(self):
        reason = can_be_had()
        if reason:
            self.skipTest(reason)
        having = [each for each in FILE_SYSTEMS if shutil.which(each.make[0])]
        self.assertEqual(FILE_SYSTEMS, having)
        all_pairs = [(file_system, scenario) for file_system in having for scenario in SCENARIOS]
        pairs = [(file_system, scenario) for file_system, scenario in all_pairs
                 if re.match(PAIRS, f"{file_system.name}, {scenario.name}")]
        self.assertTrue(pairs, f"no pair is like {PAIRS}")
        tried, faults = 0, []
        parts = max(1, math.ceil(STATES / (len(all_pairs) * FLUSHES)) - 1)  # beside the cut right at each flush
        with ProcessPoolExecutor(os.cpu_count()) as workers:
            for (file_system, scenario), (states_tried, found, flushes) in zip(
                    pairs, workers.map(cuts_of, [(*pair, parts) for pair in pairs])):
                print(f"{file_system.name}, {scenario.name}: {flushes} flushes, {states_tried} states, {len(found)} faults",
                      *found, sep="\n", flush=True)
                tried += states_tried
                faults += found
        print(f"in all: {tried} states")
        self.assertEqual([], faults)
        self.assertTrue(tried >= STATES or pairs != all_pairs, tried)


if __name__ == "__main__":
    # Mounts of its own: another mount namespace that began meanwhile would keep copies of them, and so the disks in use.
    if "PRIVATE_MOUNTS" not in os.environ:
        os.environ["PRIVATE_MOUNTS"] = "yes"
        os.execvp("unshare", ["unshare", "--mount", "--propagation", "private", sys.executable, "-B", *sys.argv])
    unittest.main()
