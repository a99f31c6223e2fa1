"""Hosts that stay: one process that has loaded everything rehearses image after image, each in a child of its own.

What comes of an image is the same as from a host that is started for it alone, at a fraction of the cost. A host that
does not know how to serve, such as one of an earlier release, is started for each image."""

import contextlib
import json
import os
import select
import subprocess
import threading
import time

from migration_rehearse import host
from migration_rehearse.pool import PIPE_SIZE

ENVIRONMENT = {**host.ENVIRONMENT, "LD_BIND_NOW": "1"}  # what is looked up before the fork is looked up once
SERVE = "--serve-rehearsals"
GREETING = {"serves": "rehearsals", "protocol": 1}
SECONDS_TO_GREET = 20
SECONDS_TO_LIMIT = 10  # beyond an image's own, after which it is the server that hangs


class ServerLost(Exception):
    """It ended, or says what makes no sense, before it answered."""


class Server:
    """One host that serves. Raises ServerLost where it does not."""

    def __init__(self, command):
        self.command = command
        self._process = subprocess.Popen(command, env=ENVIRONMENT, stdin=subprocess.PIPE, stdout=subprocess.PIPE,
                                         stderr=subprocess.DEVNULL, start_new_session=True)
        self._said = bytearray()
        self._poll = select.poll()
        self._poll.register(self._process.stdout, select.POLLIN)
        try:
            greeting = self._line(time.monotonic() + SECONDS_TO_GREET)
            if not isinstance(greeting, dict) or GREETING.items() - greeting.items():
                raise ServerLost("it does not serve")
        except BaseException:
            self.close()
            raise

    def close(self):
        """Ends it, whatever it is at."""
        self._process.kill()
        with contextlib.suppress(BrokenPipeError):  # a request that it died before it took
            self._process.stdin.close()
        self._process.stdout.close()
        self._process.wait()

    def rehearse(self, root, limits):
        """Answers how the rehearsal ended, as host.run does."""
        given = {"root": root, "seconds": limits.seconds, "memory": limits.memory, "output": limits.output}
        request = json.dumps({name: value for name, value in given.items() if value})
        deadline = time.monotonic() + limits.seconds + SECONDS_TO_LIMIT if limits.seconds else None
        try:
            self._process.stdin.write(request.encode() + b"\n")
            self._process.stdin.flush()
            told = self._line(deadline)
            output, errors = self._bytes(told["output"], deadline), self._bytes(told["errors"], deadline)
            return host.Ended(told["status"], told["stopped"], output, errors, told["seconds"],
                              told["processorSeconds"], told["peakMemory"])
        except (OSError, KeyError, TypeError) as failure:
            raise ServerLost(str(failure)) from failure

    def _line(self, deadline):
        while (end := self._said.find(b"\n")) < 0:
            self._hear(deadline)
        try:
            return json.loads(self._take(end + 1))
        except ValueError as failure:
            raise ServerLost("it talks nonsense") from failure

    def _bytes(self, count, deadline):
        while len(self._said) < count:
            self._hear(deadline)
        return self._take(count)

    def _take(self, count):
        taken = bytes(self._said[:count])
        del self._said[:count]
        return taken

    def _hear(self, deadline):
        left = None if deadline is None else max(0, deadline - time.monotonic()) * 1000
        heard = os.read(self._process.stdout.fileno(), PIPE_SIZE) if self._poll.poll(left) else b""
        if not heard:
            raise ServerLost("it says nothing")
        self._said += heard


class _Kept(threading.local):
    """The server that this thread has, by the command that started it; none where that one does not serve."""

    command = None
    server = None


_kept = _Kept()


def rehearse(program, root, limits):
    """How the rehearsal of the image at `root` by this host ended. Raises ServerLost where the host that serves was lost
    with the image, and the one after it, too."""
    user = host.as_mobile(root)
    server = _server([*user, *program.serving(limits)]) if _is_text(root) else None
    if server is None:
        return host.run([*user, *program.command(root, limits)], limits)
    try:
        return server.rehearse(root, limits)
    except ServerLost:
        return _rehearse_anew(server.command, root, limits)


def _rehearse_anew(command, root, limits):
    close()
    server = _server(command)
    if server is None:
        raise ServerLost("it does not start again")
    try:
        return server.rehearse(root, limits)
    except ServerLost:
        close()
        raise


def _is_text(root):
    """Whether a request can name it."""
    try:
        return bool(root.encode())
    except UnicodeEncodeError:
        return False


def _server(command):
    if _kept.command != command:
        close()
        _kept.command = command
        try:
            _kept.server = Server(command)
        except (ServerLost, OSError):
            _kept.server = None
    return _kept.server


def close():
    """Ends the server of this thread, where there is one."""
    if _kept.server is not None:
        _kept.server.close()
    _kept.command, _kept.server = None, None
