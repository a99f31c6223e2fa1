"""A device's file tree in a directory: made from readable text, migrated with the real host, read back."""

import json
import os
import plistlib
import re
import shutil
import stat
import subprocess
from pathlib import Path
from typing import NamedTuple

TREE = Path(__file__).resolve().parent.parent
EXAMPLES = TREE / "examples" / "devices"

# The data version that a migration leaves, as the library declares it.
DECLARATION = (TREE / "accountsettings/accounts_manager.h").read_text(encoding="utf-8")
CURRENT_VERSION = int(re.search(r"kCurrentVersion = (\d+);", DECLARATION)[1])

HOME = "var/mobile"
PREFERENCES = HOME + "/Library/Preferences"
SETTINGS = PREFERENCES + "/com.vorlix.accountsettings.plist"
SETTINGS_COPY = HOME + "/Library/Logs/CrashReporter/com.vorlix.accountsettings.plist"
LEGACY_MAIL = HOME + "/Library/Mail/Accounts.plist"
LEGACY_EXCHANGE = PREFERENCES + "/com.vorlix.DataAccess.plist"
TEMPORARY = HOME + "/tmp"
LOCK = ("tmp", "tmp/AccountMigrationInProgress", "tmp/AccountSettingsChange", "tmp/AccountSettingsNext")

# A device has them from its first start on, and version control cannot hold them while they are empty.
STANDING_DIRECTORIES = [PREFERENCES, HOME + "/Library/Mail", HOME + "/Library/Logs/CrashReporter"]


class Entry(NamedTuple):
    """What stands at one path."""

    kind: str
    mode: int
    owner: tuple
    content: bytes


class Run(NamedTuple):
    """What one run of the host left behind outside the device."""

    status: int
    output: list
    errors: list
    events: list

    def told(self, event):
        return [each for each in self.events if each["event"] == event]

    def messages(self):
        """The quoted part of the log's messages, in order."""
        return [quoted(each["message"]) for each in self.told("log")]

    def console(self):
        return [each["message"] for each in self.told("console")]

    def result(self):
        """The last event's members, which tell how the run ended."""
        return {key: value for key, value in self.events[-1].items() if key != "event"}


def quoted(line):
    return line[line.index('"') + 1 : line.rindex('"')]


def exactly(value):
    """Told apart by kind as well, which == does not do for 1, 1.0 and True."""
    if isinstance(value, dict):
        return {key: exactly(element) for key, element in value.items()}
    if isinstance(value, list):
        return [exactly(element) for element in value]
    return (type(value).__name__, value)


class Device:
    def __init__(self, root):
        self.root = Path(root)
        for directory in STANDING_DIRECTORIES:
            (self.root / directory).mkdir(parents=True, exist_ok=True)

    @classmethod
    def like(cls, example, root):
        """A copy of an example device whose mobile user is the caller; its property lists are binary, as on a device."""
        shutil.copytree(EXAMPLES / example, root, dirs_exist_ok=True)
        device = cls(root)
        for path in device.root.rglob("*.plist"):
            device.write_plist(path, plistlib.loads(path.read_bytes()))
        device.set_mobile(os.getuid(), os.getgid())
        return device

    def path(self, path):
        return self.root / path

    def write(self, path, content):
        self.path(path).parent.mkdir(parents=True, exist_ok=True)
        self.path(path).write_bytes(content.encode() if isinstance(content, str) else content)

    def read(self, path):
        return self.path(path).read_bytes()

    def write_plist(self, path, value):
        self.write(path, plistlib.dumps(value, fmt=plistlib.FMT_BINARY, sort_keys=False))

    def read_plist(self, path):
        return plistlib.loads(self.read(path))

    def set_mobile(self, user, group):
        """Names the ids of the device's mobile user and group."""
        self.write("etc/passwd", f"root:*:0:0::/var/root:/bin/sh\nmobile:*:{user}:{group}::/var/mobile:/bin/sh\n")
        self.write("etc/group", f"wheel:*:0:root\nmobile:*:{group}:\n")

    def entries(self, with_lock=False):
        """Everything below the root, by path; the lock, which is made by who comes first, where it is asked for."""
        everything = {str(path.relative_to(self.root)): _entry(path) for path in sorted(self.root.rglob("*"))}
        return everything if with_lock else {path: each for path, each in everything.items() if path not in LOCK}

    def migrate(self, host, *options, environment=None, prepare=None, timeout=60):
        """Runs the host on this device, with a trace; `prepare` is called in the new process before it starts."""
        trace = self.root.with_name(self.root.name + ".trace")
        trace.unlink(missing_ok=True)
        return run_host(
            host, "--root", self.root, "--trace", trace, *options,
            environment=environment, prepare=prepare, timeout=timeout, trace=trace,
        )


run_checks = []  # what looks at every run of a program, such as a test's schemas


def run_host(host, *arguments, environment=None, prepare=None, timeout=60, trace=None):
    ended = subprocess.run(
        [str(host), *map(str, arguments)],
        env={**plain_environment(), **(environment or {})},
        preexec_fn=prepare,
        stdin=subprocess.DEVNULL,
        capture_output=True,
        timeout=timeout,
        check=False,
    )
    run = Run(ended.returncode, lines(ended.stdout), lines(ended.stderr), read_trace(trace))
    for check in run_checks:
        check(run)
    return run


def plain_environment():
    """The caller's environment without what would lead the host elsewhere than the device."""
    return {name: value for name, value in os.environ.items() if name not in ("TMPDIR", "HOME")}


def lines(output):
    return output.decode(errors="replace").splitlines()


def read_trace(trace):
    if trace is None or not trace.is_file():
        return []
    text = trace.read_text(encoding="utf-8")
    return [json.loads(line) for line in text.splitlines()]


def _entry(path):
    status = path.lstat()
    content = path.read_bytes() if stat.S_ISREG(status.st_mode) and os.access(path, os.R_OK) else b""
    return Entry(
        kind={stat.S_IFREG: "file", stat.S_IFDIR: "directory"}.get(stat.S_IFMT(status.st_mode), "other"),
        mode=stat.S_IMODE(status.st_mode),
        owner=(status.st_uid, status.st_gid),
        content=content,
    )
