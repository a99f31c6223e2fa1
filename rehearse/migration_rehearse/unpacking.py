"""An archive of a device, unpacked as far as a run reads it, into a directory that is this program's own.

Nothing of an archive is believed. It is read in one pass; only the files that a run reads are written, each under a name
that this program chose, and they are put into the device's tree once all paths and links are known. Owners are not
kept, and modes only as far as the owner keeps his rights.
"""

import os
import stat
from typing import NamedTuple

from migration_rehearse.faults import Fault
from migration_rehearse.footprint import DIRECTORIES, FILES, resolved

WANTED = (*FILES, *DIRECTORIES)
# An entry is looked at more closely where its last two names are those of a file that a run reads: links may lead to it.
TAILS = frozenset("/".join(path.split("/")[-2:]) for path in FILES)
NAMES = frozenset(name for path in WANTED for name in path.split("/"))
WANTED_NAMED = {name: [path for path in WANTED if path.endswith("/" + name)] for name in NAMES}
IMPLIED_MODE = 0o755  # of a directory that the archive does not name
KEPT_ENTRIES = 10_000  # links, directories and files that might matter; a device has a few dozen
SMALL = 64 << 20  # what any archive may unpack to, whatever its size
STAGING, DEVICE = "staging", "device"  # below the directory in which archives are unpacked


class Bounds(NamedTuple):
    """What an archive may cost."""

    entries: int = 1_000_000
    size: int = 64 << 30  # unpacked bytes, those that are passed over included
    ratio: int = 2_000  # unpacked bytes to those of the archive
    memory: int = 1 << 30  # of the process that reads it
    seconds: float = 600


class Unpacking:
    """One pass through an archive."""

    def __init__(self, archive, staging, bounds):
        self.archive = archive
        self.staging = staging
        self.bounds = bounds
        self.entries = 0
        self.size = 0
        self.most = min(bounds.size, max(SMALL, bounds.ratio * os.stat(archive).st_size))
        self.found = {}  # what might matter: path to ("file", staged), ("directory", mode), ("link", target) or a fault

    def read(self):
        import libarchive  # only who has archives needs it, and it takes long

        try:
            with libarchive.file_reader(self.archive, format_name=self._format()) as reader:
                for entry in reader:
                    self._take(entry)
        except libarchive.ArchiveError as failure:
            raise Fault("damaged-archive", failure.msg or "") from failure  # its text has an address of the moment
        if not self.entries:
            raise Fault("damaged-archive", "it is empty")

    def _format(self):
        """Only these two: every format that is not asked for is one less to be attacked by."""
        with open(self.archive, "rb") as file:
            return "zip" if file.read(2) == b"PK" else "tar"

    def _take(self, entry):
        self.entries += 1
        if self.entries > self.bounds.entries:
            raise Fault("too-many-entries")
        path = self._plain(entry.pathname)
        matters = path.rsplit("/", 1)[-1] in NAMES
        if entry.isreg and not entry.islnk and "/".join(path.split("/")[-2:]) in TAILS:
            self._remember(path, ("file", self._stage(entry)))
            return
        self._pass_over(entry)
        if not matters:
            return
        if entry.issym:
            self._remember(path, ("link", entry.linkpath))
        elif entry.isdir:
            self._remember(path, ("directory", stat.S_IMODE(entry.mode)))
        elif entry.islnk:
            self._remember(path, ("fault", "hard-link"))
        elif not entry.isreg:
            self._remember(path, ("fault", "special-file"))

    def _plain(self, name):
        parts = [part for part in (name or "").split("/") if part not in ("", ".")]
        if ".." in parts:
            raise Fault("path-out", name)
        return "/".join(parts)

    def _remember(self, path, what):
        self.found[path] = what
        if len(self.found) > KEPT_ENTRIES:
            raise Fault("too-many-entries", "of those that a run might read")

    def _stage(self, entry):
        place = os.path.join(self.staging, str(self.entries))
        with open(place, "xb") as file:
            for block in entry.get_blocks(1 << 16):
                self._count(len(block))
                file.write(block)
        return place

    def _pass_over(self, entry):
        if entry.isreg:
            for block in entry.get_blocks(1 << 16):
                self._count(len(block))

    def _count(self, size):
        self.size += size
        if self.size > self.most:
            raise Fault("too-large" if self.most == self.bounds.size else "bomb")


class Tree:
    """The device among an archive's entries, which may lie below some directory."""

    def __init__(self, found):
        self.found = found
        self.has_links = any(kind == "link" for kind, _ in found.values())

    def root(self):
        """Where the device's tree begins: the place below which most of what a run reads is found."""
        candidates = {}
        for path in self.found:
            for wanted in WANTED_NAMED.get(path.rpartition("/")[2], ()):
                if path == wanted or path.endswith("/" + wanted):
                    prefix = path[: len(path) - len(wanted)].rstrip("/")
                    candidates.setdefault(prefix, None)
        candidates |= {path.rpartition("/")[0]: None for path, what in self.found.items() if what[0] == "link"}
        counted = sorted((-self._files_below(prefix), prefix.count("/"), prefix) for prefix in candidates)
        if not counted or counted[0][0] == 0:
            raise Fault("no-device")
        best = counted[0]
        if len(counted) > 1 and counted[1][:2] == best[:2] and not self._is_same(best[2], counted[1][2]):
            raise Fault("several-devices")
        return best[2]

    def places(self, prefix):
        """What a run reads, by its path on the device: the entry that it leads to."""
        places = {}
        for path in WANTED:
            place = resolved(path, lambda below: self._target(prefix, below)) if self.has_links else path
            if place is None:
                raise Fault("link-out", path)
            what = self.found.get(f"{prefix}/{place}" if prefix else place)
            if what and what[0] == "fault":
                raise Fault(what[1], path)
            if what:
                places[path] = what
        return places

    def _target(self, prefix, path):
        what = self.found.get(f"{prefix}/{path}" if prefix else path)
        return what[1] if what and what[0] == "link" else None

    def _files_below(self, prefix):
        try:
            return len(self.places(prefix))
        except Fault:
            return 1  # it is one, and to be told of

    def _is_same(self, first, second):
        try:
            return self.places(first) == self.places(second)
        except Fault:
            return False


def build(places, root):
    """Puts the staged files and the directories of a device where a run looks for them, and takes away what else is there:
    most devices have the same directories, and to make and remove them is what costs most."""
    _clear(root, places)
    for path, (kind, value) in places.items():
        place = os.path.join(root, path)
        if kind == "file":
            os.makedirs(os.path.dirname(place), exist_ok=True)
            os.rename(value, place)
        elif kind == "directory":
            os.makedirs(place, exist_ok=True)
            os.chmod(place, value | stat.S_IRWXU)


def _clear(root, places):
    """Leaves of what is below the root only the directories that these places need."""
    needed = {"."} | {path for path, (kind, _) in places.items() if kind == "directory"}
    for path in places:
        while path := path.rpartition("/")[0]:
            needed.add(path)
    for directory, _, files in os.walk(root, topdown=False):
        for file in files:
            os.unlink(os.path.join(directory, file))
        if os.path.relpath(directory, root) not in needed:
            os.rmdir(directory)
        else:
            os.chmod(directory, IMPLIED_MODE)


def unpack_here(archive, scratch, bounds):
    """Unpacks it below the directory `scratch`, where nothing is but what was unpacked there before, which goes. Raises Fault,
    and whatever else a damaged archive brings about."""
    staging = os.path.join(scratch, STAGING)
    unpacking = Unpacking(archive, staging, bounds)
    unpacking.read()
    tree = Tree(unpacking.found)
    build(tree.places(tree.root()), os.path.join(scratch, DEVICE))
