"""A disk whose every write and flush is remembered: one file of a file system of its own, served by a process of its own.

A loop device on the file hands each write of the file system above it down as it is submitted, and each flush as a sync.
"""

import ctypes.util
import errno
import itertools
import os
import stat
import struct
import subprocess
import sys
import time
from pathlib import Path

NAME = "disk"
FLUSH = -1
EVENT = struct.Struct("<qI")  # where the bytes that follow were written, or FLUSH; how many they are


class RecordingDisk:
    """Serves a copy of an image, and appends what happens to it to a journal."""

    def __init__(self, image, mount_point, journal):
        self.mount_point, self.journal = Path(mount_point), Path(journal)
        self.mount_point.mkdir()
        self.server = subprocess.Popen([sys.executable, "-B", __file__, image, mount_point, journal])
        for _ in range(500):
            if self.file.exists():
                return
            time.sleep(0.01)
        raise TimeoutError("the recording disk does not start")

    @property
    def file(self):
        return self.mount_point / NAME

    def close(self):
        """The kernel gives the loop device back some time after its file system is gone; until then the file is in use."""
        while subprocess.run(["umount", self.mount_point], check=False, capture_output=True).returncode != 0:
            time.sleep(0.1)
        if self.server.wait(timeout=30) != 0:
            raise ChildProcessError("the recording disk failed")

    def events(self):
        """(offset, bytes) of each write and (FLUSH, b"") of each flush, in order."""
        recorded = self.journal.read_bytes()
        at = 0
        while at < len(recorded):
            offset, size = EVENT.unpack_from(recorded, at)
            at += EVENT.size
            yield offset, recorded[at : at + size]
            at += size


def serve(image, mount_point, journal):
    import fusepy  # the tests' own process does without it

    class Disk(fusepy.Operations):
        def __init__(self):
            self.image = os.open(image, os.O_RDWR)
            self.journal = os.open(journal, os.O_WRONLY | os.O_CREAT | os.O_EXCL | os.O_APPEND, 0o600)

        def getattr(self, path, handle=None):
            if path == "/":
                return {"st_mode": stat.S_IFDIR | 0o700, "st_nlink": 2}
            if path != f"/{NAME}":
                raise fusepy.FuseOSError(errno.ENOENT)
            return {"st_mode": stat.S_IFREG | 0o600, "st_nlink": 1, "st_size": os.fstat(self.image).st_size}

        def read(self, path, size, offset, handle):
            return os.pread(self.image, size, offset)

        def write(self, path, data, offset, handle):
            os.write(self.journal, EVENT.pack(offset, len(data)) + data)
            return os.pwrite(self.image, data, offset)

        def fsync(self, path, only_data, handle):
            os.write(self.journal, EVENT.pack(FLUSH, 0))
            return 0

    fusepy.FUSE(Disk(), mount_point, foreground=True, nothreads=True, big_writes=True, max_write=1 << 17, nonempty=True)


def can_be_had():
    """Whether a recording disk can run here, and if not, what is missing."""
    if os.getuid() != 0:
        return "only root can mount"
    for device in ("/dev/fuse", "/dev/loop-control"):
        if not os.path.exists(device):
            return f"needs {device}"
    if not ctypes.util.find_library("fuse"):
        return "needs libfuse2"
    if subprocess.run([sys.executable, "-c", "import fusepy"], capture_output=True, check=False).returncode != 0:
        return "needs python3-fusepy"
    return None


def between_flushes(events):
    """The writes in groups: each ends with a flush, the last with the end of the recording."""
    for is_flush, group in itertools.groupby(events, key=lambda event: event[0] == FLUSH):
        if not is_flush:
            yield list(group)


if __name__ == "__main__":
    serve(*sys.argv[1:])
