"""Where the work is done: in processes of this machine, or on a cluster that is there already.

An engine maps a function over tasks: it takes them as it can use them, so that an endless number needs no more memory
than a few, and yields each with its result as it comes, in any order. A task whose process died each time it was tried
comes with the result DIED.
"""

import ctypes
import importlib.util
import os
import signal
from concurrent.futures import FIRST_COMPLETED, ProcessPoolExecutor, wait
from concurrent.futures.process import BrokenProcessPool
from itertools import islice

DIED = object()
PACKAGE = __name__.partition(".")[0]
PR_SET_PDEATHSIG = 1
AHEAD = 4  # tasks given out for each worker, so that none waits for the next


class EngineFault(Exception):
    """The engine that was asked for cannot be had."""


class LocalEngine:
    """Processes of this machine."""

    def __init__(self, workers):
        self.workers = workers
        self._executor = _executor(workers)

    def close(self):
        self._executor.shutdown(cancel_futures=True)

    def map(self, function, tasks):
        waiting, tasks = {}, iter(tasks)
        while True:
            for task in islice(tasks, self.workers * AHEAD - len(waiting)):
                executor = self._executor
                waiting[self._submit(function, task)] = (executor, task)
            if not waiting:
                return
            yield from self._finished(function, waiting)

    def _submit(self, function, task):
        try:
            return self._executor.submit(function, task)
        except BrokenProcessPool:
            self._executor = _executor(self.workers)
            return self._executor.submit(function, task)

    def _finished(self, function, waiting):
        for future in wait(waiting, return_when=FIRST_COMPLETED).done:
            executor, task = waiting.pop(future)
            try:
                yield task, future.result()
            except BrokenProcessPool:
                if executor is self._executor:
                    self._executor = _executor(self.workers)
                yield task, alone(function, task)


def alone(function, task):
    """A worker died, and any task that was under way may be why: each is tried with nobody beside it."""
    with _executor(1) as executor:
        try:
            return executor.submit(function, task).result()
        except BrokenProcessPool:
            return DIED


def _executor(workers):
    return ProcessPoolExecutor(workers, initializer=_begin_worker, initargs=(os.getpid(),))


def _begin_worker(parent):
    """Workers end with the program, however that ends; what the keyboard interrupts is the program."""
    signal.signal(signal.SIGINT, signal.SIG_IGN)
    signal.signal(signal.SIGTERM, signal.SIG_DFL)
    ctypes.CDLL(None).prctl(PR_SET_PDEATHSIG, signal.SIGKILL)
    if os.getppid() != parent:
        os._exit(0)


class DaskEngine:
    """The workers of a Dask scheduler, each of which has this package, the host and the images at the same paths.
    The scheduler gives the tasks of a worker that died to others, and gives up on a task after a few deaths."""

    def __init__(self, address):
        try:
            import distributed
        except ImportError as failure:
            raise EngineFault("--scheduler needs Dask distributed (the package python3-distributed)") from failure
        self._distributed = distributed
        try:
            self._client = distributed.Client(address, timeout=10)
        except (OSError, ValueError) as failure:
            raise EngineFault(f"no scheduler answers at {address}: {failure}") from failure
        self._try_workers()

    def _try_workers(self):
        """That each of those that are there has this package."""

        def has_package():  # goes to the workers as it stands, since they may have nothing of this module
            return importlib.util.find_spec(PACKAGE) is not None

        lacking = [worker for worker, has in self._client.run(has_package).items() if not has]
        if lacking:
            self._client.close()
            raise EngineFault(f"the worker {lacking[0]} lacks {PACKAGE}: put its directory on the PYTHONPATH there")

    def close(self):
        self._client.close()

    def map(self, function, tasks):
        tasks, waiting = iter(tasks), {}
        finished = self._distributed.as_completed()
        while True:
            for task in islice(tasks, self._ahead() - len(waiting)):
                future = self._client.submit(function, task, pure=False)
                waiting[future.key] = task
                finished.add(future)
            if not waiting:
                return
            future = next(finished)
            yield waiting.pop(future.key), self._result(future)

    def _ahead(self):
        return max(16, AHEAD * sum(self._client.nthreads().values()))

    def _result(self, future):
        try:
            return future.result()
        except self._distributed.KilledWorker:
            return DIED
        finally:
            future.release()
