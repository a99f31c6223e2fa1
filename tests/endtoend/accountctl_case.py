"""What the tests of accountctl share: a device of a few accounts, and the program to edit them with."""

import os
from pathlib import Path

import schemas
from device import CURRENT_VERSION, SETTINGS, TEMPORARY, Run, run_host
from device_case import PLUGINS, DeviceTest

ACCOUNTCTL = Path(os.environ["ACCOUNTCTL"])
RESOURCES = Path(os.environ["BUILD_TREE"]) / os.environ["DATA_DIRECTORY"] / "account-settings"
NOTIFIERS = "usr/lib/gated_notifier.so"

DATACLASS = "com.vorlix.Dataclass."
MAIL, NOTES, CONTACTS, CALENDARS = (DATACLASS + name for name in ("Mail", "Notes", "Contacts", "Calendars"))

HOME_MAIL = {
    "Type": "Mail",
    "Class": "IMAPAccount",
    "Identifier": "M1",
    "DisplayName": "Home",
    "Username": "ines",
    "Hostname": "imap.example.com",
    "Enabled Dataclasses": [MAIL, NOTES],
    "Unknown": {"Kept": [1, True, 2.5, b"\x00\x01"]},
}
CLOUD = {
    "Type": "VorlixAccount",
    "Class": "KQAccount",
    "Identifier": "V1",
    "DisplayName": "Cirrant",
    "Enabled Dataclasses": [CONTACTS],
    "ChildAccounts": [
        {"Type": "CalDAV", "Class": "MobileCalDAVAccount", "Identifier": "C1", "ParentID": "V1", "Username": "ines"},
        {"Type": "KeldorIMAP", "Class": "KeldorIMAPAccount", "Identifier": "K1", "ParentID": "V1"},
    ],
}
DIRECTORY = {"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L1", "Port": 389}


def changed(account, **more):
    return {**account, **more}


class AccountctlTest(DeviceTest):
    def setUp(self):
        super().setUp()
        self.tree = self.device()

    def put(self, *accounts, version=CURRENT_VERSION):
        self.tree.write_plist(SETTINGS, {"Version": version, "Accounts": list(accounts)})

    def accounts(self):
        return self.tree.read_plist(SETTINGS)["Accounts"]

    def accountctl(self, *words, environment=None, **more) -> Run:
        run = run_host(
            ACCOUNTCTL, "--root", self.tree.root, *words, environment={"LC_ALL": "C", **(environment or {})}, **more
        )
        if "--json" in words and run.output:
            schemas.check_accountctl(words, run.output)
        return run

    def done(self, *words, **more):
        """The lines that a command prints which does what it was asked."""
        run = self.accountctl(*words, **more)
        self.assertEqual((0, []), (run.status, run.errors))
        return run.output

    def standing(self):
        """What stands on the device, but for the directory that every save needs."""
        return {path: entry for path, entry in self.tree.entries().items() if path != TEMPORARY}

    def assert_unchanged(self, before):
        after = self.standing()
        self.assertEqual([], [path for path in {*before, *after} if before.get(path) != after.get(path)])

    def assert_refused(self, status, message, *words, **more):
        """The command ends so, with this one line and nothing else, and the device is as it was."""
        before = self.standing()
        run = self.accountctl(*words, **more)
        self.assertEqual((status, [], [f"accountctl: {message}"]), (run.status, run.output, run.errors))
        self.assert_unchanged(before)

    def resources_with_notifier(self, class_name):
        """The shipped configuration, but for the mail accounts' notifier; its module stands on the device."""
        directory = self.scratch / "resources"
        directory.mkdir()
        for shipped in RESOURCES.iterdir():
            (directory / shipped.name).symlink_to(shipped)
        (directory / "AccountCreators.plist").unlink()
        description = {"Framework": NOTIFIERS, "Class": class_name, "Supported Dataclasses": [MAIL, NOTES]}
        creators = {"Mail": [{"Type": "NotifierAccount", "Description": description}], "LDAP": [], "VorlixAccount": []}
        self.tree.write_plist(directory / "AccountCreators.plist", creators)
        self.tree.write(NOTIFIERS, (PLUGINS / "gated_notifier.so").read_bytes())
        return directory
