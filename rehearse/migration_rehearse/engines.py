"""Where the work is done: in processes of this machine, or on a cluster that is there already.

An engine maps a function over tasks: it takes them as it can use them, so that an endless number needs no more memory
than a few, and yields each with its result as it comes, in any order. A task whose process died each time it was tried
comes with the result DIED.
"""

import importlib.util
import itertools
import pickle
import tempfile
from collections import deque
from itertools import islice
from typing import NamedTuple

from migration_rehearse.pool import Pool, WorkerDied

DIED = object()
PACKAGE = __name__.partition(".")[0]
AHEAD = 16  # tasks given out for each worker of this machine, so that none waits for the next
AHEAD_OF_CLUSTER = 4


class EngineFault(Exception):
    """The engine that was asked for cannot be had."""


class _Given(NamedTuple):
    """A task that is not answered yet."""

    message: bytes
    answered: deque  # gets its number and the answer


class LocalEngine:
    """Processes of this machine. What they keep in temporary directories goes when the engine is closed."""

    def __init__(self, workers):
        self.workers = workers
        self._scratch = _temporary_directory()
        self._numbers = itertools.count(1)
        self._given = {}  # by its number
        self._pool = self._new_pool(workers)

    def close(self):
        self._pool.close()
        if self._scratch:
            self._scratch.cleanup()

    def map(self, function, tasks):
        waiting, answered, tasks = {}, deque(), iter(tasks)
        while True:
            for task in islice(tasks, self.workers * AHEAD - len(waiting)):
                waiting[self._give(function, task, answered)] = task
            if not waiting:
                return
            while not answered:
                self._hear()
            number, answer = answered.popleft()
            if isinstance(answer, Exception):
                raise answer
            yield waiting.pop(number), answer

    def _new_pool(self, workers):
        return Pool(workers, self._scratch and self._scratch.name)

    def _give(self, function, task, answered):
        number = next(self._numbers)
        self._given[number] = _Given(pickle.dumps((number, function, task)), answered)
        self._pool.give(self._given[number].message)
        return number

    def _hear(self):
        try:
            for number, answer in self._pool.hear():
                self._given.pop(number).answered.append((number, answer))
        except WorkerDied as died:
            self._begin_anew(died.task)

    def _begin_anew(self, suspect):
        """The task that a worker died of, as it seems, is tried once more with nobody beside it; the others are given to
        new workers, since which of them the old ones took is not known for certain."""
        self._pool.close()
        if suspect in self._given:
            given = self._given.pop(suspect)
            given.answered.append((suspect, self._alone(given.message)))
        self._pool = self._new_pool(self.workers)
        for given in self._given.values():
            self._pool.give(given.message)

    def _alone(self, message):
        pool = self._new_pool(1)
        pool.give(message)
        try:
            while not (heard := pool.hear()):
                pass
            return heard[0][1]
        except WorkerDied:
            return DIED
        finally:
            pool.close()


def _temporary_directory():
    """For all workers, so that it goes whatever becomes of them. Where none can be made, who needs one says so."""
    try:
        return tempfile.TemporaryDirectory(prefix="migration-rehearse-", ignore_cleanup_errors=True)
    except OSError:
        return None


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
        return max(16, AHEAD_OF_CLUSTER * sum(self._client.nthreads().values()))

    def _result(self, future):
        try:
            return future.result()
        except self._distributed.KilledWorker:
            return DIED
        finally:
            future.release()
