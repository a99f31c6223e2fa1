"""What the end-to-end tests share: a scratch directory, a device in it, and the programs to try."""

import os
import shutil
import subprocess
import tempfile
import unittest
from pathlib import Path

import schemas  # noqa: F401, holds every run against the schemas
from device import SETTINGS, Device, run_host

HOST = Path(os.environ["MIGRATION_HOST"])
PLUGINS = Path(os.environ["TEST_PLUGINS"])


def strace(*options):
    return ["strace", "-f", *options]


def can_trace_calls():
    if not shutil.which("strace"):
        return False
    return subprocess.run(strace("-o", os.devnull, "true"), capture_output=True, check=False).returncode == 0


class DeviceTest(unittest.TestCase):
    maxDiff = None

    def setUp(self):
        scratch = tempfile.TemporaryDirectory()
        self.addCleanup(scratch.cleanup)
        self.scratch = Path(scratch.name).resolve()

    def device(self, **settings):
        """A device whose mobile user is the caller; with keyword arguments, they are its settings file's root."""
        device = Device(self.scratch / "device")
        device.set_mobile(os.getuid(), os.getgid())
        if settings:
            device.write_plist(SETTINGS, settings)
        return device

    def example(self, name):
        return Device.like(name, self.scratch / name)

    def run_host(self, *arguments, **more):
        return run_host(HOST, *arguments, **more)

    def run_directed(self, direction, *arguments):
        """Runs the host with the plug-in that does as it is told."""
        device = self.device()
        return self.run_host(
            "--root", device.root, "--plugin", PLUGINS / "directed_migrator.so", *arguments,
            environment={"TEST_PLUGIN": direction},
        )
