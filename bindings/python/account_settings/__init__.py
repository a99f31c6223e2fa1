"""The accounts of a device: look at them, change them, watch them.

    from account_settings import AccountSettings

    settings = AccountSettings()
    for account in settings.accounts:
        print(account.identifier, account.type, account.display_name)

    with settings.edit() as edit:
        edit["0B6C2A51"]["DisplayName"] = "Work"

    with settings.watch(lambda change: print(change.kind, change.account.identifier)):
        input()

What goes wrong raises an `AccountSettingsError` with a `code` (a `Code`) and a sentence. Any thread may use the
settings; an edit belongs to one thread at a time.
"""

from __future__ import annotations

import atexit
import ctypes
import os
from collections.abc import Callable, Iterator, Mapping
from dataclasses import dataclass
from enum import IntEnum
from itertools import count
from os import PathLike, fspath
from types import TracebackType
from typing import Any
from weakref import WeakValueDictionary

from . import _library as _c
from ._library import AccountSettingsError, Code, Property

__all__ = [
    "Account", "AccountSettings", "AccountSettingsError", "Accounts", "Change", "Code", "Edit", "EditedAccount", "Kind",
    "Property", "Service", "Watch",
]


@dataclass(frozen=True)
class Service:
    """Where the service behind an account is reached."""

    host: str
    port: int
    is_secure: bool


class Account(Mapping[str, Property]):
    """An account as it was when it was looked at: a mapping of its own properties. It never changes."""

    def __init__(self, handle: _c.Handle):
        self._handle = handle

    @property
    def identifier(self) -> str | None:
        """None while the file gives it none; its next save does."""
        return self._text("identifier")

    @property
    def type(self) -> str | None:
        """Such as "Mail"."""
        return self._text("type")

    @property
    def account_class(self) -> str | None:
        """The class of its full account, such as "IMAPAccount"."""
        return self._text("class")

    @property
    def display_name(self) -> str | None:
        """What the user calls it; a child's is its parent's where it has none itself."""
        return self._text("display_name")

    @property
    def username(self) -> str | None:
        """The name to sign in with."""
        return self._text("username")

    @property
    def sync_identifier(self) -> str | None:
        """What names its sync store."""
        return self._text("sync_identifier")

    @property
    def parent(self) -> str | None:
        """The identifier of its parent; None for a top-level account."""
        return self._text("parent")

    @property
    def children(self) -> list[Account]:
        """Its child accounts, in the file's order."""
        return list(Accounts(_c.handle("accounts", _c.call("account_children", self._handle))))

    @property
    def supported_dataclasses(self) -> list[str]:
        """The data classes that accounts of its type can have."""
        return _c.python_value(_c.call("account_supported", self._handle))

    @property
    def enabled_dataclasses(self) -> list[str]:
        """Those that are switched on and not forbidden on this device; a child has its parent's where that has any."""
        return _c.python_value(_c.call("account_enabled", self._handle))

    def is_enabled(self, dataclass: str) -> bool:
        """Whether the data class is switched on."""
        return _c.call("account_is_enabled", self._handle, _c.encoded(dataclass))

    @property
    def service(self) -> Service | None:
        """What the account's module knows of its service; None where no module may be opened, or none can tell."""
        host, port, is_secure = ctypes.c_char_p(), ctypes.c_uint16(), ctypes.c_bool()
        places = (ctypes.byref(each) for each in (host, port, is_secure))
        if not _c.call("account_service", self._handle, *places):
            return None
        return Service((host.value or b"").decode(), port.value, is_secure.value)

    def property(self, key: str) -> Property | None:
        """The value of a property; a child has its parent's where it has none itself. None where there is none."""
        value = _c.call("account_property", self._handle, _c.encoded(key))
        return _c.python_value(value) if value else None

    def integer(self, key: str) -> int | None:
        """The property as a number, also where it is a text that begins with one."""
        place = ctypes.c_int64()
        return place.value if _c.call("account_integer", self._handle, _c.encoded(key), ctypes.byref(place)) else None

    def boolean(self, key: str) -> bool | None:
        """The property as a truth, also where it is a number, or a text such as "yes"."""
        place = ctypes.c_bool()
        return place.value if _c.call("account_boolean", self._handle, _c.encoded(key), ctypes.byref(place)) else None

    def __getitem__(self, key: str) -> Property:
        return self._properties()[key]

    def __iter__(self) -> Iterator[str]:
        return iter(self._properties())

    def __len__(self) -> int:
        return len(self._properties())

    def __repr__(self) -> str:
        return f"<{type(self).__name__} {self.identifier} {self.type} {self.display_name!r}>"

    def _text(self, name: str) -> str | None:
        text = _c.call("account_" + name, self._handle)
        return text.decode() if text is not None else None

    def _properties(self) -> dict[str, Property]:
        return _c.python_value(_c.call("account_properties", self._handle))


class Accounts:
    """The accounts as they were when they were looked at. Iterating gives the top-level accounts, in the file's order;
    by their identifiers, children are found, too."""

    def __init__(self, handle: _c.Handle):
        self._handle = handle

    def __iter__(self) -> Iterator[Account]:
        for place in range(len(self)):
            yield Account(_c.handle("account", _c.call("accounts_at", self._handle, place)))

    def __len__(self) -> int:
        return _c.call("accounts_count", self._handle)

    def __getitem__(self, identifier: str) -> Account:
        account = self.get(identifier)
        if account is None:
            raise KeyError(identifier)
        return account

    def __contains__(self, identifier: object) -> bool:
        return isinstance(identifier, str) and self.get(identifier) is not None

    @property
    def version(self) -> int:
        """The data version of the file; 0 where there is none."""
        return _c.call("accounts_version", self._handle)

    @property
    def unreadable(self) -> int:
        """How many records of the file this release cannot load, and so are not among these."""
        return _c.call("accounts_unreadable", self._handle)

    def get(self, identifier: str, default: Any = None) -> Account | Any:
        """The account or child account of this identifier, or the default."""
        return self._found("accounts_find", identifier) or default

    def with_sync_identifier(self, identifier: str) -> Account | None:
        """The account or child account of this sync identifier."""
        return self._found("accounts_find_sync", identifier)

    def of_type(self, type: str) -> list[Account]:
        """Those of one type; children stand behind their parent."""
        return list(self._listed("accounts_of_type", type))

    def with_dataclass(self, dataclass: str) -> list[Account]:
        """Those for which the data class is switched on; children stand behind their parent."""
        return list(self._listed("accounts_with_dataclass", dataclass))

    def _found(self, function: str, text: str) -> Account | None:
        account = _c.call(function, self._handle, _c.encoded(text))
        return Account(_c.handle("account", account)) if account else None

    def _listed(self, function: str, text: str) -> Accounts:
        return Accounts(_c.handle("accounts", _c.call(function, self._handle, _c.encoded(text))))


class Kind(IntEnum):
    """What became of an account."""

    ADDED = 0
    CHANGED = 1
    REMOVED = 2


@dataclass(frozen=True)
class Change:
    """What became of one account."""

    kind: Kind
    #: As it is afterwards; one that was removed, as it was before.
    account: Account
    #: Of one that was changed: its own properties that came, changed or went.
    keys: tuple[str, ...]


def _changes(handle: Any) -> list[Change]:
    def keys(place: int) -> Iterator[str]:
        for each in range(_c.MOST):
            key = _c.call("changes_key", handle, place, each)
            if key is None:
                return
            yield key.decode()

    return [
        Change(
            Kind(_c.call("changes_kind", handle, place)),
            Account(_c.handle("account", _c.call("changes_account", handle, place))),
            tuple(keys(place)),
        )
        for place in range(_c.call("changes_count", handle))
    ]


class EditedAccount(Account):
    """An account in an edit, as it was when it was asked for. Setting and deleting its items changes the edit."""

    def __init__(self, handle: _c.Handle, edit: Edit):
        super().__init__(handle)
        self._edit = edit

    def __setitem__(self, key: str, value: Property) -> None:
        with _c.c_value(value) as made:
            _c.attempt("edit_set", self._edit._handle, self._named(), _c.encoded(key), made)
        self._look_again()

    def __delitem__(self, key: str) -> None:
        if key not in self:
            raise KeyError(key)
        _c.attempt("edit_erase", self._edit._handle, self._named(), _c.encoded(key))
        self._look_again()

    def enable(self, dataclass: str, enabled: bool = True) -> None:
        """Switches a data class on or off."""
        _c.attempt("edit_set_enabled", self._edit._handle, self._named(), _c.encoded(dataclass), enabled)
        self._look_again()

    def _named(self) -> bytes:
        return _c.encoded(self.identifier or "")

    def _look_again(self) -> None:
        # What could not be loaded again is shown as it was; saving says so.
        if account := _c.call("edit_find", self._edit._handle, self._named()):
            self._handle = _c.handle("account", account)


class Edit:
    """The accounts as the file has them now, to be changed while nobody else who takes the lock changes them.

    As a context manager it is saved at the end of the block, and forgotten where the block raises. While it lives, no
    migration starts and no other client changes the accounts, and the process must not fork.
    """

    #: What was saved, once it is.
    changes: list[Change]
    #: Why those who listen for changes could not be told, or None.
    not_announced: str | None

    def __init__(self, settings: _c.Handle, *, is_trial: bool = False):
        self.changes = []
        self.not_announced = None
        begun = _c.attempt("trial_begin" if is_trial else "edit_begin", settings)
        self._handle = _c.handle("edit", begun)

    @property
    def accounts(self) -> list[EditedAccount]:
        """The top-level accounts, with what was changed so far."""
        listed = Accounts(_c.handle("accounts", _c.call("edit_accounts", self._handle)))
        return [EditedAccount(account._handle, self) for account in listed]

    def __getitem__(self, identifier: str) -> EditedAccount:
        account = _c.call("edit_find", self._handle, _c.encoded(identifier))
        if not account:
            raise KeyError(identifier)
        return EditedAccount(_c.handle("account", account), self)

    def __contains__(self, identifier: str) -> bool:
        account = _c.call("edit_find", self._handle, _c.encoded(identifier))
        return bool(account and _c.handle("account", account))

    def __delitem__(self, identifier: str) -> None:
        """Removes an account with its children, or a child."""
        if identifier not in self:
            raise KeyError(identifier)
        _c.attempt("edit_remove", self._handle, _c.encoded(identifier))

    def add(
        self, type: str, account_class: str, properties: Mapping[str, Property] | None = None, *, parent: str | None = None
    ) -> EditedAccount:
        """Adds an account, or a child of the parent. A text under "Identifier" is kept, else one is made."""
        with _c.c_value(dict(properties or {})) as made:
            account = _c.attempt(
                "edit_add", self._handle, _c.encoded(type), _c.encoded(account_class), made,
                None if parent is None else _c.encoded(parent),
            )
        return EditedAccount(_c.handle("account", account), self)

    def rewrite(self) -> None:
        """Has the save write the file even where nothing was changed, so that what loading repaired stands in it."""
        _c.call("edit_rewrite", self._handle)

    def save(self) -> list[Change]:
        """Saves the changes, gives the lock back and tells those who listen. The edit is over then, also if it fails."""
        try:
            saved = _c.handle("changes", _c.attempt("edit_save", self._handle))
        finally:
            self.close()
        reason = _c.call("changes_not_announced", saved)
        self.not_announced = reason.decode() if reason is not None else None
        self.changes = _changes(saved)
        return self.changes

    def close(self) -> None:
        """Gives the lock back; what was not saved is forgotten."""
        self._handle.free()

    def __enter__(self) -> Edit:
        return self

    def __exit__(self, kind: type | None, error: BaseException | None, trace: TracebackType | None) -> None:
        if kind is not None:
            self.close()
        elif self._handle.is_held:
            self.save()


# By the number that the library calls with; the function it calls stays for as long as the process.
_watches: WeakValueDictionary[int, Watch] = WeakValueDictionary()
_numbers = count(1)


@_c.CALLBACK
def _tell(changes: int, number: int) -> None:
    watch = _watches.get(number)
    if watch is not None:
        watch._callback(_changes(changes)[0])


class Watch:
    """Tells of each change until it is closed, dropped, or the program ends; to be used in a `with` statement.

    Any thread may close it. Where it has no thread of its own, one thread at a time asks for its descriptor, dispatches
    or closes it, or the callback does. A forked child does not watch: there it is over.
    """

    def __init__(
        self, settings: _c.Handle, since: Accounts, callback: Callable[[Change], object], own_thread: bool
    ):
        self._callback = callback
        number = next(_numbers)
        _watches[number] = self  # which may be called before the library answers
        try:
            begun = _c.attempt("watch_begin", settings, since._handle, _tell, number, 0 if own_thread else 1)
        except BaseException:
            del _watches[number]
            raise
        self._handle = _c.handle("watch", begun)

    def fileno(self) -> int:
        """For `select` and event loops: readable when there is something to dispatch. -1 with a thread of its own."""
        return _c.call("watch_descriptor", self._handle)

    def dispatch(self) -> None:
        """Calls the callback for what changed since the last time, and returns."""
        _c.call("watch_dispatch", self._handle)

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


class AccountSettings:
    """The accounts of one device.

    root: the root of the device's file tree; None for the device that the program runs on.
    time_limit: the seconds for which a migration, or another program's change, is waited for.
    may_be_missing: a device without accounts has an empty list of them, and the first change makes the file.
    may_drop_unreadable: a change may remove records from the file that this release cannot load.
    may_be_of_other_release: the accounts of an earlier or later release can be looked at; a change of them still fails.
    may_be_migrating: opening waits for no migration, which may replace what is looked at. A change still waits.
    opens_modules: below another root than "/", too, its account modules run in this process and are told of changes.
    """

    def __init__(
        self, root: str | PathLike[str] | None = None, *, time_limit: float = 30, may_be_missing: bool = False,
        may_drop_unreadable: bool = False, may_be_of_other_release: bool = False, may_be_migrating: bool = False,
        opens_modules: bool = False,
    ):
        flags = (may_be_missing, may_drop_unreadable, may_be_of_other_release, may_be_migrating, opens_modules)
        self._handle = _c.handle("", _c.attempt(
            "open", None if root is None else _c.encoded(fspath(root)), int(time_limit * 1000),
            sum(flag << place for place, flag in enumerate(flags)),
        ))

    @property
    def accounts(self) -> Accounts:
        """The accounts as the file has them now; waits for nobody."""
        return Accounts(_c.handle("accounts", _c.attempt("look", self._handle)))

    def edit(self) -> Edit:
        """The accounts, to be changed: `with settings.edit() as edit: ...` saves at its end."""
        return Edit(self._handle)

    def trial(self) -> Edit:
        """To see what a change would do: it takes no lock, and saving it answers the changes and writes nothing."""
        return Edit(self._handle, is_trial=True)

    def will_change(self, account: Account, dataclass: str) -> None:
        """Tells the modules that follow the data class that the account is about to change, before the edit begins."""
        _c.attempt("will_change", self._handle, account._handle, _c.encoded(dataclass))

    def did_change(self, account: Account, dataclass: str) -> None:
        """Tells the modules that follow the data class that the account has changed, after it was saved."""
        _c.attempt("did_change", self._handle, account._handle, _c.encoded(dataclass))

    @staticmethod
    def wait_for_migration(root: str | PathLike[str] | None = None, *, time_limit: float = 30) -> None:
        """Returns once no migration is under way."""
        path = None if root is None else _c.encoded(fspath(root))
        _c.attempt("wait_for_migration", path, int(time_limit * 1000))

    def watch(
        self, callback: Callable[[Change], object], *, since: Accounts | None = None, own_thread: bool = True
    ) -> Watch:
        """Calls back with what differs from the accounts seen before (by default: seen now), then with every change.

        In a thread of its own, or in whoever calls `dispatch`, when `fileno` is readable. What the callback raises is
        printed and passed over.
        """
        return Watch(self._handle, self.accounts if since is None else since, callback, own_thread)
