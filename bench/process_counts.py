"""What a whole process takes that no busy machine changes: instructions, calls of the kernel and page faults."""

import os
import re
import resource
import shutil
import subprocess
import tempfile
from dataclasses import dataclass
from pathlib import Path

from device import CURRENT_VERSION, SETTINGS

# Where the loader looks beside a program for libraries that are made for the machine's processor. A tree that was
# installed into the system has no such look-ups.
_LOOK_UP = re.compile(r'"[^"]*/(glibc-hwcaps|tls|haswell|avx512_1|x86_64)(/[^"]*)?".* = -1 ENOENT')
_CALL = re.compile(r"^\d+ +\w+\(")
_ACCOUNTS = 10


@dataclass
class Counts:
    instructions: int  # of the process itself, without the kernel's
    calls: int  # of the kernel, but for the look-ups
    look_ups: int
    faults: int  # pages that were not there when they were first used

    def over(self, other):
        return [ours / theirs for ours, theirs in (
            (self.instructions, other.instructions), (self.calls + self.look_ups, other.calls + other.look_ups),
            (self.faults, other.faults))]


def _run(command, environment, **how):
    done = subprocess.run([*map(str, command)], env=environment, capture_output=True, text=True, **how)
    if done.returncode != 0:
        raise RuntimeError(f"{command} ended with {done.returncode}: {done.stderr}")
    return done


def _instructions(command, environment):
    valgrind = ["valgrind", "--tool=callgrind", "--callgrind-out-file=/dev/null"]
    return int(re.search(r"Collected : (\d+)", _run([*valgrind, *command], environment).stderr)[1])


def _calls(command, environment):
    with tempfile.NamedTemporaryFile() as trace:
        _run(["strace", "-f", "-o", trace.name, *command], environment)
        calls = [line for line in Path(trace.name).read_text().splitlines() if _CALL.match(line)]
    look_ups = sum(bool(_LOOK_UP.search(call)) for call in calls)
    return len(calls) - look_ups, look_ups


def _relocations(command, environment):
    """Of the program and of what it loads on its way, without those that need no look-up."""
    told = _run(command, {**environment, "LD_DEBUG": "statistics"}).stderr
    return int(re.search(r"final number of relocations: (\d+)", told)[1])


def can_trace_calls():
    return shutil.which("strace") and subprocess.run(["strace", "-o", os.devnull, "true"], check=False).returncode == 0


def _faults(command, environment):
    before = resource.getrusage(resource.RUSAGE_CHILDREN)
    _run(command, environment)
    after = resource.getrusage(resource.RUSAGE_CHILDREN)
    return after.ru_minflt + after.ru_majflt - before.ru_minflt - before.ru_majflt


class Processes:
    """The processes that the page on performance has rows of, each on a device of ten accounts of its own."""

    def __init__(self, build, programs, directory, make_device):
        self.host = build / "bin/migration-host"
        self.accountctl = build / "bin/accountctl"
        self.programs = programs
        self.plugin = build / "lib/account-settings/accounts-migrator.so"
        self.directory = Path(directory)
        self.make_device = make_device
        # Nothing of the caller's surroundings: no language to load, no bus to tell, no other place for files.
        self.environment = {"PATH": os.environ["PATH"], "LC_ALL": "C", "DBUS_SYSTEM_BUS_ADDRESS": "exec:none"}

    def rows(self):
        """What is measured, the version of its device, its command and its peer's; both of the device's root."""
        run = lambda *options: lambda root: [self.host, "--root", root, *options]
        control = lambda *words: lambda root: [self.accountctl, "--root", root, *words]
        plistutil = lambda root: [shutil.which("plistutil"), "-i", root / SETTINGS, "-o", root / "converted"]
        only_loading = lambda root: [self.programs / "bench-only-load", self.plugin]
        one_letter = lambda root: [self.programs / "bench-one-letter"]
        change = lambda root: control("set", self._first_account(root), "Word=other")(root)
        return {
            f"version {CURRENT_VERSION}": (CURRENT_VERSION, run(), "plistutil", plistutil),
            "version 0": (0, run(), "only loading", only_loading),
            "rehearsal with JSON": (0, run("--dry-run", "--explain=json"), "one letter", one_letter),
            "accountctl list": (CURRENT_VERSION, control("list"), "plistutil", plistutil),
            "accountctl set": (CURRENT_VERSION, change, "plistutil", plistutil),
        }

    def _first_account(self, root):
        listed = _run([self.accountctl, "--root", root, "list", "--json"], self.environment).stdout
        return re.search(r"[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}", listed)[0]

    def count(self, version, command_on):
        measured = lambda how: self._on_device(version, command_on, how)
        # Of page faults the fewest: where the kernel puts what a program loads varies.
        faults = min(measured(_faults) for _ in range(5))
        return Counts(measured(_instructions), *measured(_calls), faults)

    def relocations(self, version, command_on):
        return self._on_device(version, command_on, _relocations)

    def _on_device(self, version, command_on, measure):
        root = Path(tempfile.mkdtemp(dir=self.directory))
        try:
            self.make_device(root, _ACCOUNTS, version)
            return measure(command_on(root), self.environment)
        finally:
            shutil.rmtree(root)
