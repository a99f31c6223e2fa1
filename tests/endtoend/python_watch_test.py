"""Watches of the Python module: what they tell, and when they end."""

import os
import resource
import select
import threading
import unittest

from python_module_case import PythonModule
from account_settings import Code, Kind
from accountctl_case import MAIL


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

    def test_says_that_the_process_watches_too_much_already(self):
        settings = self.settings()
        seen, lowest = settings.accounts, os.dup(0)
        os.close(lowest)
        limits = resource.getrlimit(resource.RLIMIT_NOFILE)
        self.addCleanup(resource.setrlimit, resource.RLIMIT_NOFILE, limits)
        resource.setrlimit(resource.RLIMIT_NOFILE, (lowest, limits[1]))
        self.assert_fails(Code.NOT_WATCHED, lambda: settings.watch(print, since=seen))

    def test_begins_with_accounts_that_were_looked_at_alone(self):
        settings = self.settings()
        with self.assertRaisesRegex(TypeError, "since takes Accounts, as settings.accounts gives them, and no list"):
            settings.watch(print, since=settings.accounts.of_type("Mail"))
        with settings.trial() as trial:
            self.assert_fails(Code.UNSUITABLE, lambda: settings.watch(print, since=trial.accounts))


if __name__ == "__main__":
    unittest.main()
