"""Every way of losing an account, as docs/RELIABILITY.md lists them: what is said, the status, where it still is, the way back."""

import os
import plistlib
import re
import shlex
import unittest
from pathlib import Path
from typing import NamedTuple

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY, TREE, run_host
from device_case import HOST, DeviceTest

ACCOUNTCTL = Path(os.environ["ACCOUNTCTL"])
MEANINGS = dict(re.findall(r'LossMeaning\{LossCode::\w+,\s*"([^"]+)",\s*"([^"]+)"\}',
                           (TREE / "records/loss.h").read_text(encoding="utf-8")))
ROW = re.compile(r"^\| `([a-z-]+)` \| ([^|]+) \| ([^|]+) \| ([^|]+) \| ([^|]+) \|$", re.M)
# What no device brings about: programs that use the library do, or a step that fails, which none of this release does.
ELSEWHERE = {"deleted", "removed", "removed-from-parent", "replaced", "failed-step"}

ACCOUNT = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "A", "DisplayName": "Quarry", "Password": "pa55"}
MAIL = {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "B", "DisplayName": "Wharf"}


def settings(*accounts, version=CURRENT_VERSION):
    return lambda device: device.write_plist(SETTINGS, {"Version": version, "Accounts": list(accounts)})


def legacy(content):
    def fill(device):
        device.write_plist(LEGACY_MAIL, {"MailAccounts": content})
    return fill


def unsavable(device):
    legacy([{"AccountType": "IMAPAccount", "uniqueId": "M"}])(device)
    device.write("etc/group", "wheel:*:0:root\n")


def with_replaced_type(device):
    settings(MAIL)(device)
    legacy([{"AccountType": "IMAPAccount", "uniqueId": "M"}])(device)


class Way(NamedTuple):
    """A way of losing something: what makes a device on which it happens, the file that has it, the exit status, and what
    `accountctl recover` is told to bring it back from there."""

    fill: callable
    place: str = SETTINGS_COPY
    status: int = 0
    back: tuple = ()


REFUSED = [{"AccountType": "IMAPAccount", "uniqueId": "M"}, {"uniqueId": "BAD"}]
WAYS = {
    "dropped-no-record": Way(settings(ACCOUNT, "no record")),
    "dropped-no-type": Way(settings({"Class": "LDAPAccount", "Identifier": "X"}), back=("Accounts[0]", "--set", "Type=LDAP")),
    "dropped-unknown-type": Way(settings({**ACCOUNT, "Type": "Telegraph"}), back=("Accounts[0]", "--set", "Type=LDAP")),
    "dropped-no-class": Way(settings({"Type": "LDAP", "Identifier": "X"}), back=("Accounts[0]", "--set", "Class=LDAPAccount")),
    "dropped-unknown-class": Way(settings({**MAIL, "Class": "Pigeon", "AccountPath": "says nothing"}),
                                 back=("Accounts[0]", "--set", "Class=IMAPAccount")),
    "replaced-with-type": Way(with_replaced_type, back=("Accounts[0]",)),
    "replaced-duplicate": Way(settings(ACCOUNT, {**ACCOUNT, "DisplayName": "Another"}),
                             back=("Accounts[0]", "--set", "Identifier:=null")),
    "refused-description": Way(legacy(REFUSED), LEGACY_MAIL + ".unconverted-1"),
    "refused-file": Way(legacy(REFUSED), LEGACY_MAIL + ".unconverted-1"),
    "unreadable-legacy-file": Way(lambda device: device.write(LEGACY_EXCHANGE, b"broken"), LEGACY_EXCHANGE + ".unreadable-1"),
    "unreadable-settings-file": Way(lambda device: device.write(SETTINGS, b"broken"), SETTINGS_COPY + ".unreadable-1"),
    "newer-settings-file": Way(settings(ACCOUNT, version=CURRENT_VERSION + 1), SETTINGS_COPY + ".newer-1"),
    "not-saved": Way(unsavable, LEGACY_MAIL + ".unsaved-1", 6),
}
KEPT_FILES = [SETTINGS, LEGACY_MAIL, LEGACY_EXCHANGE]


class LossMatrix(DeviceTest):
    def each_way(self):
        for number, (code, way) in enumerate(WAYS.items()):
            self.scratch = self.scratch / str(number)
            self.scratch.mkdir()
            device = self.device()
            way.fill(device)
            yield code, way, device, {path: device.read(path) for path in KEPT_FILES if device.path(path).exists()}
            self.scratch = self.scratch.parent

    def losses(self, run, code):
        return [lost for lost in run.result().get("lost", []) if lost["code"] == code]

    def test_is_of_every_code_and_every_row_of_it_is_tried(self):
        document = (TREE / "docs/RELIABILITY.md").read_text(encoding="utf-8")
        rows = {row[0]: row[1:] for row in ROW.findall(document[document.index("## Every way"):])}
        self.assertEqual(set(MEANINGS), set(rows) | ELSEWHERE)
        self.assertEqual(set(WAYS), set(rows))
        for code, (_, status, place, back) in rows.items():
            if WAYS[code].back:
                self.assertIn(f"`accountctl recover COPY {shlex.join(WAYS[code].back)}`", back)
            self.assertIn(str(WAYS[code].status), status, code)
            self.assertIn(f"`….{WAYS[code].place.rsplit('.', 1)[1]}`" if "-1" in WAYS[code].place else "the copy", place, code)

    def test_each_is_said_and_its_place_has_what_went(self):
        for code, way, device, before in self.each_way():
            run = device.migrate(HOST)
            place = device.path(way.place)
            self.assertEqual(way.status, run.status, run.errors)
            self.assertEqual({str(place)}, {lost["where"] for lost in self.losses(run, code)}, run.result())
            self.assertIn(place.read_bytes(), before.values())
            said = [line for line in run.errors if line.startswith("migration-host: lost: ") and f"[{code}]" in line]
            self.assertTrue(said and all(MEANINGS[code] in line and line.endswith(f"still in {place}") for line in said), run.errors)

    def test_each_has_a_status_where_the_command_line_is_strict(self):
        for _, way, device, _ in self.each_way():
            self.assertEqual(way.status or 7, device.migrate(HOST, "--strict").status)

    def test_each_is_foretold_by_a_rehearsal(self):
        for code, way, device, before in self.each_way():
            foretold = self.losses(device.migrate(HOST, "--dry-run"), code)
            self.assertEqual({str(device.path(way.place))}, {lost["where"] for lost in foretold})
            self.assertEqual(before, {path: device.read(path) for path in before})
            self.assertEqual(foretold, self.losses(device.migrate(HOST), code))

    def test_each_account_comes_back_by_the_command_with_all_its_keys(self):
        for code, way, device, before in self.each_way():
            if not way.back:
                continue
            lost = plistlib.loads(before[SETTINGS])["Accounts"][0]
            device.migrate(HOST)
            back = run_host(ACCOUNTCTL, "--root", device.root, "recover", device.path(way.place), *way.back)
            self.assertEqual(0, back.status, (code, back.errors))
            set_again = {"Type", "Class", "Identifier"}
            kept = {key: value for key, value in lost.items() if key not in set_again}
            self.assertTrue(any(kept.items() <= account.items() for account in device.read_plist(SETTINGS)["Accounts"]), code)

    def test_each_is_undone_with_snapshots(self):
        for code, way, device, before in self.each_way():
            snapshots = ("--snapshots", self.scratch / "snapshots")
            run = device.migrate(HOST, *snapshots)
            if way.status == 0:
                [where] = {lost["where"] for lost in self.losses(run, code)}
                self.assertEqual(self.scratch / "snapshots", Path(where).parent)
                self.assertIn("is kept", "\n".join(self.run_host("--list-snapshots", *snapshots).output))
                self.assertEqual(0, self.run_host("--root", device.root, "--undo", *snapshots).status)
            self.assertEqual(before, {path: device.read(path) for path in before})


if __name__ == "__main__":
    unittest.main()
