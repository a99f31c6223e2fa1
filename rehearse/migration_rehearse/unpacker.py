"""The process that unpacks: archives are read there, one after another, under limits. One that is not as it should be takes
the process with it, so that none is unpacked by what another has spoilt."""

import json
import os
import resource
import select
import signal
import threading
import time

from migration_rehearse.faults import Fault
from migration_rehearse.pool import end_with
from migration_rehearse.unpacking import DEVICE, STAGING, Bounds, unpack_here

PAGE = os.sysconf("SC_PAGE_SIZE")
MOST_DETAIL = 500  # characters

_kept = threading.local()


def unpack(archive, scratch, bounds=Bounds()):
    """The root of the device in the archive, unpacked below the directory `scratch`, where nothing is but what was unpacked
    there before, which goes. Raises Fault."""
    staging, root = os.path.join(scratch, STAGING), os.path.join(scratch, DEVICE)
    for directory in (staging, root):
        os.makedirs(directory, exist_ok=True)
    try:
        fault = _unpacker(bounds).unpack(archive, scratch, bounds)
    except BrokenPipeError:  # it was killed while it had nothing to do
        close()
        fault = _unpacker(bounds).unpack(archive, scratch, bounds)
    if fault:
        close()
    for left in os.scandir(staging):
        os.unlink(left)
    if fault:
        raise Fault(*fault)
    return root


def _unpacker(bounds):
    if getattr(_kept, "unpacker", None) is None:
        _kept.unpacker = _Unpacker(bounds.memory)
    return _kept.unpacker


def close():
    """Ends the process of this thread, where there is one."""
    if getattr(_kept, "unpacker", None) is not None:
        _kept.unpacker.close()
    _kept.unpacker = None


class _Unpacker:
    def __init__(self, memory):
        import libarchive  # noqa: F401 (only who has archives needs it; here, so that the process after this has it, too)

        asked, asking = os.pipe()
        told, telling = os.pipe()
        parent = os.getpid()
        self._process = os.fork()
        if self._process == 0:
            os.close(asking)
            os.close(told)
            _work(parent, asked, telling, memory)
        os.close(asked)
        os.close(telling)
        self._requests, self._answers = open(asking, "wb", buffering=0), open(told, "rb")

    def close(self):
        os.kill(self._process, signal.SIGKILL)
        os.waitpid(self._process, 0)
        self._requests.close()
        self._answers.close()

    def unpack(self, archive, scratch, bounds):
        """The fault that it tells of, or died of; None where it succeeded. Raises BrokenPipeError where it is gone."""
        self._requests.write(json.dumps([archive, str(scratch), bounds]).encode() + b"\n")
        if not select.select([self._answers], [], [], bounds.seconds)[0]:
            return ("timeout", "while it was unpacked")
        answer = self._answers.readline()
        return json.loads(answer)[0] if answer else ("damaged-archive", "unpacking it crashed")


def _work(parent, asked, telling, memory):
    """The whole life of the process."""
    try:
        end_with(parent)
        _limit(resource.RLIMIT_AS, _size() + memory)
        _limit(resource.RLIMIT_CORE, 0)
        with open(asked, "rb") as requests, open(telling, "wb", buffering=0) as answers:
            for request in requests:
                archive, scratch, bounds = json.loads(request)
                answers.write(json.dumps([_fault_of(archive, scratch, Bounds(*bounds))]).encode() + b"\n")
    finally:
        os._exit(0)


def _fault_of(archive, scratch, bounds):
    _limit(resource.RLIMIT_CPU, int(time.process_time() + bounds.seconds) + 1)
    try:
        unpack_here(archive, scratch, bounds)
    except Fault as fault:
        return (fault.cause, fault.detail[:MOST_DETAIL])
    except MemoryError:
        return ("damaged-archive", "unpacking it takes too much memory")
    except OSError as failure:
        return ("unpacking-failed", failure.strerror or "")
    except Exception as failure:  # this process has nobody to tell but by this answer
        return ("damaged-archive", repr(failure)[:MOST_DETAIL])
    return None


def _size():
    with open("/proc/self/statm", encoding="ascii") as file:
        return int(file.read().split()[0]) * PAGE


def _limit(what, most):
    hard = resource.getrlimit(what)[1]
    resource.setrlimit(what, (most if hard == resource.RLIM_INFINITY else min(most, hard), hard))
