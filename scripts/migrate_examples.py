"""Migrates a copy of each example device and shows what became of its accounts."""

import json
import shutil
import sys
import tempfile
import textwrap
from pathlib import Path

from device import EXAMPLES, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, Device

ABSENT = "-"
COLUMN = 58  # in which changes are wrapped
TITLES = ("Account", "Before", "After", "What changed")


# The keys under which the three files keep the same thing, in the order in which they count.
NAME_KEYS = ("DisplayName", "AccountName", "DAAccountDescription", "Type String", "Type")
KIND_KEYS = ("Type", "AccountType", "DAAccountConfigurationClass")
IDENTIFIER_KEYS = ("Identifier", "uniqueId", "DAAccountConfigurationAccountID", "Sync Identifier")


class Account:
    def __init__(self, properties, place=None):
        self.properties = properties
        self.place = place  # where it lies, unless among the settings' own accounts

    def _values(self, keys):
        return [self.properties[key] for key in keys if self.properties.get(key)]

    def name(self):
        return next(iter(self._values(NAME_KEYS) or self.identifiers()), ABSENT)

    def identifiers(self):
        return self._values(IDENTIFIER_KEYS)

    def summary(self):
        kind = next(iter(self._values(KIND_KEYS)), "outgoing mail")
        return f"{kind} ({self.place})" if self.place else kind


def accounts_of(device):
    found = []
    for path, keys, place in (
        (SETTINGS, ("Accounts",), None),
        (LEGACY_MAIL, ("DeliveryAccounts", "MailAccounts"), "legacy mail file"),
        (LEGACY_EXCHANGE, ("DAAccountsKey",), "legacy Exchange file"),
    ):
        if device.path(path).is_file():
            content = device.read_plist(path)
            for key in keys:
                found += with_children(content.get(key, []), place)
    return found


def with_children(accounts, place):
    for account in accounts:
        found = Account(account, place)
        yield found
        yield from with_children(account.get("ChildAccounts", []), f"in {found.name()}")


def partner_of(account, others):
    """The account's other self: the one with which it shares an identifier."""
    wanted = account.identifiers()
    return next((other for other in others if set(wanted) & set(other.identifiers())), None)


def changes(before, after):
    old, new = before.properties, after.properties
    parts = [f"{mark}{key}" for mark, keys in (
        ("+", [key for key in new if key not in old]),
        ("-", [key for key in old if key not in new]),
        ("~", [key for key in new if key in old and new[key] != old[key]]),
    ) for key in keys]
    return ", ".join(parts) or "nothing"


def fates_of(explanation):
    """What became of the accounts that went, by identifier."""
    facts = [fact for stage in explanation["stages"] for fact in stage["facts"]]
    folded = {fact["account"]["identifier"]: "folded into " + " and ".join(other["name"] for other in fact["into"])
              for fact in facts if fact["fact"] == "folded"}
    lost = {loss.get("identifier"): f"lost: {loss['reason']}" for loss in explanation["result"].get("lost", [])}
    return {**folded, **lost}


def rows(before, after, fates):
    left = list(after)
    for account in before:
        partner = partner_of(account, left)
        if partner is None:
            fate = next((fates[each] for each in account.identifiers() if each in fates), "gone")
            yield account.name(), account.summary(), ABSENT, fate
        else:
            left.remove(partner)
            yield account.name(), account.summary(), partner.summary(), changes(account, partner)
    for account in left:
        yield account.name(), ABSENT, account.summary(), "new"


def show_table(table):
    widths = [max(len(row[column]) for row in [TITLES, *table]) for column in range(len(TITLES) - 1)]
    for row in [TITLES, tuple("-" * width for width in [*widths, COLUMN]), *table]:
        begin = "  " + "  ".join(cell.ljust(width) for cell, width in zip(row, widths)) + "  "
        for number, line in enumerate(textwrap.wrap(row[-1], COLUMN)):
            print((begin if number == 0 else " " * len(begin)) + line)


def version_of(device):
    return device.read_plist(SETTINGS).get("Version", ABSENT) if device.path(SETTINGS).is_file() else "none"


def migrate_example(example, directory, host):
    device = Device.like(example, directory / example)
    Device.like(example, directory / f"{example}.before")
    version, accounts = version_of(device), accounts_of(device)
    run = device.migrate(host, "--explain=json")
    print(f"\n{example}: data version {version} -> {version_of(device)}, exit status {run.status}\n")
    show_table(list(rows(accounts, accounts_of(device), fates_of(json.loads("\n".join(run.output))))))
    return run.status


def place_for(devices):
    """A new directory beside this link, which leads to it from now on; what it led to until now is gone."""
    devices.parent.mkdir(parents=True, exist_ok=True)
    former = devices.resolve() if devices.is_symlink() else None
    made = Path(tempfile.mkdtemp(prefix=devices.name + "-", dir=devices.parent))
    fresh = made / "link"
    fresh.symlink_to(made.name)
    fresh.replace(devices)
    if former and former.parent == made.parent and former.name.startswith(devices.name + "-"):
        shutil.rmtree(former)
    return made


def main(host, devices):
    devices = Path(devices)
    directory = place_for(devices)
    statuses = [migrate_example(example.name, directory, host) for example in sorted(EXAMPLES.iterdir())]
    print(f"\nThe devices lie in {devices}, each beside what it was (.before) and the events of its run (.trace).")
    return max(statuses)


if __name__ == "__main__":
    sys.exit(main(*sys.argv[1:]))
