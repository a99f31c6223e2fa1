"""Temporary directories: each goes with the program that made it, or, where that was killed, with the next one to make
another there.

Who made a directory holds a lock on it, and so do the processes that it forked; one that nobody holds is nobody's. They stand
where TMPDIR says, else in /tmp, and never anywhere else instead.
"""

import contextlib
import fcntl
import os
import re
import shutil
import tempfile
import weakref

PREFIX = "migration-rehearse-"
NAME = re.compile(PREFIX + "[a-z0-9_]{8}")  # as mkdtemp makes them


def place():
    """Where they stand."""
    return os.environ.get("TMPDIR") or "/tmp"


class Scratch:
    """A directory of its own below `parent`. Raises OSError."""

    def __init__(self, parent=None):
        parent = os.path.abspath(parent or place())
        _sweep(parent)
        self.name, descriptor = _made(parent)
        self._end = weakref.finalize(self, _remove, self.name, descriptor)

    def __enter__(self):
        return self.name

    def __exit__(self, *_):
        self.cleanup()

    def cleanup(self):
        """Removes it with all that is in it, as far as that can be."""
        self._end()


def _made(parent):
    """Its path and the descriptor that is locked. Between the two somebody may have found it to be nobody's."""
    while True:
        path = tempfile.mkdtemp(prefix=PREFIX, dir=parent)
        with contextlib.suppress(FileNotFoundError):
            descriptor = _opened(path)
            if _is_taken(descriptor) and os.fstat(descriptor).st_nlink:
                return path, descriptor
            os.close(descriptor)


def _remove(path, descriptor):
    shutil.rmtree(path, ignore_errors=True)
    os.close(descriptor)


def _opened(path):
    return os.open(path, os.O_RDONLY | os.O_DIRECTORY | os.O_NOFOLLOW)


def _is_taken(descriptor):
    """Whether the lock is this process's now."""
    try:
        fcntl.flock(descriptor, fcntl.LOCK_EX | fcntl.LOCK_NB)
    except BlockingIOError:
        return False
    return True


def _sweep(parent):
    """Removes the caller's directories that nobody holds."""
    with contextlib.suppress(OSError):
        for path in [entry.path for entry in os.scandir(parent) if NAME.fullmatch(entry.name)]:
            with contextlib.suppress(OSError):
                _remove_unless_held(path)


def _remove_unless_held(path):
    descriptor = _opened(path)
    if os.fstat(descriptor).st_uid == os.geteuid() and _is_taken(descriptor):
        _remove(path, descriptor)
    else:
        os.close(descriptor)
