"""What `account_settings` is made of. Here: the C interface as Python calls it, functions by their name, and handles
that free themselves."""

from __future__ import annotations

import ctypes
from collections.abc import Iterator
from ctypes import POINTER, byref, c_bool, c_char_p, c_double, c_int, c_int32, c_int64, c_size_t, c_uint16, c_uint32
from ctypes import c_uint64, c_void_p
from enum import IntEnum
from typing import Any

CALLBACK = ctypes.CFUNCTYPE(None, c_void_p, c_void_p)
_library = ctypes.CDLL("libaccountsettings-client.so.1")


class Code(IntEnum):
    """Why something was not done.

    MISSING: the device has no accounts file
    NOT_MIGRATED: the accounts are an earlier release's; a migration has to upgrade them
    NEWER: the accounts are a later release's
    UNREADABLE: the file is no accounts file, or damaged
    REFUSED: somebody may have planted the accounts file or a lock file
    NO_PERMISSION: whoever runs the program may not do this
    BUSY: a migration or a change did not end within the time limit
    NESTED: this thread is changing the accounts already
    NO_SPACE: the disk or the user's share of it is full
    NOT_SAVED: the file could not be replaced for another reason
    WOULD_BE_DROPPED: an account could not be loaded again
    WOULD_DROP_OTHERS: a save would remove records that this release cannot load
    UNKNOWN_ACCOUNT: there is no account of this identifier
    ALREADY_THERE: there is an account of this identifier already
    UNSUITABLE: a value that cannot be
    CONFLICT: a program that takes no lock removed or added the account meanwhile
    CANCELLED: the change was given up by whoever asked for it; nothing in Python answers it
    FINISHED: the edit or the watch is over
    NOT_ANNOUNCED: saved, but those who listen could not be told
    NOT_WATCHED: the file's directory cannot be watched
    BROKEN_INSTALLATION: the library's own configuration or modules are missing
    NO_MEMORY: there is not enough memory; raised as MemoryError
    """

    MISSING = 1
    NOT_MIGRATED = 2
    NEWER = 3
    UNREADABLE = 4
    REFUSED = 5
    NO_PERMISSION = 6
    BUSY = 7
    NESTED = 8
    NO_SPACE = 9
    NOT_SAVED = 10
    WOULD_BE_DROPPED = 11
    WOULD_DROP_OTHERS = 12
    UNKNOWN_ACCOUNT = 13
    ALREADY_THERE = 14
    UNSUITABLE = 15
    CONFLICT = 16
    CANCELLED = 17
    FINISHED = 18
    NOT_ANNOUNCED = 19
    NOT_WATCHED = 20
    BROKEN_INSTALLATION = 21
    NO_MEMORY = 22


class AccountSettingsError(Exception):
    """Something was not done: `code` says why to the program, the text to people.

    The code is a `Code`, or a plain number where a later release of the library has a new one.
    """

    def __init__(self, code: int, sentence: str):
        super().__init__(sentence)
        self.code: int = Code(code) if code in list(Code) else code


# What each function answers and takes, without the error that the last ones of the table tell by.
_TEXT, _HANDLE, _SIZE = c_char_p, c_void_p, c_size_t
_PLAIN: dict[str, tuple[Any, ...]] = {
    "error_code": (c_int32, _HANDLE), "error_sentence": (_TEXT, _HANDLE),
    "accounts_count": (_SIZE, _HANDLE), "accounts_at": (_HANDLE, _HANDLE, _SIZE),
    "accounts_find": (_HANDLE, _HANDLE, _TEXT), "accounts_find_sync": (_HANDLE, _HANDLE, _TEXT),
    "accounts_of_type": (_HANDLE, _HANDLE, _TEXT), "accounts_with_dataclass": (_HANDLE, _HANDLE, _TEXT),
    **{f"account_{name}": (_TEXT, _HANDLE) for name in (
        "identifier", "type", "class", "display_name", "username", "sync_identifier", "parent")},
    **{f"account_{name}": (_HANDLE, _HANDLE) for name in ("children", "supported", "enabled", "properties")},
    "accounts_version": (c_uint64, _HANDLE), "accounts_unreadable": (_SIZE, _HANDLE),
    "account_service": (c_bool, _HANDLE, POINTER(c_char_p), POINTER(c_uint16), POINTER(c_bool)),
    "account_lists_dataclasses": (c_bool, _HANDLE), "account_text": (_TEXT, _HANDLE, _TEXT),
    "account_is_enabled": (c_bool, _HANDLE, _TEXT), "account_property": (_HANDLE, _HANDLE, _TEXT),
    "account_integer": (c_bool, _HANDLE, _TEXT, POINTER(c_int64)),
    "account_boolean": (c_bool, _HANDLE, _TEXT, POINTER(c_bool)),
    "value_kind": (c_int32, _HANDLE), "value_text": (_TEXT, _HANDLE),
    "value_integer": (c_bool, _HANDLE, POINTER(c_int64)), "value_unsigned": (c_bool, _HANDLE, POINTER(c_uint64)),
    "value_real": (c_bool, _HANDLE, POINTER(c_double)), "value_boolean": (c_bool, _HANDLE, POINTER(c_bool)),
    "value_date": (c_bool, _HANDLE, POINTER(c_double)), "value_data": (_HANDLE, _HANDLE, POINTER(_SIZE)),
    "value_count": (_SIZE, _HANDLE), "value_at": (_HANDLE, _HANDLE, _SIZE), "value_key_at": (_TEXT, _HANDLE, _SIZE),
    "value_of_text": (_HANDLE, _TEXT), "value_of_integer": (_HANDLE, c_int64), "value_of_unsigned": (_HANDLE, c_uint64),
    "value_of_real": (_HANDLE, c_double), "value_of_boolean": (_HANDLE, c_bool), "value_of_date": (_HANDLE, c_double),
    "value_of_data": (_HANDLE, _TEXT, _SIZE), "value_of_list": (_HANDLE,), "value_of_dictionary": (_HANDLE,),
    "value_append": (c_bool, _HANDLE, _HANDLE), "value_set": (c_bool, _HANDLE, _TEXT, _HANDLE),
    "edit_accounts": (_HANDLE, _HANDLE), "edit_find": (_HANDLE, _HANDLE, _TEXT), "edit_rewrite": (None, _HANDLE),
    "changes_count": (_SIZE, _HANDLE), "changes_kind": (c_int32, _HANDLE, _SIZE),
    "changes_account": (_HANDLE, _HANDLE, _SIZE), "changes_key": (_TEXT, _HANDLE, _SIZE, _SIZE),
    "changes_key_count": (_SIZE, _HANDLE, _SIZE),
    "changes_not_announced": (_TEXT, _HANDLE),
    "watch_descriptor": (c_int, _HANDLE), "watch_dispatch": (None, _HANDLE),
    **{name + "free": (None, _HANDLE) for name in (
        "", "error_", "account_", "accounts_", "value_", "edit_", "changes_", "watch_")},
}
_FAILING: dict[str, tuple[Any, ...]] = {
    "open_at": (_HANDLE, _TEXT, _TEXT, _TEXT, c_int64, c_uint32, c_void_p, c_void_p),
    "look": (_HANDLE, _HANDLE), "edit_begin": (_HANDLE, _HANDLE), "trial_begin": (_HANDLE, _HANDLE),
    "wait_for_migration": (c_bool, _TEXT, c_int64),
    "will_change": (c_bool, _HANDLE, _HANDLE, _TEXT), "did_change": (c_bool, _HANDLE, _HANDLE, _TEXT),
    "edit_add": (_HANDLE, _HANDLE, _TEXT, _TEXT, _HANDLE, _TEXT), "edit_remove": (c_bool, _HANDLE, _TEXT),
    "edit_set": (c_bool, _HANDLE, _TEXT, _TEXT, _HANDLE), "edit_erase": (c_bool, _HANDLE, _TEXT, _TEXT),
    "edit_set_enabled": (c_bool, _HANDLE, _TEXT, _TEXT, c_bool), "edit_save": (_HANDLE, _HANDLE),
    "watch_begin": (_HANDLE, _HANDLE, _HANDLE, CALLBACK, c_void_p, c_int32),
}


def _declared(name: str, signature: tuple[Any, ...], *more: Any) -> Any:
    function = getattr(_library, "account_settings_" + name)
    function.restype, *arguments = signature
    function.argtypes = [*arguments, *more]
    return function


_functions = {name: _declared(name, signature) for name, signature in _PLAIN.items()}
_attempts = {name: _declared(name, signature, POINTER(_HANDLE)) for name, signature in _FAILING.items()}


class Handle:
    """What the library handed out, freed when nobody has it any more."""

    def __init__(self, kind: str, pointer: int):
        self._kind, self._pointer = kind, pointer
        self._free = _functions[kind + "_free" if kind else "free"]

    @property
    def pointer(self) -> int:
        if not self._pointer:
            raise AccountSettingsError(Code.FINISHED, f"the {self._kind} is over")
        return self._pointer

    @property
    def is_held(self) -> bool:
        return bool(self._pointer)

    def free(self) -> None:
        if pointer := self.forget():
            self._free(pointer)

    def forget(self) -> int:
        """What is to be freed by somebody else, or by nobody."""
        pointer, self._pointer = self._pointer, 0
        return pointer

    def __del__(self) -> None:
        self.free()


def handle(kind: str, pointer: int | None) -> Handle:
    """The handle of what was handed out; nothing is handed out for want of memory only."""
    if not pointer:
        raise MemoryError
    return Handle(kind, pointer)


def _given(arguments: tuple[Any, ...]) -> Iterator[Any]:
    return (each.pointer if isinstance(each, Handle) else each for each in arguments)


def call(name: str, *arguments: Any) -> Any:
    return _functions[name](*_given(arguments))


def text(name: str, *arguments: Any) -> str | None:
    """The text that the function answers, or none."""
    answer: bytes | None = call(name, *arguments)
    return answer.decode() if answer is not None else None


def attempt(name: str, *arguments: Any) -> Any:
    """What the function answers, or the error that it tells."""
    error = c_void_p()
    answer = _attempts[name](*_given(arguments), byref(error))
    if not error.value:
        if not answer:
            raise MemoryError
        return answer
    told = Handle("error", error.value)
    code = call("error_code", told)
    if code == Code.NO_MEMORY:
        raise MemoryError
    raise AccountSettingsError(code, text("error_sentence", told) or "")


def encoded(text: str) -> bytes:
    """The text for C, which ends it at the first NUL."""
    if "\0" in text:
        raise ValueError("a text with a NUL")
    return text.encode()
