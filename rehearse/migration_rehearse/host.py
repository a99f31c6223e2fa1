"""The host as it is asked to rehearse: in a process of its own, with limits on its time, memory and output."""

import functools
import hashlib
import os
import resource
import select
import selectors
import shutil
import signal
import subprocess
import time
from pathlib import Path
from typing import NamedTuple

from migration_rehearse.footprint import GROUPS, USERS, read_file

ENVIRONMENT = {"PATH": "/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL": "C.UTF-8", "HOME": "/nonexistent"}
PLUGIN_FROM_PROGRAM = ("../lib/*/account-settings/accounts-migrator.so", "../lib/account-settings/accounts-migrator.so")
RESOURCES_FROM_PROGRAM = "../share/account-settings"
PRLIMIT = "/usr/bin/prlimit"
MAX_TABLE = 1 << 20  # bytes of a device's passwd or group file
MAX_ERRORS = 1 << 20
SECONDS_FOR_A_LOCK = 5
SECONDS_TO_END = 1.0  # after its last word


class HostUnusable(Exception):
    """The host that is to rehearse cannot."""


class Limits(NamedTuple):
    """What one rehearsal may cost; 0 is no limit."""

    seconds: float = 60
    memory: int = 2 << 30
    output: int = 64 << 20

    @property
    def lock_seconds(self):
        """How long the host waits for who holds an image's lock: it has time left to say so."""
        return min(SECONDS_FOR_A_LOCK, int(self.seconds / 2)) if self.seconds else SECONDS_FOR_A_LOCK


class Ended(NamedTuple):
    """How a process ended. `stopped` says why this program ended it: "timeout", "too-much-output" or nothing."""

    status: int  # negative: the signal
    stopped: str
    output: bytes
    errors: bytes
    seconds: float
    processor_seconds: float
    peak_memory: int  # bytes; 0 where it could not be told apart from that of the process that started it


class Host(NamedTuple):
    """Which host, plug-in and resources rehearse; the last two are empty where the installed ones do."""

    program: str
    plugin: str = ""
    resources: str = ""

    def command(self, root, limits):
        """That rehearses the one image."""
        return [self.program, "--root", root, "--dry-run", "--explain=json", *self._options(limits)]

    def serving(self, limits):
        """That rehearses image after image; see serving.py."""
        return [self.program, "--serve-rehearsals", *self._options(limits)]

    def _options(self, limits):
        options = [f"--lock-timeout={limits.lock_seconds}"]
        options += ["--plugin", self.plugin] if self.plugin else []
        return options + (["--resources", self.resources] if self.resources else [])

    def found(self):
        """The same by absolute paths, so that it is found from wherever a worker runs. Raises HostUnusable."""
        program = shutil.which(self.program)
        if program is None:
            raise HostUnusable(f"{self.program}: there is no such program")
        return Host(os.path.abspath(program), *(os.path.abspath(path) if path else "" for path in self[1:]))

    def version(self):
        """As the host tells it. Raises HostUnusable."""
        try:
            ended = subprocess.run([self.program, "--version"], env=ENVIRONMENT, stdin=subprocess.DEVNULL,
                                   capture_output=True, text=True, timeout=60, check=False)
        except (OSError, subprocess.SubprocessError) as failure:
            raise HostUnusable(f"{self.program}: {failure}") from failure
        if ended.returncode != 0 or not ended.stdout.strip():
            raise HostUnusable(f"{self.program} --version ended with {ended.returncode}: {ended.stderr.strip()}")
        return ended.stdout.split()[-1]

    def digest(self):
        """Of everything that what a rehearsal says depends on: two builds of one version differ in it."""
        digest = hashlib.sha256()
        for part in self._parts():
            digest.update(part.name.encode() + b"\0" + digest_of(part).digest())
        return digest.hexdigest()

    def digests(self):
        """Of the program and of the plug-in, each by itself, as sha256sum prints them."""
        program, plugin, *_ = self._parts()
        return [digest_of(part).hexdigest() for part in (program, plugin)]

    def _parts(self):
        """The program, the plug-in, the system's own libraries that the two load, and the resources."""
        program = Path(self.program).resolve()
        plugin = Path(self.plugin) if self.plugin else self._installed_plugin(program)
        libraries = {library for binary in (program, plugin) for library in own_libraries(binary)}
        tables = sorted(path for path in self.resource_directory().rglob("*") if path.suffix in (".plist", ".strings"))
        return [program, plugin, *sorted(libraries), *tables]

    def resource_directory(self):
        return Path(self.resources) if self.resources else Path(self.program).resolve().parent / RESOURCES_FROM_PROGRAM

    def _installed_plugin(self, program):
        found = [path for pattern in PLUGIN_FROM_PROGRAM for path in sorted(program.parent.glob(pattern))]
        if not found:
            raise HostUnusable(f"no plug-in is installed beside {program}; name one with --plugin")
        return found[0]


@functools.cache
def digest_of(file):
    """The SHA-256 of a file's contents, read once."""
    return hashlib.sha256(file.read_bytes())


def own_libraries(binary):
    """The libraries of the account settings that a program or plug-in loads."""
    listed = subprocess.run(["ldd", binary], capture_output=True, text=True, check=False).stdout.split()
    return {Path(word).resolve() for word in listed if word.startswith("/") and "/libaccount" in word}


def as_mobile(root):
    """What to put before the host's command where the caller is not root: it then is, to itself, the mobile user of the
    device, who may own what a run saves. Nothing where there is no need, or no such user, or no way."""
    if os.geteuid() == 0:
        return []
    user, group = _number_of(root, USERS, "mobile"), _number_of(root, GROUPS, "mobile")
    if user is None or group is None or (user, group) == (os.geteuid(), os.getegid()):
        return []
    return ["unshare", "--user", f"--map-user={user}", f"--map-group={group}", "--"] if may_unshare() else []


def may_unshare():
    """Whether this machine lets an ordinary user be another to himself."""
    if may_unshare.answer is None:
        asked = subprocess.run(["unshare", "--user", "true"], capture_output=True, check=False)
        may_unshare.answer = asked.returncode == 0
    return may_unshare.answer


may_unshare.answer = None


def _number_of(root, table, name):
    for line in (read_file(root, table, MAX_TABLE) or b"").decode(errors="replace").splitlines():
        fields = line.split(":")
        if fields[0] == name and len(fields) > 2 and fields[2].isdigit():
            return int(fields[2])
    return None


def limited(command, limits):
    """The command with the limits that the kernel keeps, whatever becomes of this process."""
    options = ["--core=0"]
    options += [f"--cpu={int(limits.seconds) + 1}"] if limits.seconds else []
    options += [f"--as={limits.memory}"] if limits.memory else []
    return [PRLIMIT, *options, "--", *command]


def run(command, limits, environment=ENVIRONMENT):
    """Runs the command to its end, or until it breaks a limit; answers how it ended."""
    begun = time.monotonic()
    own_peak = resource.getrusage(resource.RUSAGE_SELF).ru_maxrss
    process = subprocess.Popen(limited(command, limits), env=environment, stdin=subprocess.DEVNULL,
                               stdout=subprocess.PIPE, stderr=subprocess.PIPE, start_new_session=True)
    reading = _Reading(process, limits, begun)
    try:
        reading.until_end()
    finally:
        _end(process, 0 if reading.stopped else SECONDS_TO_END)
        _, status, usage = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
        process.stdout.close()
        process.stderr.close()
    peak = max(reading.peak, usage.ru_maxrss if usage.ru_maxrss > own_peak else 0)
    return Ended(process.returncode, reading.stopped, bytes(reading.output), bytes(reading.errors),
                 time.monotonic() - begun, usage.ru_utime + usage.ru_stime, peak * 1024)


def _end(process, seconds):
    """Ends what is left of it, once it had so long to end by itself."""
    end = os.pidfd_open(process.pid)
    select.select([end], [], [], seconds)
    os.close(end)
    try:
        os.killpg(process.pid, signal.SIGKILL)
    except ProcessLookupError:
        pass


class _Reading:
    """Takes what a process says, within its limits."""

    def __init__(self, process, limits, begun):
        self.process = process
        self.limits = limits
        self.deadline = begun + limits.seconds if limits.seconds else None
        self.output, self.errors = bytearray(), bytearray()
        self.stopped = ""
        self.peak = 0  # KiB

    def until_end(self):
        with selectors.DefaultSelector() as selector:
            selector.register(self.process.stdout, selectors.EVENT_READ, self.output)
            selector.register(self.process.stderr, selectors.EVENT_READ, self.errors)
            while selector.get_map() and not self.stopped:
                left = None if self.deadline is None else self.deadline - time.monotonic()
                ready = selector.select(left) if left is None or left > 0 else []
                if not ready:
                    self.stopped = "timeout"
                for key, _ in ready:
                    self._take(selector, key)

    def _take(self, selector, key):
        block = os.read(key.fd, 1 << 16)
        if not block:
            selector.unregister(key.fileobj)
            return
        if key.data is self.errors:
            self.errors += block[: MAX_ERRORS - len(self.errors)]
            return
        self._look_at_memory()
        self.output += block
        if self.limits.output and len(self.output) > self.limits.output:
            self.stopped = "too-much-output"

    def _look_at_memory(self):
        """The kernel counts the memory of the process that started another as the other's; its own is told only while
        it lives, and it lives while it is talking."""
        try:
            with open(f"/proc/{self.process.pid}/status", encoding="ascii", errors="replace") as file:
                lines = [line for line in file if line.startswith("VmHWM:")]
        except OSError:
            return
        self.peak = max([self.peak, *(int(line.split()[1]) for line in lines)])
