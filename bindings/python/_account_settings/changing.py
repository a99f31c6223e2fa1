"""Accounts as they are changed."""

from __future__ import annotations

from collections.abc import Iterator, Mapping, Sequence
from dataclasses import dataclass
from datetime import datetime  # noqa: F401, which a Property may be
from enum import IntEnum
from types import TracebackType
from typing import Any, NoReturn, Self, overload

from . import attempt, call, encoded, handle, text
from .looking import Account, Accounts, Default
from .values import Opaque, Property, Settable, made  # noqa: F401


class Kind(IntEnum):
    """What became of an account."""

    ADDED = 0
    CHANGED = 1
    REMOVED = 2


@dataclass(frozen=True)
class Change:
    """What became of one account.

    kind: whether it came, changed or went.
    account: as it is afterwards; one that was removed, as it was before.
    keys: of one that was changed, its own properties that came, changed or went.
    """

    kind: Kind
    account: Account
    keys: tuple[str, ...]


def changes_of(changes: Any) -> list[Change]:
    """Those of a handle, or of what the library lends a callback."""
    return [
        Change(
            Kind(call("changes_kind", changes, place)),
            Account._of(call("changes_account", changes, place)),
            tuple(text("changes_key", changes, place, key) or "" for key in range(_keys_of(changes, place))),
        )
        for place in range(call("changes_count", changes))
    ]


def _keys_of(changes: Any, place: int) -> int:
    return int(call("changes_key_count", changes, place))


class EditedAccount(Account):
    """An account in an edit, as it was when it was asked for. Setting and deleting its items changes the edit.

    It belongs to one thread at a time, the one that uses the edit.
    """

    __hash__ = None  # type: ignore[assignment]

    @property
    def children(self) -> Sequence[EditedAccount]:
        """Its child accounts, in the file's order."""
        return [EditedAccount()._in(self._edit, child) for child in super().children]

    def __setitem__(self, key: str, value: Settable) -> None:
        self.update({key: value})

    def __delitem__(self, key: str) -> None:
        if key not in self:
            raise KeyError(key)
        attempt("edit_erase", self._edit._handle, self._named(), encoded(key))
        self._look_again()

    def update(self, properties: Mapping[str, Settable]) -> None:
        """Sets each of these; none where one of them is no property."""
        values = [(encoded(key), made(value)) for key, value in properties.items()]
        try:
            for key, value in values:
                attempt("edit_set", self._edit._handle, self._named(), key, value)
        finally:
            self._look_again()

    def enable(self, dataclass: str, enabled: bool = True) -> None:
        """Switches a data class on or off."""
        attempt("edit_set_enabled", self._edit._handle, self._named(), encoded(dataclass), enabled)
        self._look_again()

    def _in(self, edit: Edit, account: Account) -> Self:
        self._edit, self._handle = edit, account._handle
        return self

    def _named(self) -> bytes:
        return encoded(self.identifier or "")

    def _look_again(self) -> None:
        # What could not be loaded again is shown as it was; saving says so.
        if account := call("edit_find", self._edit._handle, self._named()):
            self._handle = handle("account", account)


class EditedAccounts(Accounts):
    """The accounts of an edit, with what was changed when they were asked for. What they give changes the edit, and
    belongs to the thread that uses it."""

    def __iter__(self) -> Iterator[EditedAccount]:
        return (self._edited(account) for account in super().__iter__())

    def __getitem__(self, identifier: str) -> EditedAccount:
        return self._edited(super().__getitem__(identifier))

    @overload
    def get(self, identifier: str) -> EditedAccount | None: ...

    @overload
    def get(self, identifier: str, default: Default) -> EditedAccount | Default: ...

    def get(self, identifier: str, default: object = None) -> object:
        """The account or child account of this identifier, or the default."""
        account = super().get(identifier)
        return default if account is None else self._edited(account)

    def with_sync_identifier(self, identifier: str) -> EditedAccount | None:
        """The account or child account of this sync identifier."""
        account = super().with_sync_identifier(identifier)
        return None if account is None else self._edited(account)

    def of_type(self, type: str) -> Sequence[EditedAccount]:
        """Those of one type; children stand behind their parent."""
        return [self._edited(account) for account in super().of_type(type)]

    def with_dataclass(self, dataclass: str) -> Sequence[EditedAccount]:
        """Those for which the data class is switched on; children stand behind their parent."""
        return [self._edited(account) for account in super().with_dataclass(dataclass)]

    def _of_edit(self, edit: Edit) -> Self:
        self._edit = edit
        return self._holding(handle("accounts", call("edit_accounts", edit._handle)))

    def _edited(self, account: Account) -> EditedAccount:
        return EditedAccount()._in(self._edit, account)


class Edit:
    """The accounts as the file has them now, to be changed while nobody else who takes the lock changes them.

    As a context manager it is saved at the end of the block, and forgotten where the block raises. While it lives, no
    migration starts and no other client changes the accounts, and the process must not fork. One thread at a time uses
    it; what is asked of it after it was saved or closed raises FINISHED.
    """

    def _begun(self, edit: int | None) -> Self:
        self._handle = handle("edit", edit)
        self._changes: list[Change] = []
        self._not_announced: str | None = None
        return self

    @property
    def changes(self) -> list[Change]:
        """What was saved, once it is."""
        return self._changes

    @property
    def not_announced(self) -> str | None:
        """Why those who listen for changes could not be told, or None."""
        return self._not_announced

    @property
    def accounts(self) -> EditedAccounts:
        """The accounts, with what was changed so far."""
        return EditedAccounts()._of_edit(self)

    def __getitem__(self, identifier: str) -> EditedAccount:
        """The account or child account of this identifier."""
        account = call("edit_find", self._handle, encoded(identifier))
        if not account:
            raise KeyError(identifier)
        return EditedAccount()._in(self, Account._of(account))

    def __delitem__(self, identifier: str) -> None:
        """Removes an account with its children, or a child."""
        self[identifier]
        attempt("edit_remove", self._handle, encoded(identifier))

    def __iter__(self) -> NoReturn:
        """An edit is no sequence."""
        raise TypeError("an edit is no sequence: its accounts are edit.accounts")

    def __contains__(self, identifier: object) -> NoReturn:
        """Nor is it a set."""
        raise TypeError("an edit is no sequence: ask whether an identifier is in edit.accounts")

    def add(
        self, type: str, account_class: str, properties: Mapping[str, Settable] | None = None, *,
        parent: str | None = None,
    ) -> EditedAccount:
        """Adds an account, or a child of the parent. A text under "Identifier" is kept, else one is made."""
        account = attempt(
            "edit_add", self._handle, encoded(type), encoded(account_class), made(dict(properties or {})),
            None if parent is None else encoded(parent),
        )
        return EditedAccount()._in(self, Account._of(account))

    def rewrite(self) -> None:
        """Has the save write the file even where nothing was changed, so that what loading repaired stands in it."""
        call("edit_rewrite", self._handle)

    def save(self) -> list[Change]:
        """Saves the changes, gives the lock back and tells those who listen. The edit is over then, whatever comes."""
        try:
            saved = handle("changes", attempt("edit_save", self._handle))
        finally:
            self.close()
        self._not_announced = text("changes_not_announced", saved)
        self._changes = changes_of(saved)
        return self._changes

    def close(self) -> None:
        """Gives the lock back; what was not saved is forgotten. May be called again."""
        self._handle.free()

    def __enter__(self) -> Edit:
        return self

    def __exit__(self, kind: type | None, error: BaseException | None, trace: TracebackType | None) -> None:
        if kind is not None:
            self.close()
        elif self._handle.is_held:
            self.save()
