"""The recipe for a new account type: it is configuration, and works at once."""

import json
import plistlib
import unittest

from accountctl_case import CALENDARS, RESOURCES, AccountctlTest
from device import SETTINGS
from device_case import HOST

TYPE = "Timetable"


class NewAccountType(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.resources = self.scratch / "resources"
        self.resources.mkdir()
        for shipped in RESOURCES.iterdir():
            (self.resources / shipped.name).symlink_to(shipped)
        self.add_like("AccountTypesProperties.plist", {"Supported Dataclasses": [CALENDARS]})
        self.add_like("AccountCreators.plist", {})

    def add_like(self, name, more):
        """A section like that of subscribed calendars, but for what is given."""
        file = self.resources / name
        table = plistlib.loads(file.read_bytes())
        section = table["Subscribed Calendar"]
        table[TYPE] = {**section, **more} if more else section
        file.unlink()
        file.write_bytes(plistlib.dumps(table))

    def with_type(self, *words):
        return self.done("--resources", self.resources, *words)

    def test_is_known_with_its_data_classes(self):
        types = json.loads("\n".join(self.with_type("types", "--json")))["types"]
        self.assertIn({"type": TYPE, "supported": [CALENDARS]}, types)

    def test_has_accounts_that_are_kept(self):
        identifier = self.with_type("add", TYPE, "TimetableAccount", "DisplayName=Trains")[0]
        self.assertIn(f"{identifier}  {TYPE}  TimetableAccount  Trains", self.with_type("list"))
        migrated = self.tree.migrate(HOST, "--resources", self.resources)
        self.assertEqual((0, TYPE), (migrated.status, self.tree.read_plist(SETTINGS)["Accounts"][0]["Type"]))

    def test_has_no_service_until_a_module_makes_its_accounts(self):
        identifier = self.with_type("add", TYPE, "TimetableAccount", "Hostname=trains.example")[0]
        shown = self.with_type("--modules", "show", identifier)
        self.assertEqual([], [line for line in shown if line.startswith("Service")])


if __name__ == "__main__":
    unittest.main()
