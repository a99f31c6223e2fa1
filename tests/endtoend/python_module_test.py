"""The Python module, and through it the C interface: values, changes, and each failure that can show."""

import ctypes
import errno
import fcntl
import os
import pydoc
import select
import struct
import subprocess
import sys
import threading
import traceback
import unittest
from datetime import datetime, timezone
from pathlib import Path
from textwrap import dedent

SANITIZE = os.environ["SANITIZE"]
SOURCES = Path(os.environ["SOURCE_TREE"])
LIBRARY = Path(os.environ["BUILD_TREE"]) / os.environ["LIBRARY_DIRECTORY"]
if os.environ.get("LD_LIBRARY_PATH") != str(LIBRARY):  # which the dynamic linker reads as a program starts
    os.environ["LD_LIBRARY_PATH"] = str(LIBRARY)
    os.execv(sys.executable, [sys.executable, "-B", *sys.argv])
if SANITIZE:
    sys.exit(77)  # the sanitizer's run time stands in the program, and Python has none
sys.path.insert(0, str(SOURCES / "bindings/python"))

import account_settings  # noqa: E402
from account_settings import AccountSettings, AccountSettingsError, Code, Kind  # noqa: E402
from accountctl_case import CLOUD, HOME_MAIL, MAIL, NOTES  # noqa: E402
from device import CURRENT_VERSION, SETTINGS, exactly  # noqa: E402
from device_case import DeviceTest  # noqa: E402


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


class PythonModule(DeviceTest):
    def setUp(self):
        super().setUp()
        self.tree = self.device(Version=CURRENT_VERSION, Accounts=[HOME_MAIL, CLOUD])

    def settings(self, **options):
        return AccountSettings(self.tree.root, time_limit=0.1, **options)

    def assert_fails(self, code, function):
        with self.assertRaises(AccountSettingsError) as caught:
            function()
        self.assertEqual(code, caught.exception.code)
        self.assertRegex(str(caught.exception), "^[^ ].*[^.]$")

    def assert_passes_in_child(self, function):
        """In a process of its own, which may become another one than this."""
        child = os.fork()
        if child == 0:
            try:
                function()
                os._exit(0)
            except BaseException:
                traceback.print_exc()
                os._exit(1)
        self.assertEqual(0, os.waitstatus_to_exitcode(os.waitpid(child, 0)[1]))

    def accounts(self):
        return self.tree.read_plist(SETTINGS)["Accounts"]


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

    def test_is_worth_reading_in_help(self):
        page = pydoc.plain(pydoc.render_doc(account_settings))
        for text in ("with settings.edit() as edit", "time_limit: the seconds for which", "The accounts as the file has them now"):
            self.assertIn(text, page)


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


class Watching(PythonModule):
    def test_tells_in_a_thread_of_its_own(self):
        told, settings = [], self.settings()
        is_told = threading.Event()

        def tell(change):
            told.append((change.kind, change.account.identifier, change.keys))
            is_told.set()

        with settings.watch(tell):
            with settings.edit() as edit:
                edit["C1"]["Username"] = "ada"
            self.assertTrue(is_told.wait(10))
        self.assertEqual([(Kind.CHANGED, "C1", ("Username",))], told)

    def test_tells_an_event_loop_what_came_since_the_look(self):
        told, settings = [], self.settings()
        seen = settings.accounts
        with settings.edit() as edit:
            edit["M1"].enable(MAIL, False)
        with settings.watch(told.append, since=seen, own_thread=False) as watch:
            self.assertEqual([watch], select.select([watch], [], [], 10)[0])
            watch.dispatch()
        self.assertEqual([("Enabled Dataclasses",)], [change.keys for change in told])

    def run_program(self, text):
        """What a program of its own prints that ends by itself, since what is dropped wrongly ends the whole process."""
        program = [sys.executable, "-B", "-c", dedent(text), self.tree.root]
        environment = {**os.environ, "PYTHONPATH": str(SOURCES / "bindings/python")}
        run = subprocess.run(program, env=environment, capture_output=True, text=True, timeout=100, check=False)
        self.assertEqual((0, ""), (run.returncode, run.stderr))
        return run.stdout

    def test_ends_when_it_is_dropped_while_it_tells(self):
        self.assertEqual("whole\n", self.run_program("""
            import sys, time
            from account_settings import AccountSettings
            settings = AccountSettings(sys.argv[1])
            seen = settings.accounts
            with settings.edit() as edit:
                edit["M1"]["Port"] = 1
            sys.setswitchinterval(100)  # the watch's thread has to wait before each call
            for _ in range(20):
                watch = settings.watch(lambda change: None, since=seen)
                end = time.monotonic() + 0.03
                while time.monotonic() < end:
                    pass
                del watch
            print("whole")
        """))

    def test_ends_with_a_program_that_still_watches(self):
        for seconds in (0, 0.002, 0.01, 0.05):
            self.assertEqual("told\n", self.run_program(f"""
                import sys, threading, time
                from account_settings import AccountSettings
                settings, is_told = AccountSettings(sys.argv[1]), threading.Event()
                seen = settings.accounts
                with settings.edit() as edit:
                    edit["M1"]["Port"], edit["V1"]["Port"] = time.time_ns(), 1
                def tell(change):
                    is_told.set()
                    time.sleep({seconds})
                watch = settings.watch(tell, since=seen)
                is_told.wait(10)
                print("told")
            """))

    def test_may_be_closed_and_dropped_by_its_own_callback(self):
        self.assertEqual("told\n", self.run_program("""
            import sys, threading
            from account_settings import AccountSettings
            settings, watches, is_over = AccountSettings(sys.argv[1]), [], threading.Event()
            def tell(change):
                watches.pop().close()
                print("told")
                is_over.set()
            watches.append(settings.watch(tell))
            with settings.edit() as edit:
                edit["M1"]["Port"] = 1
            is_over.wait(10)
        """))

    def test_ends_in_a_forked_child_where_nothing_follows_it(self):
        with self.settings().watch(print) as watch:
            self.assert_passes_in_child(lambda: self.assert_fails(Code.FINISHED, watch.fileno))
            self.assertEqual(-1, watch.fileno())

    def test_is_over_once_it_is_closed(self):
        for own_thread in (True, False):
            watch = self.settings().watch(print, own_thread=own_thread)
            watch.close()
            watch.close()
            self.assert_fails(Code.FINISHED, watch.fileno)
            self.assert_fails(Code.FINISHED, watch.dispatch)

    def test_says_where_nothing_can_be_watched(self):
        settings = self.settings()
        seen = settings.accounts
        self.tree.path("var/mobile/Library").rename(self.tree.path("elsewhere"))
        self.assert_fails(Code.NOT_WATCHED, lambda: settings.watch(print, since=seen))


if __name__ == "__main__":
    unittest.main()
