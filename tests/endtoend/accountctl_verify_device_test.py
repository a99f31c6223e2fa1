"""What `accountctl verify` finds on a device beside the records of its settings file, and that a migration then does
what it said, and the command what the user should do."""

import itertools
import os
import subprocess
import unittest

from accountctl_case import ACCOUNTCTL, DIRECTORY, HOME_MAIL, changed
from accountctl_verify_test import FINDINGS, VerifyTest
from device import HOME, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS, SETTINGS_COPY, TEMPORARY, Device
from device_case import HOST, can_trace_calls, strace
from terminal import LANGUAGES, on_terminal

SENTINEL = PREFERENCES + "/.removingOldAccounts"
MARKER = HOME + "/Library/Mail/AutoFetchEnabled"
LEFTOVER = TEMPORARY + "/fileAb12Cd"
OLD_MAIL = {"uniqueId": "OLD1", "AccountType": "IMAPAccount", "AccountName": "Old", "Username": "ines"}
REFUSED = {"uniqueId": "OLD2", "AccountName": "Of no class"}


class DeviceVerifyTest(VerifyTest):
    def kinds(self, *words):
        return [kind for kind, *_ in self.found(*words)]

    def obey(self):
        """Does what the last report says should be done about its first finding."""
        path = f"{ACCOUNTCTL.parent}:{HOST.parent}:{os.environ['PATH']}"
        subprocess.run(["sh", "-c", self.commands[0]], env={"PATH": path}, check=True, stdout=subprocess.DEVNULL)

    def identifiers(self):
        return [account["Identifier"] for account in self.accounts()]

    def names(self):
        return [account.get("DisplayName") for account in self.accounts()]


class LegacyFiles(DeviceVerifyTest):
    def put_mail(self, *accounts, **lists):
        self.tree.write_plist(LEGACY_MAIL, {"MailAccounts": list(accounts), **lists})

    def test_are_told_of_where_they_are_all_that_there_is(self):
        self.put_mail(OLD_MAIL)
        self.assertEqual([("legacy", None, None)], self.found())
        self.assertEqual(["a migration converts them and deletes the file"], self.said)
        self.assertEqual("mail", self.report["files"][1]["form"])
        self.migrated()
        self.assertIn("Old", self.names())
        self.assertEqual([], self.found())

    def test_that_hold_a_refused_description_lose_every_account(self):
        self.put_mail(OLD_MAIL, REFUSED)
        self.assertEqual([("legacy", None, None), ("refused-description", "MailAccounts[1]", "OLD2")], self.found())
        self.assertIn("converts none of them", self.said[0])
        self.migrated()
        self.assertNotIn("Old", self.names())
        self.assertFalse(self.tree.path(LEGACY_MAIL).exists())

    def test_refuse_by_the_rules_of_each_list(self):
        self.put_mail(DeliveryAccounts=[{}, {"AccountType": ""}])
        self.tree.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [{"Class": "ASAccount"}, {"DAAccountDescription": "x"}, 7]})
        places = [place for kind, place, _ in self.found() if kind == "refused-description"]
        self.assertEqual(["DAAccountsKey[1]", "DAAccountsKey[2]", "DeliveryAccounts[1]"], places)

    def test_take_the_place_of_accounts_of_their_types(self):
        self.put(HOME_MAIL, DIRECTORY, changed(HOME_MAIL, Identifier="OLD1"))
        self.put_mail(OLD_MAIL)
        lost = [identifier for kind, _, identifier in self.found() if kind == "replaced-with-type"]
        self.assertEqual(["M1"], lost)
        self.migrated()
        self.assertEqual(["L1", "OLD1"], self.identifiers())

    def test_that_cannot_be_read_take_it_too(self):
        self.put(HOME_MAIL, DIRECTORY)
        self.tree.write(LEGACY_MAIL, "no property list")
        self.assertEqual([("replaced-with-type", "Accounts[0]", "M1"), ("unreadable", None, None)], self.found())
        self.migrated()
        self.assertEqual(["L1"], self.identifiers())

    def test_are_known_by_their_keys_wherever_they_lie(self):
        for name, content in (("mail", {"MailAccounts": [REFUSED], "Version": 7}), ("exchange", {"DAAccountsKey": []})):
            file = self.scratch / name
            self.tree.write_plist(file, content)
            self.assertEqual(["refused-description"] * (name == "mail"), self.kinds(file))
            self.assertEqual(name, self.report["files"][0]["form"])

    def test_that_a_dead_run_was_deleting_are_deleted_unconverted(self):
        self.put(DIRECTORY)
        self.put_mail(OLD_MAIL)
        self.tree.write(SENTINEL, "")
        self.assertEqual(["legacy", "sentinel"], self.kinds())
        self.assertIn("without converting it", self.said[0])
        self.migrated()
        self.assertEqual((["L1"], False), (self.identifiers(), self.tree.path(LEGACY_MAIL).exists()))

    def test_that_a_dead_run_has_saved_are_converted_again(self):
        self.put_mail(OLD_MAIL)
        content = self.tree.read(LEGACY_MAIL)
        self.migrated()
        self.tree.write(LEGACY_MAIL, content)
        self.assertIn("interrupted-run", self.kinds())

    def test_have_companions_that_go_with_them_alone(self):
        self.tree.write(LEGACY_MAIL + ".original", b"older")
        self.assertEqual(["companion"], self.kinds())
        self.assertEqual(["a migration leaves it"], self.said)
        self.put_mail(OLD_MAIL)
        self.assertEqual(["legacy", "companion"], self.kinds())
        self.migrated()
        self.assertFalse(self.tree.path(LEGACY_MAIL + ".original").exists())


class Places(DeviceVerifyTest):
    def assert_obeyed(self, kinds):
        self.assertEqual(kinds, self.kinds())
        self.obey()
        self.assertEqual([], self.kinds())

    def linked(self):
        self.put(DIRECTORY)
        elsewhere = self.tree.path(SETTINGS + ".elsewhere")
        self.tree.path(SETTINGS).rename(elsewhere)
        elsewhere.chmod(0o600)
        self.tree.path(SETTINGS).symlink_to(elsewhere)
        return elsewhere

    def test_of_a_link_that_is_followed(self):
        elsewhere = self.linked()
        self.assertEqual(["link"], self.kinds())
        self.migrated()
        self.assertEqual((False, True), (self.tree.path(SETTINGS).is_symlink(), elsewhere.exists()))

    def test_of_a_link_that_is_replaced_by_what_it_leads_to(self):
        self.linked()
        self.assert_obeyed(["link"])

    def test_of_a_link_to_nothing(self):
        self.tree.path(SETTINGS).symlink_to("nowhere")
        self.assertEqual(["link"], self.kinds())
        self.assertEqual([], self.migrated()["Accounts"])

    def test_of_a_pipe(self):
        os.mkfifo(self.tree.path(SETTINGS))
        self.assertEqual(["no-file"], self.kinds())
        self.assertEqual([], self.migrated()["Accounts"])

    def test_of_a_directory(self):
        self.tree.path(SETTINGS).mkdir()
        self.assertEqual(["no-file"], self.kinds())
        self.assertEqual(["a migration reads no account and cannot save"], self.said)
        self.assertEqual(6, self.tree.migrate(HOST).status)
        self.obey()
        self.assertEqual([], self.kinds())

    def test_of_a_directory_in_place_of_the_mark(self):
        self.tree.path(MARKER).mkdir()
        self.assert_obeyed(["no-file"])

    def test_that_others_may_read(self):
        self.put(DIRECTORY)
        self.tree.path(SETTINGS).chmod(0o644)
        lines = self.accountctl("verify").output
        self.assertIn("others may read or change it: its mode is 644", lines)
        subprocess.run(["sh", "-c", lines[-1]], check=True)
        self.assertEqual(0, self.accountctl("verify").status)

    @unittest.skipUnless(os.getuid() == 0, "only root gives files away")
    def test_that_belong_to_somebody_else(self):
        self.put(DIRECTORY)
        os.chown(self.tree.path(SETTINGS), 4711, 4711)
        self.assertEqual(["foreign-owner"], self.kinds())
        self.migrated()
        self.assertEqual([], self.kinds())

    def test_on_a_device_without_the_owner_of_the_file(self):
        self.put(DIRECTORY)
        self.tree.write("etc/passwd", "root:*:0:0::/:\n")
        self.assertEqual(["no-owner"], self.kinds())
        self.assertEqual(6, self.tree.migrate(HOST).status)

    def test_of_what_made_way_for_a_run(self):
        self.put(DIRECTORY)
        self.migrated()
        for number in (1, 123456789):
            self.tree.path(f"{SETTINGS}.unreadable-{number}").mkdir()
        self.tree.path(f"{SETTINGS}.unreadable-1a").mkdir()
        self.assertEqual(["kept-copy"] * 2, self.kinds())

    def test_of_what_a_dead_save_left(self):
        self.tree.write(LEFTOVER, b"accounts")
        self.tree.write(TEMPORARY + "/another file", b"")
        self.assert_obeyed(["leftover"])


@unittest.skipIf(os.environ["SANITIZE"], "a sanitizer makes calls of its own, and looks for leaks in no traced program")
@unittest.skipUnless(can_trace_calls(), "no strace here, or it may trace nothing")
class DeadRuns(DeviceVerifyTest):
    def die(self, call, when):
        """Whether the run ended at its `when`th such call."""
        inject = strace("-o", os.devnull, "-e", f"inject={call}:signal=KILL:when={when}")
        ended = subprocess.run([*inject, HOST, "--root", self.tree.root], capture_output=True, check=False)
        return ended.returncode != 0

    def assert_nothing_is_left_to_do(self):
        """Another run changes no account; the mail application's mark goes with every run."""
        before, accounts = self.standing(), self.accounts()
        self.migrated()
        self.assertEqual(accounts, self.accounts())
        paths = {*before, *self.standing()} - {SETTINGS_COPY, SETTINGS, MARKER}
        self.assertEqual([], [path for path in paths if before.get(path) != self.standing().get(path)])

    def test_are_told_of_wherever_they_ended(self):
        for call in ("renameat", "unlinkat", "openat2"):
            for when in itertools.count(1, 23 if call == "openat2" else 1):
                self.tree = Device.like("legacy-files", self.scratch / f"{call}-{when}")
                if not self.die(call, when):
                    break
                with self.subTest(call=call, when=when):
                    if not self.found():
                        self.assert_nothing_is_left_to_do()


class OnATerminal(DeviceVerifyTest):
    def test_findings_fit_and_the_commands_stay_whole(self):
        self.put(changed(HOME_MAIL, Class="MailAccount", DisplayName="\U0001f680" * 80), version=3)
        for columns in (80, 200):
            for language in LANGUAGES:
                environment = {"LC_ALL": language}
                command = [ACCOUNTCTL, "--root", self.tree.root, "--color=never", "verify"]
                status, shown = on_terminal(*command, columns=columns, environment=environment)
                self.assertEqual(FINDINGS, status)
                commands = [line for line in shown.splitlines() if line.startswith(" " * 8)]
                others = [line for line in shown.splitlines()[1:] if line not in commands]
                self.assertLessEqual(max(map(len, others)), columns)
                self.assertIn(f"        migration-host --root {self.tree.root} --dry-run --explain", commands)


if __name__ == "__main__":
    unittest.main()
