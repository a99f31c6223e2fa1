"""Where the work is done: in processes of this machine, or on a cluster that is there already.

An engine maps a function over tasks: it takes them as it can use them, so that an endless number needs no more memory
than a few, and yields each with its result as it comes, in any order. A task whose process died each time it was tried
comes with the result DIED. Who has something else to do meanwhile is patient for so many seconds only: when nothing came
for as long, None is yielded. Among tasks, None says that there is none yet.
"""

import importlib.util
import itertools
import pickle
import queue
from collections import deque
from itertools import islice
from typing import NamedTuple

from migration_rehearse.pool import Pool, WorkerDied
from migration_rehearse.scratch import Scratch

DIED = object()
PACKAGE = __name__.partition(".")[0]
AHEAD = 16  # tasks given out for each worker of this machine, so that none waits for the next
AHEAD_OF_CLUSTER = 4


class EngineFault(Exception):
    """The engine that was asked for cannot be had."""


class _Engine:
    """What engines have in common. Several calls of `map` may be under way: each hears for the others, too."""

    def map(self, function, tasks, patience=None):
        waiting, answered, tasks = {}, deque(), iter(tasks)
        while True:
            for task in islice(tasks, max(0, self._ahead() - len(waiting))):
                if task is None:
                    break
                waiting[self._give(function, task, answered)] = task
            else:
                if not waiting:
                    return
                if not answered:
                    self._hear(patience)
            if not answered and patience is not None:
                yield None
            while answered:
                number, answer = answered.popleft()
                if isinstance(answer, Exception):
                    raise answer
                yield waiting.pop(number), answer

    def _ahead(self):
        """How many tasks may be given out and not answered."""
        raise NotImplementedError

    def _give(self, function, task, answered):
        """Lets a worker do it; its name comes into the deque `answered` with the answer, or the exception."""
        raise NotImplementedError

    def _hear(self, patience):
        """Waits for an answer to any of the calls, at most for so many seconds; there may be none."""
        raise NotImplementedError


class _Given(NamedTuple):
    """A task that is not answered yet."""

    message: bytes
    answered: deque  # gets its number and the answer


class LocalEngine(_Engine):
    """Processes of this machine. What they keep in temporary directories goes when the engine is closed."""

    def __init__(self, workers):
        self.workers = workers
        self._scratch = _scratch_for_all()
        self._numbers = itertools.count(1)
        self._given = {}  # by its number
        self._suspect = None  # the number of the task that is alone with a worker
        self._pool = self._new_pool(workers)

    def close(self):
        self._pool.close()
        self._scratch.cleanup()

    def _new_pool(self, workers):
        return Pool(workers, self._scratch.name)

    def _ahead(self):
        return self.workers * AHEAD

    def _give(self, function, task, answered):
        number = next(self._numbers)
        self._given[number] = _Given(pickle.dumps((number, function, task)), answered)
        if self._suspect is None:
            self._pool.give(self._given[number].message)
        return number

    def _hear(self, patience):
        try:
            for number, answer in self._pool.hear(patience):
                self._take(number, answer)
        except WorkerDied as died:
            if self._suspect is not None:
                self._take(self._suspect, DIED)
            elif died.task in self._given:
                self._begin_alone(died.task)
            else:
                self._begin_together()

    def _take(self, number, answer):
        self._given.pop(number).answered.append((number, answer))
        if number == self._suspect:
            self._begin_together()

    def _begin_alone(self, suspect):
        """The task that a worker died of, as it seems, is tried once more with nobody beside it."""
        self._pool.close()
        self._suspect = suspect
        self._pool = self._new_pool(1)
        self._pool.give(self._given[suspect].message)

    def _begin_together(self):
        """Everything is given to new workers, since which tasks the old ones took is not known for certain."""
        self._pool.close()
        self._suspect = None
        self._pool = self._new_pool(self.workers)
        for given in self._given.values():
            self._pool.give(given.message)


def _scratch_for_all():
    """So that it goes whatever becomes of the workers."""
    try:
        return Scratch()
    except OSError as failure:
        raise EngineFault(f"{failure.filename}: no temporary directory can be made: {failure.strerror}") from failure


class DaskEngine(_Engine):
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
        self._finished = queue.SimpleQueue()  # futures
        self._given = {}  # by the future's key: the deque that gets its result
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

    def _ahead(self):
        return max(16, AHEAD_OF_CLUSTER * sum(self._client.nthreads().values()))

    def _give(self, function, task, answered):
        future = self._client.submit(function, task, pure=False)
        self._given[future.key] = answered
        future.add_done_callback(self._finished.put)
        return future.key

    def _hear(self, patience):
        try:
            future = self._finished.get(timeout=patience)
        except queue.Empty:
            return
        self._given.pop(future.key).append((future.key, self._result(future)))

    def _result(self, future):
        try:
            return future.result()
        except self._distributed.KilledWorker:
            return DIED
        except Exception as raised:  # is for who gave the task
            return raised
        finally:
            future.release()
