"""Waiting in short pieces: Python hears Ctrl-C between two calls of the library only."""

from __future__ import annotations

import math
from collections.abc import Callable
from time import monotonic
from typing import Any

from . import AccountSettingsError, Code, attempt

_PIECE = 0.2
_LONG_WAIT = 1.0
_MOST = 2**63 / 1000  # which the library counts in milliseconds


def _holder(sentence: str) -> str:
    return sentence.partition(" for ")[2].rpartition(": ")[0] or sentence


class Patience:
    """How long is waited for others, and who is told of it."""

    def __init__(self, time_limit: float | None, while_waiting: Callable[[str], object] | None):
        limit = math.inf if time_limit is None else time_limit
        if not (0 <= limit < _MOST or limit == math.inf):
            raise ValueError(f"{time_limit!r} is no time limit: neither None nor a number of seconds from 0 on")
        self._limit = limit
        self._tell = while_waiting
        self.piece = _PIECE if limit == math.inf else limit / max(1, math.ceil(limit / _PIECE))

    @property
    def milliseconds(self) -> int:
        """The length of a piece, for the library."""
        return math.ceil(self.piece * 1000)

    def attempt(self, name: str, *arguments: Any) -> Any:
        """What the function answers that waits for the length of a piece, called until the time limit is over."""
        began, is_told = monotonic(), False
        while True:
            try:
                return attempt(name, *arguments)
            except AccountSettingsError as busy:
                waited = monotonic() - began
                if busy.code != Code.BUSY or waited + self.piece / 2 >= self._limit:
                    raise
                if self._tell is not None and waited >= _LONG_WAIT and not is_told:
                    is_told = True
                    self._tell("waiting for " + _holder(str(busy)))
