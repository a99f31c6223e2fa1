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

from collections.abc import Callable
from os import PathLike, fspath

from _account_settings import AccountSettingsError, Code, attempt as _attempt, encoded as _encoded, handle as _handle
from _account_settings.changing import Change, Edit, EditedAccount, EditedAccounts, Kind
from _account_settings.looking import Account, Accounts, Service
from _account_settings.values import Opaque, Property, Settable
from _account_settings.waiting import Patience as _Patience
from _account_settings.watching import Watch

__all__ = [
    "Account", "AccountSettings", "AccountSettingsError", "Accounts", "Change", "Code", "Edit", "EditedAccount",
    "EditedAccounts", "Kind", "Opaque", "Property", "Service", "Settable", "Watch",
]


def _path(path: str | PathLike[str] | None) -> bytes | None:
    return None if path is None else _encoded(fspath(path))


class AccountSettings:
    """The accounts of one device. Any thread may call anything at any time.

    root: the root of the device's file tree; None for the device that the program runs on.
    time_limit: the seconds for which a migration, or another program's change, is waited for; None for no limit.
    while_waiting: called by the thread that waits, once it has waited for a second, with a sentence that says for whom.
    home: the mobile user's home directory; None for that of the root.
    resources: the directory of the configuration; None for that of the installed library.
    may_be_missing: a device without accounts has an empty list of them, and the first change makes the file.
    may_drop_unreadable: a change may remove records from the file that this release cannot load.
    may_be_of_other_release: the accounts of an earlier or later release can be looked at; a change of them still fails.
    may_be_migrating: opening waits for no migration, which may replace what is looked at. A change still waits.
    opens_modules: below another root than "/", too, its account modules run in this process and are told of changes.
    """

    def __init__(
        self, root: str | PathLike[str] | None = None, *, time_limit: float | None = 30,
        while_waiting: Callable[[str], object] | None = None, home: str | PathLike[str] | None = None,
        resources: str | PathLike[str] | None = None, may_be_missing: bool = False, may_drop_unreadable: bool = False,
        may_be_of_other_release: bool = False, may_be_migrating: bool = False, opens_modules: bool = False,
    ):
        flags = (may_be_missing, may_drop_unreadable, may_be_of_other_release, may_be_migrating, opens_modules)
        self._patience = _Patience(time_limit, while_waiting)
        self._handle = _handle("", self._patience.attempt(
            "open_at", _path(root), _path(home), _path(resources), self._patience.milliseconds,
            sum(flag << place for place, flag in enumerate(flags)), None, None,
        ))

    @property
    def accounts(self) -> Accounts:
        """The accounts as the file has them now; waits for nobody."""
        return Accounts._of(_attempt("look", self._handle))

    def edit(self) -> Edit:
        """The accounts, to be changed: `with settings.edit() as edit: ...` saves at its end."""
        return Edit()._begun(self._patience.attempt("edit_begin", self._handle))

    def trial(self) -> Edit:
        """To see what a change would do: it takes no lock, and saving it answers the changes and writes nothing."""
        return Edit()._begun(_attempt("trial_begin", self._handle))

    def will_change(self, account: Account, dataclass: str) -> None:
        """Tells the modules that follow the data class that the account is about to change, before the edit begins."""
        _attempt("will_change", self._handle, account._handle, _encoded(dataclass))

    def did_change(self, account: Account, dataclass: str) -> None:
        """Tells the modules that follow the data class that the account has changed, after it was saved."""
        _attempt("did_change", self._handle, account._handle, _encoded(dataclass))

    @staticmethod
    def wait_for_migration(
        root: str | PathLike[str] | None = None, *, time_limit: float | None = 30,
        while_waiting: Callable[[str], object] | None = None,
    ) -> None:
        """Returns once no migration is under way."""
        patience = _Patience(time_limit, while_waiting)
        patience.attempt("wait_for_migration", _path(root), patience.milliseconds)

    def watch(
        self, callback: Callable[[Change], object], *, since: Accounts | None = None, own_thread: bool = True
    ) -> Watch:
        """Calls back with what differs from the accounts seen before (by default: seen now), then with every change.

        In a thread of its own, or in whoever calls `dispatch`, when `fileno` is readable. What the callback raises is
        printed and passed over.
        """
        if since is not None and not isinstance(since, Accounts):
            raise TypeError(f"since takes Accounts, as settings.accounts gives them, and no {type(since).__name__}")
        return Watch()._begun(self._handle, self.accounts if since is None else since, callback, own_thread)


for _name in __all__:
    if isinstance(_each := globals()[_name], type):
        _each.__module__ = __name__
