"""Processes that work for this one. They take tasks from one queue, so that none waits while there is something to do, and
each answers by a pipe of its own."""

import ctypes
import gc
import mmap
import multiprocessing
import os
import pickle
import select
import signal
import socket
import struct
import tempfile
from collections import deque

PR_SET_PDEATHSIG = 1
NUMBER = struct.Struct("q")
LONGEST_MESSAGE = 1 << 16  # bytes; a longer one goes by a file
PIPE_SIZE = 1 << 16  # bytes that the kernel keeps in one


class WorkerDied(Exception):
    """`task` is the number of what it was at, or had just done; 0 where it had not begun."""

    def __init__(self, task):
        super().__init__()
        self.task = task


class Pool:
    """Workers, none of which is of use when one has died. A task is a message: its number from 1, a function and what that
    is given, pickled. `scratch` is where they make their temporary directories."""

    def __init__(self, workers, scratch):
        self._tasks, theirs = socket.socketpair(socket.AF_UNIX, socket.SOCK_SEQPACKET)
        self._tasks.setblocking(False)
        self._unsent = deque()
        self._taken = mmap.mmap(-1, NUMBER.size * workers)  # shared: the task that each worker has taken
        self._workers = [_Worker(theirs, self._taken, place, scratch) for place in range(workers)]
        theirs.close()
        self._by_descriptor = {worker.answers: worker for worker in self._workers}
        self._poll = select.poll()
        for descriptor in self._by_descriptor:
            self._poll.register(descriptor, select.POLLIN)

    def close(self):
        """Ends them, whatever they are at."""
        self._tasks.close()
        while self._workers:
            self._workers.pop().end()

    def give(self, message):
        """For the first that has time. Does not wait."""
        self._unsent.append(message)
        self._send()

    def hear(self, seconds=None):
        """Waits until something is said, or for so long: answers, each the number of the task and what the function
        answered or raised. There may be none. Raises WorkerDied."""
        self._poll.register(self._tasks, select.POLLOUT if self._unsent else 0)
        answers = []
        for descriptor, _ in self._poll.poll(None if seconds is None else 1000 * seconds):
            if descriptor == self._tasks.fileno():
                self._send()
            else:
                answers += self._by_descriptor[descriptor].hear()
        if not answers:
            self._look_for_dead()
        return answers

    def _look_for_dead(self):
        for place, worker in enumerate(self._workers):
            if worker.is_dead:
                raise WorkerDied(NUMBER.unpack_from(self._taken, NUMBER.size * place)[0])

    def _send(self):
        try:
            while self._unsent:
                _send_message(self._tasks, self._unsent[0])
                self._unsent.popleft()
        except (BlockingIOError, ConnectionError):
            pass  # the queue is full; or all are dead, which is heard


class _Worker:
    """A worker as the others see it."""

    def __init__(self, tasks, taken, place, scratch):
        self.answers, telling = os.pipe()
        self.is_dead = False
        self._heard = bytearray()
        self._process = multiprocessing.get_context("fork").Process(
            target=_work, args=(os.getpid(), tasks, telling, taken, place, scratch), daemon=True)
        self._process.start()
        os.close(telling)

    def end(self):
        self._process.kill()
        self._process.join()
        os.close(self.answers)

    def hear(self):
        block = os.read(self.answers, PIPE_SIZE)
        self.is_dead = not block
        self._heard += block
        answers, end = [], 0
        while (begin := end + NUMBER.size) <= len(self._heard):
            length = NUMBER.unpack_from(self._heard, end)[0]
            if begin + length > len(self._heard):
                break
            end = begin + length
            answers.append(pickle.loads(self._heard[begin:end]))
        del self._heard[:end]
        return answers


def end_with(parent):
    """This process, which the one of this number has just made, ends with it, however that ends. What the keyboard
    interrupts is the program."""
    signal.signal(signal.SIGINT, signal.SIG_IGN)
    signal.signal(signal.SIGTERM, signal.SIG_DFL)
    ctypes.CDLL(None).prctl(PR_SET_PDEATHSIG, signal.SIGKILL)
    if os.getppid() != parent:
        os._exit(0)


def _work(parent, tasks, telling, taken, place, scratch):
    """The whole life of a worker."""
    end_with(parent)
    gc.freeze()  # what the program had before is not looked through for each image
    _stay_on_a_core(place)
    os.environ["TMPDIR"] = tempfile.tempdir = scratch
    with open(telling, "wb") as answers:
        while message := _message_from(tasks):
            number, function, task = pickle.loads(message)
            NUMBER.pack_into(taken, NUMBER.size * place, number)
            answer = pickle.dumps((number, _answer(function, task)))
            answers.write(NUMBER.pack(len(answer)) + answer)
            answers.flush()


def _stay_on_a_core(place):
    """The worker, and the host that it starts with all of its children. Each waits for the other, so more cores would do no
    more, and what one leaves in a core's caches is of use to the next."""
    cores = sorted(os.sched_getaffinity(0))
    os.sched_setaffinity(0, {cores[place % len(cores)]})


def _answer(function, task):
    try:
        return function(task)
    except Exception as raised:  # is for who gave the task
        return raised


def _send_message(to, message):
    if len(message) <= LONGEST_MESSAGE:
        to.send(message)
        return
    with open(os.memfd_create("task"), "w+b", buffering=0) as file:
        file.write(message)
        file.seek(0)
        socket.send_fds(to, [b" "], [file.fileno()])


def _message_from(tasks):
    """The next; an empty one when no more will come."""
    message, files, _, _ = socket.recv_fds(tasks, LONGEST_MESSAGE, 1)
    if not files:
        return message
    with open(files[0], "rb") as file:
        return file.read()
