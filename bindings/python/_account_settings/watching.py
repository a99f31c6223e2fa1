"""Being told of changes."""

from __future__ import annotations

import atexit
import os
from collections.abc import Callable
from itertools import count
from types import TracebackType
from typing import Self
from weakref import WeakValueDictionary

from . import CALLBACK, Handle, attempt, call, handle
from .changing import Change, changes_of
from .looking import Accounts

# By the number that the library calls with; the function it calls stays for as long as the process.
_watches: WeakValueDictionary[int, Watch] = WeakValueDictionary()
_numbers = count(1)


def _tell(changes: int, number: int) -> None:
    watch = _watches.get(number)
    if watch is not None:
        watch._callback(changes_of(changes)[0])


_TELL = CALLBACK(_tell)

class Watch:
    """Tells of each change until it is closed, dropped, or the program ends; to be used in a `with` statement.

    Any thread may close it. Where it has no thread of its own, one thread at a time asks for its descriptor, dispatches
    or closes it, or the callback does. What is asked of it after it was closed raises FINISHED. A forked child does not
    watch: there it is over.
    """

    def _begun(
        self, settings: Handle, since: Accounts, callback: Callable[[Change], object], own_thread: bool
    ) -> Self:
        self._callback = callback
        number = next(_numbers)
        _watches[number] = self  # which may be called before the library answers
        try:
            begun = attempt("watch_begin", settings, since._handle, _TELL, number, 0 if own_thread else 1)
        except BaseException:
            del _watches[number]
            raise
        self._handle = handle("watch", begun)
        return self

    def fileno(self) -> int:
        """For `select` and event loops: readable when there is something to dispatch. -1 with a thread of its own."""
        return int(call("watch_descriptor", self._handle))

    def dispatch(self) -> None:
        """Calls the callback for what changed since the last time, and returns."""
        call("watch_dispatch", self._handle)

    def close(self) -> None:
        """From then on nothing is called; waits for a call that is under way in another thread. May be called again."""
        self._handle.free()

    def __enter__(self) -> Watch:
        return self

    def __exit__(self, kind: type | None, error: BaseException | None, trace: TracebackType | None) -> None:
        self.close()


@atexit.register
def _close_watches() -> None:
    for watch in list(_watches.values()):
        watch.close()


def _forget_watches() -> None:
    for watch in list(_watches.values()):
        watch._handle.forget()


os.register_at_fork(after_in_child=_forget_watches)
