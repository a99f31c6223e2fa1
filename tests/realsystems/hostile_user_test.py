"""A hostile user beside root's host: while it runs, restores and lists, he exchanges what stands at every path of a run.

Whatever he gets the host to see: nothing outside the device changes, nothing gets special mode bits, no file of root's has
his bytes, nothing secret becomes his to read, and what the host leaves is whole.
"""

import os
import plistlib
import random
import shutil
import stat
import subprocess
import tempfile
import time
import unittest
from collections import Counter
from concurrent.futures import ProcessPoolExecutor
from pathlib import Path
from typing import NamedTuple

from device import (
    CURRENT_VERSION, HOME, LEGACY_EXCHANGE, LEGACY_MAIL, LOCK, PREFERENCES, SETTINGS, SETTINGS_COPY, TEMPORARY, Device,
    run_host)

HOST, ACCOUNTCTL = Path(os.environ["MIGRATION_HOST"]), Path(os.environ["ACCOUNTCTL"])
RACER = Path(os.environ["RACER"])
RACES = int(os.environ.get("RACES", "50"))
MOBILE, STRANGER = 4711, 4712
LONG = 20  # seconds, on a machine that does other work, too
SECRET = b"the-secret-of-somebody-else"
HIS_BYTES = "the bytes of the user"
SPECIAL = stat.S_ISUID | stat.S_ISGID | stat.S_ISVTX
HOST_STATUSES = (0, 1, 2, 5, 6, 8)
ACCOUNTCTL_STATUSES = (0, 1, 2, 3, 4)

MAIL_DIRECTORY = HOME + "/Library/Mail"
PLACES_OF_MOBILE = [
    SETTINGS, PREFERENCES, HOME + "/Library", SETTINGS_COPY, HOME + "/Library/Logs", HOME + "/Library/Logs/CrashReporter",
    LEGACY_MAIL, LEGACY_MAIL + ".original", LEGACY_EXCHANGE, LEGACY_EXCHANGE + ".original", MAIL_DIRECTORY,
    MAIL_DIRECTORY + "/AutoFetchEnabled", PREFERENCES + "/.removingOldAccounts", TEMPORARY, LOCK[1],
]
PLACES_OF_A_STRANGER = [LOCK[1], "tmp/AccountSettingsChange"]


class Race(NamedTuple):
    """What root does, and who is beside it."""

    name: str
    user: int
    with_snapshots: bool = False
    begins_migrated: bool = False
    calls: tuple = ((),)


KINDS = [
    Race("run", MOBILE),
    Race("run with snapshots", MOBILE, with_snapshots=True),
    Race("restore", MOBILE, with_snapshots=True, begins_migrated=True, calls=(("--restore", "latest"),)),
    Race("lists", MOBILE, with_snapshots=True, begins_migrated=True, calls=(("--list-snapshots",), ("accountctl", "list"))),
    Race("run beside a stranger", STRANGER),
    Race("run with snapshots beside a stranger", STRANGER, with_snapshots=True),
]


def marked(group, count, **keys):
    return [{**keys, "Marker": f"{group} {number}", "Whole": HIS_BYTES} for number in range(count)]


def settings(group, version):
    accounts = marked(group, 8, Type="LDAP", Class="LDAPAccount")
    return {"Version": version, "Accounts": [{**each, "Identifier": each["Marker"]} for each in accounts]}


def mail(group):
    accounts = marked(group, 3, AccountType="IMAPAccount")
    return {"MailAccounts": [{**each, "uniqueId": each["Marker"]} for each in accounts]}


def exchange(group):
    accounts = marked(group, 2, DAAccountConfigurationClass="ASAccount")
    return {"DAAccountsKey": [{**each, "DAAccountConfigurationAccountID": each["Marker"]} for each in accounts]}


GROUPS = {"mine": 8, "other": 8, "mail": 3, "other mail": 3, "exchange": 2}


def give(directory, user):
    for path in [directory, *directory.rglob("*")]:
        os.chown(path, user, user, follow_symlinks=False)


class Scene:
    """A device, what lies outside of it, and what its user has in store."""

    def __init__(self, place):
        place.chmod(0o755)
        self.outside, self.snapshots = place / "outside", place / "snapshots"
        self.device = Device(place / "device")
        self.device.set_mobile(MOBILE, MOBILE)
        self.snapshots.mkdir(mode=0o700)
        self.fill_outside()
        self.fill_device()
        self.stock = {MOBILE: self.device.path(HOME + "/stock"), STRANGER: self.device.path("tmp/stock")}
        for user, stock in self.stock.items():
            self.fill_stock(stock, user)

    def fill_outside(self):
        for directory in (self.outside, self.outside / "directory"):
            directory.mkdir()
            for place in PLACES_OF_MOBILE:
                file = directory / Path(place).name
                file.write_bytes(plistlib.dumps({"Version": 3, "Accounts": [], "Secret": SECRET.decode()}))
                file.chmod(0o600)
        (self.outside / "program").write_bytes(b"everybody may read and run it")
        (self.outside / "program").chmod(0o4755)

    def fill_device(self):
        device = self.device
        device.write_plist(SETTINGS, settings("mine", 0))
        device.write_plist(LEGACY_MAIL, mail("mail"))
        device.write_plist(LEGACY_EXCHANGE, exchange("exchange"))
        device.write(MAIL_DIRECTORY + "/AutoFetchEnabled", "")
        for path in (LEGACY_MAIL, LEGACY_EXCHANGE):
            device.write(path + ".original", HIS_BYTES)
        device.path(TEMPORARY).mkdir(mode=0o700)
        device.path("tmp").mkdir()
        device.path("tmp").chmod(0o1777)
        give(device.path(HOME), MOBILE)

    def fill_stock(self, stock, user):
        (stock / "full" / "full").mkdir(parents=True)
        (stock / "empty").mkdir()
        files = {"other": settings("other", CURRENT_VERSION), "older": settings("other", 3), "mail": mail("other mail")}
        for name, content in files.items():
            (stock / name).write_bytes(plistlib.dumps(content, fmt=plistlib.FMT_BINARY))
        (stock / "bytes").write_text(HIS_BYTES)
        for place in PLACES_OF_MOBILE:
            shutil.copy(stock / "older", stock / "full" / Path(place).name) if "." in Path(place).name else None
        os.mkfifo(stock / "pipe")
        (stock / "to a file").symlink_to(self.outside / Path(SETTINGS).name)
        (stock / "to a directory").symlink_to(self.outside)
        (stock / "to nothing").symlink_to(self.outside / "nothing")
        (stock / "up").symlink_to("/".join([".."] * 20) + str(self.outside / "directory"))
        give(stock, user)
        # A kernel with fs.protected_hardlinks=0 lets him make these himself.
        os.link(self.outside / "program", stock / "program")
        os.link(self.outside / Path(SETTINGS).name, stock / "second name")


def all_below(directory):
    return [directory, *sorted(directory.rglob("*"))]


def state(directory):
    """All that must stay: contents, owners and modes."""
    return {path: (path.lstat().st_mode, path.lstat().st_uid, path.lstat().st_gid, path.lstat().st_mtime_ns,
                   path.read_bytes() if path.is_file() else None) for path in all_below(directory)}


def files_below(directory):
    found = [(path, path.lstat()) for path in all_below(directory)]
    return [(path, status) for path, status in found if stat.S_ISREG(status.st_mode)]


def markers(value):
    """(group, whether whole) of each marked account in a property list."""
    if isinstance(value, dict):
        own = [(value["Marker"], value.get("Whole") == HIS_BYTES)] if "Marker" in value else []
        return own + [each for element in value.values() for each in markers(element)]
    if isinstance(value, list):
        return [each for element in value for each in markers(element)]
    return []


def what_is_wrong_with_accounts(value):
    found = markers(value)
    groups = Counter(marker.rsplit(" ", 1)[0] for marker, _ in found)
    if any(count != GROUPS[group] for group, count in groups.items()):
        return f"accounts lost or doubled: {dict(groups)}"
    return None if all(whole for _, whole in found) else "an account has lost a key"


class Watch:
    """What stood before the race, and what is wrong after it."""

    def __init__(self, scene):
        self.scene = scene
        self.outside = state(scene.outside)
        self.standing = {status.st_ino for _, status in files_below(scene.device.root)}
        self.old = scene.device.read(SETTINGS)
        self.copies = {path.read_bytes() for path, _ in files_below(scene.device.path(HOME))}

    def faults(self, race, runs):
        yield from self.faults_outside()
        for path, status in files_below(self.scene.device.root):
            if status.st_ino not in self.standing:
                yield from self.faults_of_new_file(path, status)
        for path, status in files_below(self.scene.snapshots):
            content = path.read_bytes()
            if status.st_mode & (SPECIAL | 0o022) or status.st_uid != 0 or (content and status.st_mode & 0o077):
                yield f"{path} has mode {status.st_mode:o} and owner {status.st_uid}"
            if SECRET in content:
                yield f"a secret went to {path}"
        if race.user == STRANGER:
            yield from self.faults_beside_a_stranger(runs[-1])

    def faults_outside(self):
        now = state(self.scene.outside)
        for path in {path for path in {*self.outside, *now} if self.outside.get(path) != now.get(path)}:
            yield f"{path} was {self.outside.get(path)}, and is {now.get(path)}"

    def faults_of_new_file(self, path, status):
        content = path.read_bytes()
        if status.st_mode & (SPECIAL | 0o022):
            yield f"{path} has mode {status.st_mode:o}"
        # The copy aside, of whatever stood in the settings' place, is root's, to read as well.
        is_copy = content in self.copies and stat.S_IMODE(status.st_mode) == 0o600
        if status.st_uid == 0 and HIS_BYTES.encode() in content and not is_copy:
            yield f"{path} is root's, with {len(content)} bytes: {content[:60]!r}"
        if SECRET in content:
            yield f"a secret went to {path}"
        if path.suffix == ".plist" and content != HIS_BYTES.encode():
            try:
                fault = what_is_wrong_with_accounts(plistlib.loads(content))
            except (ValueError, plistlib.InvalidFileException) as failure:
                fault = f"torn: {failure!r}, {len(content)} bytes"
            if fault:
                yield f"{path}: {fault}"

    def faults_beside_a_stranger(self, run):
        """He has no way to the accounts, so they are the old ones, or all new."""
        device = self.scene.device
        if run.status == 0:
            found = {marker for marker, _ in markers(device.read_plist(SETTINGS))}
            if len(found) != GROUPS["mine"] + GROUPS["mail"] + GROUPS["exchange"]:
                yield f"not all accounts were migrated: {sorted(found)}"
            lock = device.path(LOCK[1]).lstat()
            if not stat.S_ISREG(lock.st_mode) or lock.st_uid not in (0, MOBILE) or lock.st_nlink != 1:
                yield f"the lock has mode {lock.st_mode:o}, owner {lock.st_uid}, names {lock.st_nlink}"
        else:
            yield f"he kept the run from its work: status {run.status}, {run.errors}"
            if device.read(SETTINGS) != self.old:
                yield "and the settings changed"


class Racing:
    """A racer that is beside whatever is done meanwhile."""

    def __init__(self, user, seed, stock, places):
        self.racer = subprocess.Popen([str(word) for word in (RACER, user, seed, stock, *places)], stdout=subprocess.PIPE)

    def __enter__(self):
        if self.racer.stdout.readline() != b"racing\n":
            raise AssertionError("the racer does not race")

    def __exit__(self, *_):
        alive = self.racer.poll() is None
        self.racer.kill()
        self.racer.wait()
        self.racer.stdout.close()
        if not alive:
            raise AssertionError(f"the racer ended: {self.racer.returncode}")


def call(scene, race, words):
    if words[:1] == ("accountctl",):
        return run_host(ACCOUNTCTL, "--root", scene.device.root, *words[1:], timeout=LONG)
    snapshots = ("--snapshots", scene.snapshots) if race.with_snapshots else ()
    return run_host(HOST, "--root", scene.device.root, *snapshots, *words, timeout=LONG)


def places_for(race, chance):
    """Few at a time, so that the others let the run go on."""
    if race.user == STRANGER:
        return PLACES_OF_A_STRANGER
    return chance.sample(PLACES_OF_MOBILE, chance.randint(1, 3))


def faults_of(race, runs, watch):
    for words, run in zip(race.calls, runs):
        statuses = ACCOUNTCTL_STATUSES if words[:1] == ("accountctl",) else HOST_STATUSES
        if run.status not in statuses:
            yield f"status {run.status}: {run.errors}"
        if run.status != 0 and not run.errors:
            yield f"status {run.status} without a word"
        if SECRET.decode() in "".join(run.output + run.errors):
            yield "a secret was told"
    yield from watch.faults(race, runs)


def race_number(number):
    """(the kind, the statuses, the faults, the seconds of one race)"""
    race, chance = KINDS[number % len(KINDS)], random.Random(number)
    with tempfile.TemporaryDirectory(dir="/dev/shm" if os.access("/dev/shm", os.W_OK) else None) as name:
        scene = Scene(Path(name))
        if race.begins_migrated:
            ended = call(scene, race, ())
            assert ended.status == 0, ended
        watch = Watch(scene)
        places = places_for(race, chance)
        started = time.monotonic()
        with Racing(race.user, number, scene.stock[race.user], [scene.device.path(place) for place in places]):
            try:
                runs = [call(scene, race, words) for words in race.calls]
            except subprocess.TimeoutExpired as late:
                return race.name, (), [f"race {number} at {places}: {late}"], LONG
        took = time.monotonic() - started
        faults = [f"race {number} at {places}: {fault}" for fault in faults_of(race, runs, watch)]
        return race.name, tuple(run.status for run in runs), faults, took


@unittest.skipIf(os.getuid() != 0, "only root is worth racing")
class HostileUser(unittest.TestCase):
    def test_gets_nothing_by_exchanging_what_stands_at_the_paths_of_a_run(self):
        ended, faults, longest = Counter(), [], 0
        with ProcessPoolExecutor(os.cpu_count()) as workers:
            for name, statuses, found, took in workers.map(race_number, range(RACES)):
                ended[(name, statuses)] += 1
                faults += found
                longest = max(longest, took)
        for (name, statuses), count in sorted(ended.items()):
            print(f"{name}: {count} with status {', '.join(map(str, statuses))}")
        print(f"in all: {RACES} races, the longest of {longest:.1f} s")
        self.assertEqual([], faults)
        # Else the user did not let a run get anywhere, and nothing was tried.
        for race in KINDS:
            self.assertTrue(any(name == race.name and 0 in statuses for name, statuses in ended), race.name)


if __name__ == "__main__":
    unittest.main()
