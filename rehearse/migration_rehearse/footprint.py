"""What a run reads of a device, and what stands there: the identity of an image's contents."""

import functools
import hashlib
import os
import re
import stat
from typing import NamedTuple

PREFERENCES = "var/mobile/Library/Preferences"
SETTINGS = PREFERENCES + "/com.vorlix.accountsettings.plist"
LEGACY_MAIL = "var/mobile/Library/Mail/Accounts.plist"
LEGACY_EXCHANGE = PREFERENCES + "/com.vorlix.DataAccess.plist"
USERS, GROUPS = "etc/passwd", "etc/group"

FILES = (
    USERS,
    GROUPS,
    "etc/vorlix/device-info.plist",
    "etc/vorlix/profile-restrictions.plist",
    SETTINGS,
    LEGACY_MAIL,
    LEGACY_MAIL + ".original",
    LEGACY_EXCHANGE,
    LEGACY_EXCHANGE + ".original",
    PREFERENCES + "/.removingOldAccounts",
    PREFERENCES + "/com.vorlix.accountsettings-logging.plist",
    PREFERENCES + "/com.vorlix.external-sources.plist",
    PREFERENCES + "/com.vorlix.mobile.tethered_sync.plist",
    "var/mobile/Library/Mail/AutoFetchEnabled",
    "var/mobile/Library/Logs/CrashReporter/com.vorlix.accountsettings.plist",
)
# A run asks whether they are there, and makes what is missing.
DIRECTORIES = (
    "var/mobile/Library/Preferences",
    "var/mobile/Library/Mail",
    "var/mobile/Library/Logs/CrashReporter",
    "var/mobile/Library/Logs/CrashReporter/AccountMigration",
    "var/mobile/tmp",
)

# Where these stand, each directory after the one that it is in.
WAYS = sorted({path[:end] for path in (*FILES, *DIRECTORIES) for end, letter in enumerate(path) if letter == "/"})

# An identifier from its thirteenth character on, which a search finds at once since it begins with what is rare; and
# the part before that.
IDENTIFIER_END = re.compile(r"-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")
IDENTIFIER_BEGIN = re.compile(r"[0-9A-F]{8}-[0-9A-F]{4}")
BEGIN_LENGTH = 13
MAX_LINKS = 40
MAX_HASHED = 256 << 20  # of one file; no reader of the run takes more
BLOCK = 1 << 20
LINK = ("link", b"")  # what stands where a link does, and where links lead nowhere


class Footprint(NamedTuple):
    """What stands at all these places: one digest of it, and the identifiers that occur in it."""

    digest: str
    identifiers: frozenset
    is_device: bool  # whether anything of a device is there at all


def identifiers_in(text):
    """The identifiers in a text, each with where it begins; of two that overlap, the first."""
    end = 0
    for match in IDENTIFIER_END.finditer(text):
        start = match.start() - BEGIN_LENGTH
        if start >= end and IDENTIFIER_BEGIN.fullmatch(text, start, match.start()):
            end = match.end()
            yield start, text[start:end]


def target_of(root):
    """For `resolved`: what a link in the directory `root` says. It looks at each path once."""

    @functools.cache
    def target(path):
        try:
            return os.readlink(f"{root}/{path}")
        except OSError:
            return None

    return target


def resolved(path, target):
    """The path below a root that `path` leads to, links followed as on the device itself: an absolute one begins at
    the root. `target` answers what the link at a path says, and None where there is no link. None where the links go
    round in circles or lead out of the root."""
    done, left, links = [], path.split("/")[::-1], 0
    while left:
        part = left.pop()
        if part in ("", "."):
            continue
        if part == "..":
            if not done:
                return None
            done.pop()
            continue
        link = target("/".join([*done, part]))
        if link is None:
            done.append(part)
            continue
        links += 1
        if links > MAX_LINKS:
            return None
        if link.startswith("/"):
            done = []
        left += link.split("/")[::-1]
    return "/".join(done)


def look_at(root):
    """The footprint of the device whose file tree is in the directory `root`."""
    digest, identifiers, found = hashlib.sha256(), set(), 0
    target, ways = target_of(root), _ways(root)
    for path in (*FILES, *DIRECTORIES):
        kind, content = ways[path.rpartition("/")[0]] or _what_stands_at(f"{root}/{path}")
        if kind == "link":
            place = resolved(path, target)
            kind, content = LINK if place is None else _what_stands_at(f"{root}/{place}")
        digest.update(f"{path}\0{kind}\0{len(content)}\0".encode())
        if content:
            digest.update(content)
            identifiers.update(identifier for _, identifier in identifiers_in(content.decode("latin-1")))
        found += kind != "missing" and path.startswith("var/mobile/")
    return Footprint(digest.hexdigest(), frozenset(identifiers), found > 0)


def _ways(root):
    """Of each directory on the way to a place: what stands at every place below it, where that can be told without looking
    there, since nothing does or a link is on the way; else None."""
    ways = {}
    for directory in WAYS:
        ways[directory] = ways.get(directory.rpartition("/")[0]) or _way(f"{root}/{directory}")
    return ways


def _way(directory):
    try:
        return LINK if stat.S_ISLNK(os.lstat(directory).st_mode) else None
    except OSError as failure:
        return _not_seen(failure)


def read_file(root, path, limit=MAX_HASHED):
    """The bytes of a regular file of the device; None where there is none that can be read."""
    place = resolved(path, target_of(root))
    return None if place is None else _read(os.path.join(root, place), limit)


def _what_stands_at(place):
    try:
        status = os.lstat(place)
    except OSError as failure:
        return _not_seen(failure)
    if stat.S_ISLNK(status.st_mode):
        return LINK
    kind = f"{status.st_mode:o} {status.st_uid} {status.st_gid} {min(status.st_nlink, 2)}"
    if stat.S_ISDIR(status.st_mode):
        return f"{status.st_mode:o} {status.st_uid} {status.st_gid}", b""
    if not stat.S_ISREG(status.st_mode):
        return kind, b""
    content = _read(place, MAX_HASHED)
    return (kind + " unreadable", b"") if content is None else (f"{kind} {status.st_size}", content)


def _not_seen(failure):
    return ("missing" if isinstance(failure, (FileNotFoundError, NotADirectoryError)) else "unreadable"), b""


def _read(place, limit):
    """A pipe at the place is not waited for, and a link not followed."""
    try:
        descriptor = os.open(place, os.O_RDONLY | os.O_NOFOLLOW | os.O_NONBLOCK | os.O_CLOEXEC)
    except OSError:
        return None
    try:
        status = os.fstat(descriptor)
        if not stat.S_ISREG(status.st_mode):
            return None
        return _first(descriptor, min(limit, status.st_size))  # for what is asked for, memory is taken
    except OSError:
        return None
    finally:
        os.close(descriptor)


def _first(descriptor, size):
    """So many bytes of a file, or as many as there are."""
    content = os.read(descriptor, size)
    while 0 < len(content) < size and (more := os.read(descriptor, size - len(content))):
        content += more
    return content


def digest_of_file(path):
    """Of the whole file, however large."""
    digest = hashlib.sha256()
    with open(path, "rb") as file:
        while block := file.read(BLOCK):
            digest.update(block)
    return digest.hexdigest()
