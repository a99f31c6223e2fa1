"""The Python module, and through it the C interface: values, changes, and each failure that can show.

`CANCELLED` cannot: who gives an edit up closes it, or leaves its block by an exception.
"""

import ctypes
import errno
import fcntl
import os
import resource
import signal
import struct
import threading
import time
import unittest
from datetime import datetime, timezone
from pathlib import Path

from python_module_case import PythonModule
from account_settings import AccountSettings, AccountSettingsError, Change, Code, Kind
from accountctl_case import CLOUD, HOME_MAIL, MAIL, NOTES
from device import CURRENT_VERSION, SETTINGS, exactly


PR_SET_NO_NEW_PRIVS, PR_SET_SECCOMP, SECCOMP_MODE_FILTER = 38, 22, 2
LOAD_CALL, JUMP_UNLESS, RETURN = 0x20, 0x15, 0x06
FAIL_WITH, ALLOW = 0x00050000, 0x7FFF0000
FSYNC = {"x86_64": 74, "aarch64": 82}


def refuse_to_sync():
    """From now on the kernel says of every file that its disk is full when it is to be on stable storage."""
    rows = ((LOAD_CALL, 0, 0, 0), (JUMP_UNLESS, 0, 1, FSYNC[os.uname().machine]),
            (RETURN, 0, 0, FAIL_WITH | errno.ENOSPC), (RETURN, 0, 0, ALLOW))
    filters = ctypes.create_string_buffer(b"".join(struct.pack("HBBI", *row) for row in rows))
    program = struct.pack("HxxxxxxP", len(rows), ctypes.addressof(filters))
    libc = ctypes.CDLL(None, use_errno=True)
    if libc.prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) or libc.prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, program, 0, 0):
        raise OSError(ctypes.get_errno(), "no filter of system calls")


class Looking(PythonModule):
    def test_shows_accounts_as_mappings_of_their_properties(self):
        accounts = self.settings().accounts
        self.assertEqual(["M1", "V1"], [each.identifier for each in accounts])
        self.assertEqual(exactly(HOME_MAIL), exactly(dict(accounts["M1"])))

    def test_finds_children_types_and_dataclasses(self):
        accounts = self.settings().accounts
        self.assertEqual(("V1", "Cirrant"), (accounts["C1"].parent, accounts["C1"].display_name))
        self.assertEqual(["C1"], [each.identifier for each in accounts.of_type("CalDAV")])
        self.assertEqual(["M1"], [each.identifier for each in accounts.with_dataclass(NOTES)])
        self.assertEqual(["C1", "K1"], [each.identifier for each in accounts["V1"].children])
        self.assertIsNone(accounts.get("unknown"))
        self.assertNotIn("unknown", accounts)

    def test_says_why_it_cannot(self):
        settings = {"Accounts": [], "Version": CURRENT_VERSION}
        for code, root in ((Code.NOT_MIGRATED, {**settings, "Version": 1}), (Code.NEWER, {**settings, "Version": 99})):
            self.tree.write_plist(SETTINGS, root)
            self.assert_fails(code, self.settings)
        self.tree.write(SETTINGS, "no property list")
        self.assert_fails(Code.UNREADABLE, self.settings)
        self.tree.path(SETTINGS).unlink()
        self.assert_fails(Code.MISSING, self.settings)
        self.assertEqual([], list(self.settings(may_be_missing=True).accounts))

    def test_says_that_somebody_may_have_planted_the_file(self):
        settings = self.tree.path(SETTINGS)
        settings.parent.chmod(0o777)
        os.link(settings, self.tree.path("second"))
        self.assert_fails(Code.REFUSED, self.settings)

    def test_says_that_the_user_may_not_read_the_file(self):
        def fail_to_open():
            if os.geteuid() == 0:
                os.seteuid(12346)
            self.assert_fails(Code.NO_PERMISSION, self.settings)

        for path in (self.scratch, self.tree.root):
            path.chmod(0o755)
        self.tree.path(SETTINGS).chmod(0)
        self.assert_passes_in_child(fail_to_open)

    def test_shows_the_accounts_of_another_release_where_it_may(self):
        self.tree.write_plist(SETTINGS, {"Accounts": [HOME_MAIL, 7], "Version": 3})
        settings = self.settings(may_be_of_other_release=True)
        self.assertEqual((3, 1, None), (settings.accounts.version, settings.accounts.unreadable, settings.accounts["M1"].service))
        self.assert_fails(Code.NOT_MIGRATED, settings.edit)

    def test_waits_for_a_migration_no_longer_than_it_may(self):
        self.tree.write("tmp/AccountMigrationInProgress", "")
        with self.tree.path("tmp/AccountMigrationInProgress").open("rb") as lock:
            fcntl.flock(lock, fcntl.LOCK_EX)
            self.assert_fails(Code.BUSY, self.settings)
            self.assert_fails(Code.BUSY, lambda: AccountSettings.wait_for_migration(self.tree.root, time_limit=0))
            self.assertEqual(2, len(self.settings(may_be_migrating=True).accounts))

    def test_says_that_the_configuration_is_missing(self):
        self.assertEqual("BROKEN_INSTALLATION\n", self.run_program("""
            import sys
            from account_settings import AccountSettings, AccountSettingsError
            try:
                AccountSettings(sys.argv[1], resources=sys.argv[1])
            except AccountSettingsError as error:
                print(error.code.name)
        """))

    def test_reads_what_a_child_has_of_its_parent(self):
        accounts = self.settings().accounts
        self.assertEqual(("Cirrant", None), (accounts["C1"].text("DisplayName"), accounts["M1"].text("Enabled Dataclasses")))
        self.assertTrue(accounts["M1"].lists_dataclasses)
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [{"Type": "LDAP", "Class": "A", "Identifier": "L"}]})
        self.assertFalse(self.settings().accounts["L"].lists_dataclasses)

    def test_compares_accounts_by_their_properties(self):
        first, second = self.settings().accounts, self.settings().accounts
        self.assertEqual({first["M1"], first["V1"]}, {second["V1"], second["M1"], first["M1"]})
        change = Change(Kind.ADDED, first["M1"], ())
        self.assertEqual({change}, {Change(Kind.ADDED, second["M1"], ())})


class Waiting(PythonModule):
    def setUp(self):
        super().setUp()
        self.tree.write("tmp/AccountMigrationInProgress", "")
        lock = self.tree.path("tmp/AccountMigrationInProgress").open("rb")
        self.addCleanup(lock.close)
        fcntl.flock(lock, fcntl.LOCK_EX)

    def seconds(self, function):
        began = time.monotonic()
        function()
        return time.monotonic() - began

    def test_ends_with_the_time_limit(self):
        for limit in (0, 0.05, 0.3, 0.7):
            waited = self.seconds(lambda: self.assert_fails(Code.BUSY, lambda: AccountSettings(self.tree.root, time_limit=limit)))
            self.assertGreaterEqual(waited, limit * 0.9)
            self.assertLess(waited, limit + 3)

    def test_takes_no_time_that_is_none(self):
        for limit in (-1, -0.001, float("nan"), float("-inf"), 1e30):
            with self.assertRaisesRegex(ValueError, "is no time limit"):
                AccountSettings(self.tree.root, time_limit=limit)

    def test_lasts_for_as_long_as_it_takes_without_a_limit(self):
        for limit in (None, float("inf")):
            settings = AccountSettings(self.tree.root, time_limit=limit, may_be_migrating=True)
            self.assert_interrupted(settings.edit)

    def test_is_interrupted_by_the_keyboard(self):
        settings = AccountSettings(self.tree.root, time_limit=100, may_be_migrating=True)
        for wait in (settings.edit, lambda: AccountSettings(self.tree.root, time_limit=100),
                     lambda: AccountSettings.wait_for_migration(self.tree.root, time_limit=100)):
            self.assert_interrupted(wait)

    def assert_interrupted(self, wait):
        threading.Timer(0.5, os.kill, (os.getpid(), signal.SIGINT)).start()
        with self.assertRaises(KeyboardInterrupt):
            self.assertLess(self.seconds(wait), 20)

    def test_says_for_whom(self):
        told = []
        options = {"time_limit": 1.7, "while_waiting": told.append}
        self.assert_fails(Code.BUSY, lambda: AccountSettings(self.tree.root, **options))
        self.assert_fails(Code.BUSY, lambda: AccountSettings.wait_for_migration(self.tree.root, **options))
        lock = self.tree.path("tmp/AccountMigrationInProgress")
        self.assertEqual(2, len(told))
        for each in told:
            self.assertRegex(each, f"^waiting for .*process .*{os.getpid()}.*, which holds the lock {lock}$")


class Changing(PythonModule):
    def test_saves_values_of_every_kind(self):
        moment = datetime(2026, 3, 7, 10, 15, tzinfo=timezone.utc)
        values = {"a": "b", "c": [1, -1, 2**64 - 1, 0.5, True, b"\0"], "d": {"e": ""}}
        with self.settings().edit() as edit:
            edit["M1"]["Values"] = {**values, "moment": moment}
        self.assertEqual([(Kind.CHANGED, "M1", ("Values",))], [
            (each.kind, each.account.identifier, each.keys) for each in edit.changes])
        saved = self.accounts()[0]["Values"]
        self.assertEqual(moment.replace(tzinfo=None), saved.pop("moment"))
        self.assertEqual(exactly(values), exactly(saved))
        self.assertEqual({**values, "moment": moment}, self.settings().accounts["M1"]["Values"])

    def test_adds_removes_and_switches(self):
        with self.settings().edit() as edit:
            child = edit.add("CardDAV", "CardDAVAccount", {"Identifier": "C2"}, parent="V1")
            del edit["M1"]
            edit["V1"].enable("com.vorlix.Dataclass.Notes")
            edit["V1"].enable("com.vorlix.Dataclass.Contacts", False)
        self.assertEqual("V1", child.parent)
        self.assertEqual(["V1"], [each["Identifier"] for each in self.accounts()])
        self.assertEqual([NOTES], self.accounts()[0]["Enabled Dataclasses"])
        self.assertEqual("C2", self.accounts()[0]["ChildAccounts"][-1]["Identifier"])

    def test_saves_nothing_of_a_block_that_raises(self):
        before = self.accounts()
        with self.assertRaises(KeyError), self.settings().edit() as edit:
            del edit["M1"]
            edit["M1"]["Port"] = 1
        self.assertEqual(before, self.accounts())
        with self.settings().edit() as edit:
            edit["M1"]["Port"] = 1

    def test_says_which_step_cannot_be_done(self):
        with self.settings().edit() as edit:
            account = edit["M1"]
            self.assert_fails(Code.UNSUITABLE, lambda: account.__setitem__("Identifier", "M2"))
            self.assert_fails(Code.UNSUITABLE, lambda: account.enable("com.vorlix.Dataclass.Contacts"))
            self.assert_fails(Code.ALREADY_THERE, lambda: edit.add("LDAP", "A", {"Identifier": "C1"}))
            self.assert_fails(Code.WOULD_BE_DROPPED, lambda: edit.add("No such type", "A"))
            self.assert_fails(Code.UNKNOWN_ACCOUNT, lambda: edit.add("CalDAV", "A", parent="unknown"))
            self.assertRaises(TypeError, account.__setitem__, "Port", object())
            self.assertRaises(OverflowError, account.__setitem__, "Port", 2**64)
            self.assertRaises(TypeError, account.update, {"Port": 1, "Secure": object()})
            self.assertNotIn("Port", account)
            del edit["M1"]
            self.assert_fails(Code.UNKNOWN_ACCOUNT, lambda: account.__setitem__("Port", 1))
        self.assert_fails(Code.FINISHED, edit.save)

    def test_says_why_it_cannot_save(self):
        edit = self.settings().edit()
        edit["M1"]["Type"] = "No such type"
        self.assert_fails(Code.WOULD_BE_DROPPED, edit.save)
        edit = self.settings().edit()
        edit["M1"]["Port"] = 1
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [CLOUD]})
        self.assert_fails(Code.CONFLICT, edit.save)
        edit = self.settings().edit()
        edit["V1"]["Port"] = 1
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION + 1, "Accounts": [CLOUD]})
        self.assert_fails(Code.NEWER, edit.save)
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [CLOUD]})
        edit = self.settings().edit()
        edit["V1"]["Port"] = 1
        self.tree.write("var/mobile/tmp", "a file in the directory's place")
        self.assert_fails(Code.NOT_SAVED, edit.save)
        self.tree.write_plist(SETTINGS, {"Version": CURRENT_VERSION, "Accounts": [{**CLOUD, "Type": "To come"}]})
        self.assert_fails(Code.WOULD_DROP_OTHERS, self.settings().edit)

    def test_says_that_the_disk_is_full(self):
        def fail_to_begin():
            refuse_to_sync()  # and so the directory of the lock files cannot be made
            self.assert_fails(Code.NO_SPACE, self.settings().edit)

        def fail_to_save():
            edit = self.settings().edit()
            edit["M1"]["Port"] = 1
            refuse_to_sync()
            self.assert_fails(Code.NO_SPACE, edit.save)

        before = self.accounts()
        self.assert_passes_in_child(fail_to_begin)
        self.assert_passes_in_child(fail_to_save)
        self.assertEqual(before, self.accounts())

    def test_says_that_those_who_listen_could_not_be_told(self):
        settings = self.settings(opens_modules=True)
        self.assert_fails(Code.NOT_ANNOUNCED, lambda: settings.will_change(settings.accounts["M1"], MAIL))
        with settings.edit() as edit:
            edit["M1"]["Port"] = 1
        self.assertIn("saved, but not announced", edit.not_announced)
        self.assertEqual(1, self.accounts()[0]["Port"])

    def test_says_that_a_strangers_lock_file_is_refused(self):
        def fail_to_begin():
            os.seteuid(12346)
            self.assert_fails(Code.REFUSED, self.settings().edit)

        if os.geteuid() != 0:
            self.skipTest("only root can give a file away")
        lock = self.tree.path("tmp/AccountMigrationInProgress")
        self.tree.write(lock, "")
        for directory in (self.scratch, self.tree.root, lock.parent, self.tree.path(SETTINGS).parent):
            directory.chmod(0o777)
        os.chown(lock, 12345, 12345)
        os.chown(self.tree.path(SETTINGS), 12346, 12346)
        self.assert_passes_in_child(fail_to_begin)

    def test_raises_want_of_memory_as_python_does(self):
        def fail_to_set():
            data = bytes(1 << 26)
            edit = self.settings().edit()
            used = int(Path("/proc/self/statm").read_text().split()[0]) * os.sysconf("SC_PAGE_SIZE")
            resource.setrlimit(resource.RLIMIT_AS, (used + (1 << 25), resource.RLIM_INFINITY))
            self.assertRaises(MemoryError, edit["M1"].__setitem__, "Data", data)

        self.assert_passes_in_child(fail_to_set)

    def test_finds_accounts_in_an_edit_as_elsewhere(self):
        with self.settings().edit() as edit:
            edit.accounts["C1"]["Username"] = "ada"
            for account in edit.accounts.of_type("Mail"):
                account["Username"] = "ada"
            next(iter(edit.accounts["V1"].children))["Port"] = 1
            self.assertIsNone(edit.accounts.get("unknown"))
            self.assertEqual((True, False, 2), ("C1" in edit.accounts, "unknown" in edit.accounts, len(edit.accounts)))
        self.assertEqual([("M1", ("Username",)), ("C1", ("Username", "Port"))], [
            (each.account.identifier, each.keys) for each in edit.changes])

    def test_sets_several_properties_at_once(self):
        with self.settings().edit() as edit:
            account = edit["M1"]
            account.update({"Port": 993, "Ports": (143, 993)})
            self.assertEqual([143, 993], account["Ports"])
        self.assertEqual([("Port", "Ports")], [each.keys for each in edit.changes])

    def test_is_no_sequence(self):
        with self.settings().edit() as edit:
            for ask in (lambda: list(edit), lambda: 3 in edit, lambda: "M1" in edit):
                with self.assertRaisesRegex(TypeError, "edit.accounts"):
                    ask()

    def test_tries_without_writing(self):
        before = self.accounts()
        with self.settings().trial() as trial:
            trial["M1"]["Port"] = 1
        self.assertEqual([("Port",)], [each.keys for each in trial.changes])
        self.assertEqual(before, self.accounts())

    def test_waits_for_another_but_not_for_itself(self):
        settings, codes = self.settings(), []

        def change():
            try:
                settings.edit()
            except AccountSettingsError as error:
                codes.append(error.code)

        edit = settings.edit()
        change()
        other = threading.Thread(target=change)
        other.start()
        other.join()
        edit.close()
        self.assertEqual([Code.NESTED, Code.BUSY], codes)


if __name__ == "__main__":
    unittest.main()
