"""Accounts as values."""

from __future__ import annotations

import ctypes
from collections.abc import Iterator, Mapping, Sequence
from dataclasses import dataclass
from datetime import datetime  # noqa: F401, which a Property may be
from typing import Self, TypeVar, overload

from . import Handle, call, encoded, handle, text
from .values import Opaque, Property, properties_of, property_of, texts_of  # noqa: F401

Default = TypeVar("Default")


@dataclass(frozen=True)
class Service:
    """Where the service behind an account is reached."""

    host: str
    port: int
    is_secure: bool


class Account(Mapping[str, Property]):
    """An account as it was when it was looked at: a mapping of its own properties. It never changes.

    Two are equal where their own properties are. It can be an element of a set and a key of a dictionary.
    Any thread may read it.
    """

    @classmethod
    def _of(cls, account: int | None) -> Account:
        return cls()._holding(handle("account", account))

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
    def children(self) -> Sequence[Account]:
        """Its child accounts, in the file's order."""
        return list(Accounts._of(call("account_children", self._handle)))

    @property
    def supported_dataclasses(self) -> list[str]:
        """The data classes that accounts of its type can have."""
        return texts_of(call("account_supported", self._handle))

    @property
    def enabled_dataclasses(self) -> list[str]:
        """Those that are switched on and not forbidden on this device; a child has its parent's where that has any."""
        return texts_of(call("account_enabled", self._handle))

    @property
    def lists_dataclasses(self) -> bool:
        """Whether there is a list of those that are switched on, be it an empty one."""
        return bool(call("account_lists_dataclasses", self._handle))

    def is_enabled(self, dataclass: str) -> bool:
        """Whether the data class is switched on."""
        return bool(call("account_is_enabled", self._handle, encoded(dataclass)))

    @property
    def service(self) -> Service | None:
        """What the account's module knows of its service; None where no module may be opened, or none can tell."""
        host, port, is_secure = ctypes.c_char_p(), ctypes.c_uint16(), ctypes.c_bool()
        places = (ctypes.byref(each) for each in (host, port, is_secure))
        if not call("account_service", self._handle, *places):
            return None
        return Service((host.value or b"").decode(), port.value, is_secure.value)

    def property(self, key: str) -> Property | None:
        """The value of a property; a child has its parent's where it has none itself. None where there is none."""
        value = call("account_property", self._handle, encoded(key))
        return property_of(value) if value else None

    def text(self, key: str) -> str | None:
        """The property where it is a text."""
        return text("account_text", self._handle, encoded(key))

    def integer(self, key: str) -> int | None:
        """The property as a number, also where it is a text that begins with one."""
        place = ctypes.c_int64()
        return place.value if call("account_integer", self._handle, encoded(key), ctypes.byref(place)) else None

    def boolean(self, key: str) -> bool | None:
        """The property as a truth, also where it is a number, or a text such as "yes"."""
        place = ctypes.c_bool()
        return place.value if call("account_boolean", self._handle, encoded(key), ctypes.byref(place)) else None

    def __getitem__(self, key: str) -> Property:
        return self._properties()[key]

    def __iter__(self) -> Iterator[str]:
        return iter(self._properties())

    def __len__(self) -> int:
        return len(self._properties())

    def __repr__(self) -> str:
        return f"<{type(self).__name__} {self.identifier} {self.type} {self.display_name!r}>"

    def __hash__(self) -> int:
        return hash(self.identifier)

    def _holding(self, account: Handle) -> Self:
        self._handle = account
        return self

    def _text(self, name: str) -> str | None:
        return text("account_" + name, self._handle)

    def _properties(self) -> dict[str, Property]:
        return properties_of(call("account_properties", self._handle))


class Accounts:
    """The accounts as they were when they were looked at. Iterating gives the top-level accounts, in the file's order;
    by their identifiers, children are found, too. Any thread may read them."""

    @classmethod
    def _of(cls, accounts: int | None) -> Accounts:
        return cls()._holding(handle("accounts", accounts))

    def __iter__(self) -> Iterator[Account]:
        for place in range(len(self)):
            yield Account._of(call("accounts_at", self._handle, place))

    def __len__(self) -> int:
        return int(call("accounts_count", self._handle))

    def __getitem__(self, identifier: str) -> Account:
        account = self.get(identifier)
        if account is None:
            raise KeyError(identifier)
        return account

    def __contains__(self, identifier: object) -> bool:
        return isinstance(identifier, str) and self.get(identifier) is not None

    @property
    def version(self) -> int:
        """The data version of the file; 0 where there is none, and of the accounts of an edit."""
        return int(call("accounts_version", self._handle))

    @property
    def unreadable(self) -> int:
        """How many records of the file this release cannot load, and so are not among these."""
        return int(call("accounts_unreadable", self._handle))

    @overload
    def get(self, identifier: str) -> Account | None: ...

    @overload
    def get(self, identifier: str, default: Default) -> Account | Default: ...

    def get(self, identifier: str, default: object = None) -> object:
        """The account or child account of this identifier, or the default."""
        account = self._found("accounts_find", identifier)
        return default if account is None else account

    def with_sync_identifier(self, identifier: str) -> Account | None:
        """The account or child account of this sync identifier."""
        return self._found("accounts_find_sync", identifier)

    def of_type(self, type: str) -> Sequence[Account]:
        """Those of one type; children stand behind their parent."""
        return list(Accounts._of(call("accounts_of_type", self._handle, encoded(type))))

    def with_dataclass(self, dataclass: str) -> Sequence[Account]:
        """Those for which the data class is switched on; children stand behind their parent."""
        return list(Accounts._of(call("accounts_with_dataclass", self._handle, encoded(dataclass))))

    def _holding(self, accounts: Handle) -> Self:
        self._handle = accounts
        return self

    def _found(self, function: str, name: str) -> Account | None:
        account = call(function, self._handle, encoded(name))
        return Account._of(account) if account else None
