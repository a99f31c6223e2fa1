"""Saves that fail: the run says so, the settings file is as it was, and no temporary file stays."""

import ctypes
import json
import os
import resource
import shutil
import tempfile
import threading
import unittest
from pathlib import Path

from device import SETTINGS, SETTINGS_COPY, TEMPORARY, Device, read_trace, run_host
from device_case import HOST, DeviceTest

FAILED = "Failed to save accounts to filesystem."
NO_OWNER = "Could not set attributes on the temporary account settings plist. "
SHARED_MEMORY = Path("/dev/shm")

PR_CAPBSET_DROP = 24
CAP_CHOWN = 0
CAP_DAC_OVERRIDE = 1
CAP_DAC_READ_SEARCH = 2


def without_capabilities(*capabilities):
    """What makes root an ordinary user in this respect once the host is started."""

    def drop():
        if os.getuid() != 0:
            return
        libc = ctypes.CDLL(None, use_errno=True)
        for capability in capabilities:
            if libc.prctl(PR_CAPBSET_DROP, capability, 0, 0, 0) != 0:
                raise OSError(ctypes.get_errno(), "cannot give up a capability")

    return drop


class FailedSaves(DeviceTest):
    def setUp(self):
        super().setUp()
        self.current = self.example("current")
        self.before = self.current.entries()

    def assert_fails_to_save(self, *messages, new=(TEMPORARY, SETTINGS_COPY), **how):
        """The save's own messages are these, in this order; of the device's files none was changed."""
        self.assert_saves_failed(self.current.migrate(HOST, **how), self.current, messages, new)

    def assert_saves_failed(self, run, device, messages, new):
        about_saving = [
            each for each in run.messages() if each.startswith((FAILED, NO_OWNER, "Failed to serialize"))
        ]
        self.assertEqual(len(messages), len(about_saving), about_saving)
        for expected, message in zip(messages, about_saving):
            self.assertTrue(message.startswith(expected), message)
        after = device.entries()
        self.assertEqual(sorted({*self.before, *new}), sorted(after))
        self.assertEqual(self.before[SETTINGS], after[SETTINGS])
        # The plug-in answers true all the same; who asks the host learns better.
        self.assertEqual(6, run.status, run.errors)
        self.assertEqual((True, "not saved"), (run.result()["success"], run.result()["verdict"]))
        self.assertRegex(run.result()["cause"], "^Could not ")

    def test_without_a_mobile_user(self):
        self.current.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        self.before = self.current.entries()
        self.assert_fails_to_save(NO_OWNER, FAILED)

    def test_without_a_mobile_group(self):
        self.current.write("etc/group", "wheel:*:0:root\n")
        self.before = self.current.entries()
        self.assert_fails_to_save(NO_OWNER, FAILED)

    def test_without_account_files(self):
        shutil.rmtree(self.current.path("etc"))
        self.before = self.current.entries()
        self.assert_fails_to_save(NO_OWNER, FAILED)

    def test_when_the_owner_may_not_be_set(self):
        self.current.set_mobile(os.getuid() + 1, os.getgid() + 1)
        self.before = self.current.entries()
        self.assert_fails_to_save(NO_OWNER, FAILED, prepare=without_capabilities(CAP_CHOWN))

    def test_when_the_destination_may_not_be_written(self):
        preferences = self.current.path(SETTINGS).parent
        preferences.chmod(0o555)
        self.addCleanup(preferences.chmod, 0o755)
        self.before = self.current.entries()
        self.assert_fails_to_save(FAILED, prepare=without_capabilities(CAP_DAC_OVERRIDE))

    def test_when_the_destination_is_a_directory(self):
        self.current.path(SETTINGS).unlink()
        self.current.path(SETTINGS).mkdir()
        self.before = self.current.entries()
        self.assert_fails_to_save(FAILED, new=[TEMPORARY])

    def test_when_the_temporary_directory_is_on_another_volume(self):
        if SHARED_MEMORY.stat().st_dev == self.scratch.stat().st_dev:
            self.skipTest(f"{SHARED_MEMORY} is no volume of its own here")
        with tempfile.TemporaryDirectory(dir=SHARED_MEMORY) as elsewhere:
            self.assert_fails_to_save(FAILED, new=[SETTINGS_COPY], environment={"TMPDIR": elsewhere})
            self.assertEqual([], os.listdir(elsewhere))

    def test_when_no_file_may_grow(self):
        limit = 100
        with PipedTrace(self.scratch / "pipe") as trace:
            run = run_host(
                HOST, "--root", self.current.root, "--trace", trace.path,
                prepare=lambda: resource.setrlimit(resource.RLIMIT_FSIZE, (limit, limit)),
            )
        self.assert_failed_for_want_of_space(run._replace(events=trace.events()), self.current)

    def test_when_the_volume_is_full(self):
        volume, left = self.scratch / "volume", self.scratch / "left"
        volume.mkdir()
        left.mkdir()
        if not on_small_volume(volume, "true").status == 0:
            self.skipTest("mounting a small volume is not allowed here")
        if os.getuid() != 0:
            self.current.set_mobile(0, 0)
            self.before = self.current.entries()
        trace = self.scratch / "trace"
        run = on_small_volume(
            volume,
            'cp -a "$1/." . && mkdir -m 700 var/mobile/tmp && { cat /dev/zero > filler; } 2> /dev/null;'
            ' { "$3" --root "$0" --trace "$4"; status=$?; rm filler; cp -a . "$2"; exit $status; }',
            self.current.root, left, HOST, trace,
        )
        self.assert_failed_for_want_of_space(run._replace(events=read_trace(trace)), Device(left))

    def assert_failed_for_want_of_space(self, run, device):
        self.assert_saves_failed(run, device, [FAILED], [TEMPORARY])
        self.assertRegex(run.console()[0], "^Error trying to save an accountsettings plist copy: ")


class PipedTrace:
    """A trace that no limit on files holds for."""

    def __init__(self, path):
        self.path = path
        self._text = []

    def __enter__(self):
        os.mkfifo(self.path)
        self._reader = threading.Thread(target=lambda: self._text.append(self.path.read_text(encoding="utf-8")))
        self._reader.start()
        return self

    def __exit__(self, *_):
        self._reader.join()

    def events(self):
        return [json.loads(line) for line in "".join(self._text).splitlines()]


def on_small_volume(volume, script, *arguments):
    """Runs the shell script in a small volume that is mounted for it alone, at the path that is its $0."""
    flags = ["--mount"] if os.getuid() == 0 else ["--mount", "--user", "--map-root-user"]
    mounted = 'mount -t tmpfs -o size=128k,mode=755 small "$0" && cd "$0" && ' + script
    return run_host("unshare", *flags, "sh", "-c", mounted, volume, *arguments)


if __name__ == "__main__":
    unittest.main()
