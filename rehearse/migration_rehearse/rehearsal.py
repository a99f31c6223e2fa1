"""One image, identified and rehearsed. Both functions run in whatever process or machine an engine gives them, and
answer the same wherever that is."""

import functools
import hashlib
import json
import os
import platform
import stat
import threading
import zlib
from typing import NamedTuple

from migration_rehearse import explained, footprint, host, serving, unpacker, unpacking
from migration_rehearse.faults import NO_CONTENTS, Fault
from migration_rehearse.scratch import Scratch

DIRECTORY, ARCHIVE = "directory", "archive"
ENDED = {0, 1, 6, 7}  # what the host ends with where the plug-in was called
REFUSED = 8  # before it was called, since something is wrong with the device
GIVEN_UP = "wait any longer for "  # what the host says of a lock that it did not get in time
REHEARSAL_NOTICE = "this is a rehearsal"
NEAR = 0.75
COMPRESSION = 2  # the fastest that still takes nearly what the best does
MAX_CONSOLE = 200  # lines that are kept


class Image(NamedTuple):
    """One image that was asked for, and what the results remember of it: of an archive, by which size and time it was
    what it is."""

    path: str
    signature: str = ""
    content: str = ""


class Identified(NamedTuple):
    """What an image is. `content` names what is in it, the same for the same contents."""

    path: str
    kind: str
    signature: str
    content: str
    fault: tuple = ()
    identifiers: frozenset = frozenset()  # of a directory: those that occur in it


class Task(NamedTuple):
    """One image to be rehearsed by the host with this digest."""

    path: str
    kind: str
    content: str
    host: host.Host
    digest: str
    limits: host.Limits
    bounds: unpacking.Bounds
    identifiers: frozenset = frozenset()


class Rehearsed(NamedTuple):
    """What came of it, as the results keep it. `cause` is a code of faults.CAUSES where the verdict is "unrehearsed"."""

    verdict: str
    cause: str = ""
    detail: str = ""
    status: int | None = None
    stored_version: int | None = None
    accounts: int | None = None
    counts: dict = {}
    losses: dict = {}
    facts: dict = {}
    seconds: float = 0
    processor_seconds: float = 0
    peak_memory: int = 0
    fingerprint: bytes = b""
    document: bytes = b""  # JSON, compressed: {"console": [...], "explanation": {...}}


def unrehearsed(cause, detail="", **measured):
    return Rehearsed("unrehearsed", cause, detail, **measured)


def identify(images):
    """What each of these images is."""
    return [_identify(image) for image in images]


def _identify(image):
    try:
        status = os.stat(image.path)
        if stat.S_ISDIR(status.st_mode):
            return _identify_directory(image.path)
        if not stat.S_ISREG(status.st_mode):
            return _faulty(image.path, "not-an-image")
        signature = f"{status.st_size} {status.st_mtime_ns} {status.st_ino}"
        is_known = image.content and signature == image.signature
        content = image.content if is_known else "archive:" + footprint.digest_of_file(image.path)
        return Identified(image.path, ARCHIVE, signature, content)
    except FileNotFoundError:
        return _faulty(image.path, "missing")
    except OSError as failure:
        return _faulty(image.path, "unreadable", failure.strerror or "")


def _identify_directory(path):
    os.scandir(path).close()
    looked = footprint.look_at(path)
    if not looked.is_device:
        return _faulty(path, "no-device")
    return Identified(path, DIRECTORY, "", "directory:" + looked.digest, (), looked.identifiers)


def _faulty(path, cause, detail=""):
    """What is not there has no contents: it is named by its place."""
    return Identified(path, "", "", NO_CONTENTS + hashlib.sha256(os.fsencode(path)).hexdigest(), (cause, detail))


def rehearse(task):
    """What the run would do to the image. Every fault of the image is an answer; raises HostUnusable where the host is
    another one here than where the task was made."""
    if digest_here(task.host) != task.digest:
        raise host.HostUnusable(f"{task.host.program} on {platform.node()} is another build")
    try:
        if task.kind == DIRECTORY:
            return _rehearse_tree(task, os.path.abspath(task.path), task.identifiers)
        root = unpacker.unpack(task.path, scratch(), task.bounds)
        return _rehearse_tree(task, root, footprint.look_at(root).identifiers)
    except Fault as fault:
        return unrehearsed(fault.cause, fault.detail)
    except OSError as failure:
        return unrehearsed("unpacking-failed", failure.strerror or "")


_kept = threading.local()


def scratch():
    """Where this thread unpacks archive after archive."""
    if not hasattr(_kept, "scratch"):
        _kept.scratch = Scratch()
    return _kept.scratch.name


@functools.cache
def digest_here(program):
    """The digest of a host, reckoned once in a process."""
    return program.digest()


def _rehearse_tree(task, root, identifiers):
    try:
        ended = serving.rehearse(task.host, root, task.limits)
    except serving.ServerLost as lost:
        return unrehearsed("worker-died", str(lost))
    measured = {"status": ended.status, "seconds": ended.seconds, "processor_seconds": ended.processor_seconds,
                "peak_memory": ended.peak_memory}
    errors = explained.lasting(ended.errors.decode(errors="replace"), root, identifiers)
    console = [line for line in errors.splitlines() if REHEARSAL_NOTICE not in line][:MAX_CONSOLE]
    if ended.stopped or ended.status < 0:
        cause = ended.stopped or ("memory" if _ran_out_of_memory(ended, task.limits) else "crashed")
        return unrehearsed(cause, _why_it_died(ended, console), **measured)
    if ended.status != 0 and _ran_out_of_memory(ended, task.limits):
        return unrehearsed("memory", " / ".join(console[-1:]), **measured)
    if ended.status == REFUSED and GIVEN_UP in " ".join(console[-1:]):
        return unrehearsed("locked", console[-1], **measured)
    if ended.status == REFUSED:
        return Rehearsed("refused", detail=" / ".join(console[-1:]), **_packed({"console": console}), **measured)
    if ended.status not in ENDED:
        return unrehearsed("no-explanation", f"status {ended.status}: {' / '.join(console[-1:])}", **measured)
    return _read(explained.lasting(ended.output.decode(errors="replace"), root, identifiers), console, measured)


def _ran_out_of_memory(ended, limits):
    """Who fails beside the limit fails for it: nothing else tells whether it was the limit or the device."""
    return bool(limits.memory) and (ended.peak_memory > NEAR * limits.memory or b"out of memory" in ended.errors)


def _why_it_died(ended, console):
    return f"signal {-ended.status}" if ended.status < 0 and not ended.stopped else " / ".join(console[-1:])


def _read(text, console, measured):
    try:
        told = explained.explained(json.loads(text))
    except (ValueError, KeyError, TypeError, AttributeError, RecursionError):
        return unrehearsed("no-explanation", " / ".join(console[-1:]), **measured)
    return Rehearsed(
        told.verdict, stored_version=told.stored_version, accounts=told.accounts, counts=told.counts,
        losses=dict(told.losses), facts=dict(told.facts),
        **_packed({"console": console, "explanation": told.document}), **measured,
    )


def _packed(document):
    text = json.dumps(document, ensure_ascii=False, separators=(",", ":")).encode(errors="backslashreplace")
    return {"fingerprint": hashlib.sha256(text).digest()[:16], "document": zlib.compress(text, COMPRESSION)}
