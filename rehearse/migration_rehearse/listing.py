"""Which images are meant: those named on the command line, and those in lists, which may be longer than memory."""

import os
import re
import shutil
import sys
import tempfile
from pathlib import Path

from migration_rehearse import scratch
from migration_rehearse.campaign import in_shard
from migration_rehearse.engines import EngineFault

STANDARD_INPUT = "-"
IS_ABSOLUTE = re.compile(r"(/(?!\.?(/|$))[^/]+)+", re.DOTALL).fullmatch  # and written as short as can be


class Listing:
    """The absolute paths of images, in the order in which they are named; iterated as often as need be. Lists hold one path a
    line, or end each with a zero byte. Which shard an image belongs to is decided by the path as it is named, so that machines
    that have the list in different places divide it alike. Raises OSError where a list cannot be read."""

    def __init__(self, named, lists, shard=(1, 1), is_zero_ended=False):
        self.named = named
        self.shard = shard
        self.end = b"\0" if is_zero_ended else b"\n"
        self.lists = [_spooled(sys.stdin.buffer) if each == STANDARD_INPUT else open(each, "rb") for each in lists]

    def __iter__(self):
        return (absolute(path) for path in self._all() if in_shard(path, self.shard))

    def count(self):
        return sum(in_shard(path, self.shard) for path in self._all())

    def _all(self):
        yield from self.named
        for file in self.lists:
            file.seek(0)
            yield from (os.fsdecode(line) for line in self._lines(file) if line)

    def _lines(self, file):
        rest = b""
        while block := file.read(1 << 16):
            *whole, rest = (rest + block).split(self.end)
            yield from whole
        yield rest


def absolute(path):
    """The same place from wherever a worker runs. Parents are left for links to mean what they do; no path stays none."""
    return path if not path or IS_ABSOLUTE(path) else str(Path(path).absolute())


def _spooled(stream):
    """What can be read once only, kept on disk so that it can be read again."""
    try:
        file = tempfile.TemporaryFile(dir=scratch.place())
        shutil.copyfileobj(stream, file)
        file.flush()
    except OSError as failure:
        raise EngineFault(f"{scratch.place()}: the list cannot be kept there: {failure.strerror}") from failure
    return file
