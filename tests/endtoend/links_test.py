"""Links and second names that nobody but root or the file's owner can have made cost no account: a run reads what they
lead to, keeps a copy of it, and migrates it."""

import os
import plistlib
import unittest

from device import CURRENT_VERSION, HOME, LEGACY_MAIL, PREFERENCES, SETTINGS, SETTINGS_COPY
from device_case import HOST, DeviceTest

MOBILE = 501
SETTINGS_CONTENT = {
    "Version": 0,
    "Accounts": [{"Type": "LDAP", "Class": "LDAPAccount", "Identifier": "L", "DisplayName": "mine"}],
}


class Links(DeviceTest):
    """What holds whoever runs the host."""

    mobile = os.getuid()

    def setUp(self):
        super().setUp()
        self.device_ = self.device()
        self.device_.set_mobile(self.mobile, self.mobile)
        self.device_.write_plist(SETTINGS, SETTINGS_CONTENT)
        self.settings = self.device_.path(SETTINGS)
        self.elsewhere = self.device_.path("backup/settings.plist")
        self.elsewhere.parent.mkdir()
        for path in [self.device_.path(HOME), *self.device_.path(HOME).rglob("*")]:
            os.chown(path, self.mobile, -1)

    def assert_migrated(self, content, identifiers=("L",)):
        run = self.device_.migrate(HOST)
        self.assertEqual((0, []), (run.status, [line for line in run.errors if "Could not" in line]))
        migrated = self.device_.read_plist(SETTINGS)
        self.assertEqual(CURRENT_VERSION, migrated["Version"])
        self.assertLessEqual(set(identifiers), {each["Identifier"] for each in migrated["Accounts"]})
        self.assertEqual(self.mobile, self.settings.stat().st_uid)
        self.assertEqual(content, self.device_.read(SETTINGS_COPY))

    def test_a_link_in_the_files_place_is_followed(self):
        self.settings.rename(self.elsewhere)
        content = self.elsewhere.read_bytes()
        for target in ("../../../../backup/settings.plist", "/backup/settings.plist"):
            with self.subTest(target=target):
                self.settings.unlink(missing_ok=True)
                self.settings.symlink_to(target)
                self.assert_migrated(content)

    def test_a_second_name_in_a_backup_keeps_nothing_from_being_read(self):
        os.link(self.settings, self.elsewhere)
        self.assert_migrated(self.settings.read_bytes())
        self.assertEqual(0, plistlib.loads(self.elsewhere.read_bytes())["Version"])

    def test_a_legacy_file_with_a_second_name_is_converted(self):
        self.device_.write_plist(LEGACY_MAIL, {"MailAccounts": [{"AccountType": "IMAPAccount", "uniqueId": "M1"}]})
        legacy = self.device_.path(LEGACY_MAIL)
        os.chown(legacy, self.mobile, -1)
        os.link(legacy, self.elsewhere)
        self.assert_migrated(self.settings.read_bytes(), ("L", "M1"))


@unittest.skipIf(os.getuid() != 0, "only root makes other users' files")
class LinksForRoot(Links):
    mobile = MOBILE

    def test_a_second_name_of_mobiles_file_in_roots_directory_keeps_nothing_from_being_read(self):
        os.chown(self.device_.path(PREFERENCES), 0, 0)
        os.link(self.settings, self.elsewhere)
        self.assert_migrated(self.settings.read_bytes())

    def test_a_second_name_that_mobile_may_have_given_a_secret_refuses_the_run_and_nothing_is_touched(self):
        self.settings.rename(self.elsewhere)
        os.chown(self.elsewhere, 0, 0)
        self.elsewhere.chmod(0o600)
        os.link(self.elsewhere, self.settings)
        before = self.device_.entries(with_lock=True)
        run = self.device_.migrate(HOST)
        self.assertEqual((8, before), (run.status, self.device_.entries(with_lock=True)), run.errors)
        self.assertIn(f"{self.settings} may have been planted", run.errors[-1])


if __name__ == "__main__":
    unittest.main()
