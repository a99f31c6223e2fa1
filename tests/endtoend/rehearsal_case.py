"""What tests of rehearsed runs share: a device seen so closely that any touch shows, and runs that can be compared."""

import json
import os
import re

from device import read_trace, run_host
from device_case import HOST, DeviceTest

UUID = re.compile(r"[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")
TEMPORARY_NAME = re.compile(r"/file[A-Za-z0-9]{6}\b")
REHEARSAL = "migration-host: this is a rehearsal: nothing on the device is changed"


def every_detail(root):
    """Everything below the root that a touch would change, access times aside."""
    details = {}
    for path in [root, *sorted(root.rglob("*"))]:
        status = path.lstat()
        content = path.read_bytes() if path.is_file() and not path.is_symlink() else None
        target = os.readlink(path) if path.is_symlink() else None
        details[str(path)] = (status.st_ino, status.st_mode, status.st_uid, status.st_gid, status.st_nlink,
                              status.st_size, status.st_mtime_ns, status.st_ctime_ns, content, target)
    return details


def masked(text, known):
    """Without what differs from run to run: identifiers made anew, by order of appearance, and temporary names."""
    names = {}

    def label(match):
        if match[0] in known:
            return match[0]
        return names.setdefault(match[0], f"(new {len(names) + 1})")

    return TEMPORARY_NAME.sub("/(temporary)", UUID.sub(label, text))


class RehearsalTest(DeviceTest):
    def explained(self, device, *options, **how):
        """One run: its exit status, its explanation, its trace and its console."""
        trace = self.scratch / "rehearsal.trace"
        trace.unlink(missing_ok=True)
        run = run_host(HOST, "--root", device.root, "--explain=json", "--trace", trace, *options, **how)
        return run._replace(events=read_trace(trace))

    def rehearsed(self, device, **how):
        """A rehearsal, which must leave no mark."""
        before = every_detail(device.root)
        run = self.explained(device, "--dry-run", **how)
        self.assertEqual(before, every_detail(device.root))
        self.assertEqual(REHEARSAL, run.errors[0])
        return run

    def assert_foretold(self, device, **how):
        """What a rehearsal tells is what a run then does; answers the run."""
        known = set(UUID.findall(repr([path.read_bytes() for path in device.root.rglob("*") if path.is_file()])))
        rehearsal, run = self.rehearsed(device, **how), self.explained(device, **how)
        self.assertEqual(run.status, rehearsal.status)
        self.assertEqual(self.comparable(run, known), self.comparable(rehearsal, known))
        return run

    def comparable(self, run, known):
        explanation = json.loads("\n".join(run.output))
        for member in ("rehearsal", "time"):
            explanation.pop(member)
        console = [line for line in run.errors if line != REHEARSAL]
        return [masked(json.dumps(part, indent=1), known) for part in (explanation, console, run.events[1:])]
