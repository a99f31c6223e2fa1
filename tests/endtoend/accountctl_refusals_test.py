"""What accountctl refuses or fails to do: one clear line, a status that scripts can tell by, and the device as it was."""

import os
import re
import subprocess
import tempfile
import unittest

from accountctl_case import ACCOUNTCTL, CLOUD, DIRECTORY, HOME_MAIL, AccountctlTest, changed
from device import CURRENT_VERSION, LEGACY_MAIL, SETTINGS, run_host
from failed_saves_test import CAP_DAC_OVERRIDE, SHARED_MEMORY, without_capabilities

FAILED, WRONG_USE, NO_ACCOUNT, FAULTY_INSTALLATION = 1, 2, 3, 4
CHANGES = (["disable", "M1", "Notes"], ["rename", "M1", "Work"], ["add", "LDAP", "LDAPAccount"], ["remove", "M1"], ["save"])
NOT_UTF8 = b"\xff"


class WrongUse(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD)

    def assert_wrong(self, message, *words):
        with self.subTest(words=words):
            self.assert_refused(WRONG_USE, message, *words)

    def test_of_options(self):
        self.assert_wrong("unknown option: --jsn (see --help)", "--jsn", "list")
        self.assert_wrong("unknown option: -j (see --help)", "list", "-j")
        self.assert_wrong("unknown option: --json (see --help)", "--json=yes", "list")
        self.assert_wrong("--root is given twice (see --help)", "--root", self.scratch, "list")
        for option in ("--home", "--resources"):
            self.assert_wrong(f"{option} needs a value (see --help)", "list", option)
            self.assert_wrong(f"{option} needs a value (see --help)", "list", f"{option}=")
            self.assert_wrong(f"{option} needs a value (see --help)", option, "--json", "list")

    def test_of_commands(self):
        self.assert_wrong("no command is given (see --help)")
        self.assert_wrong("unknown command: lst (see --help)", "lst")
        self.assert_wrong("unknown command: lst (see --help)", "help", "lst")
        self.assert_wrong("unknown column: nam (see --help)", "list", "--columns=nam")
        self.assert_wrong("--columns is for a list of the device's accounts (see --help)", "types", "--columns=name")
        self.assert_wrong("usage: accountctl list", "list", "M1")
        self.assert_wrong("usage: accountctl show ID", "show")
        self.assert_wrong("usage: accountctl enable ID DATACLASS", "enable", "M1")
        self.assert_wrong("usage: accountctl rename ID NAME", "rename", "M1", "New", "name")
        self.assert_wrong("usage: accountctl add TYPE CLASS [KEY=VALUE]...", "add", "Mail")

    def test_of_data_classes(self):
        self.assert_wrong("unknown data class: mial", "enable", "M1", "mial")
        self.assert_wrong("accounts of the type Mail do not support Contacts", "enable", "M1", "CONTACTS")
        self.assert_wrong("accounts of the type Mail do not support Contacts", "enable", "M1", "Contacts")
        self.assert_wrong("accounts of the type Mail do not support Contacts", "disable", "M1", "Contacts")

    def test_of_names(self):
        self.assert_wrong("an account's name cannot be empty", "rename", "M1", "")
        self.put(changed(DIRECTORY, Type="OnMyDevice", Class="DeviceLocalAccount"))
        self.assert_wrong("the device's own account has a fixed name", "rename", "L1", "Mine")

    def test_of_new_accounts(self):
        self.assert_wrong("unknown account type: Post", "add", "Post", "IMAPAccount")
        self.assert_wrong("an account needs a class", "add", "Mail", "")
        for taken in ("M1", "C1"):
            message = f"there is an account with the identifier {taken}"
            self.assert_wrong(message, "add", "Mail", "IMAPAccount", f"Identifier={taken}")

    def test_of_properties(self):
        def assert_wrong(message, word):
            self.assert_wrong(f"property 2 {message}", "add", "Mail", "IMAPAccount", "Username=ines", word)

        assert_wrong("is not written KEY=VALUE or KEY:=JSON", "Hostname")
        assert_wrong("has no key", "=value")
        assert_wrong("has no key", ":=1")
        assert_wrong("is no valid JSON after :=", "Port:=many")
        assert_wrong("is no valid JSON after :=", "Port:=")
        assert_wrong("holds null, which is no value", "Port:=[1, null]")
        assert_wrong("sets Type, which stands before the properties", "Type=LDAP")
        assert_wrong("sets Class, which stands before the properties", "Class=LDAPAccount")
        assert_wrong("is no identifier", "Identifier=")
        assert_wrong("is no identifier", "Identifier:=7")

    def test_of_words_that_are_no_text(self):
        before = self.standing()
        words = [b"rename", b"M1", NOT_UTF8]
        run = subprocess.run([ACCOUNTCTL, b"--root", self.tree.root, *words], capture_output=True, check=False)
        self.assertEqual((WRONG_USE, b"accountctl: argument 2 of rename is not UTF-8 (see --help)\n"),
                         (run.returncode, run.stderr))
        self.assert_unchanged(before)

    def test_of_a_root_that_is_no_directory(self):
        run = run_host(ACCOUNTCTL, "--root", self.scratch / "nowhere", "list")
        message = f"accountctl: --root is no directory: {self.scratch}/nowhere (see --help)"
        self.assertEqual((WRONG_USE, [], [message]), (run.status, run.output, run.errors))


class UnknownAccounts(AccountctlTest):
    def test_are_told_apart_from_wrong_use(self):
        self.put(HOME_MAIL, CLOUD)
        for words in (["show"], ["enable", "Mail"], ["disable", "Mail"], ["rename", "Work"], ["remove"]):
            with self.subTest(words=words):
                command, *rest = words
                self.assert_refused(NO_ACCOUNT, "no account has the identifier M7", command, "M7", *rest)

    def test_are_told_apart_from_those_of_whom_there_are_several(self):
        self.put(HOME_MAIL, changed(HOME_MAIL, Identifier="M2"), CLOUD)
        several = "several accounts are meant by "
        for word in ("m", "home", "ines@imap.example.com"):
            self.assert_refused(WRONG_USE, f"{several}{word}: M1 (Home), M2 (Home)", "remove", word)
        self.assert_refused(WRONG_USE, f"{several}ines: M1 (Home), M2 (Home), C1", "rename", "ines", "Work")
        self.assert_refused(NO_ACCOUNT, "no account has the identifier ", "remove", "")

    def test_with_marks_that_steer_a_terminal_are_named_without_them(self):
        self.assert_refused(NO_ACCOUNT, "no account has the identifier a\ufffd[2Jb", "show", "a\x1b[2Jb")


class AccountsThatCannotBeRead(AccountctlTest):
    def assert_left_alone(self, cause):
        for words in (["list"], ["show", "M1"], *CHANGES):
            with self.subTest(words=words):
                message = f"the account settings cannot be read: {self.tree.path(SETTINGS)}: {cause}"
                self.assert_refused(FAILED, message, *words)

    def test_because_they_are_no_property_list(self):
        self.tree.write(SETTINGS, "bplist00 but no more")
        self.assert_left_alone("it is no property list, or not a whole one")

    def test_because_they_are_an_array(self):
        self.tree.write_plist(SETTINGS, [HOME_MAIL])
        self.assert_left_alone("its root is no dictionary")

    def test_because_they_are_a_directory(self):
        self.tree.path(SETTINGS).mkdir()
        self.assert_left_alone("Is a directory (errno 21)")


class AccountsOfAnEarlierRelease(AccountctlTest):
    def test_are_not_changed_before_they_are_migrated(self):
        self.put(HOME_MAIL, version=CURRENT_VERSION - 1)
        for words in CHANGES:
            with self.subTest(words=words):
                self.assert_refused(
                    FAILED, "the account settings have data version 11 and must be migrated before they are changed",
                    *words,
                )


class AccountsOfALaterRelease(AccountctlTest):
    def test_are_shown_but_not_changed(self):
        self.put(HOME_MAIL, version=CURRENT_VERSION + 1)
        self.assertIn("Name        Home", self.done("show", "M1"))
        message = f"the account settings have data version {CURRENT_VERSION + 1}, a later release's"
        for words in CHANGES:
            with self.subTest(words=words):
                self.assert_refused(FAILED, message, *words)


class AccountsBesideRecordsThatCannotBeLoaded(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, {"Type": "Unheard", "Identifier": "U1"})

    def test_are_not_changed_since_a_save_would_remove_those(self):
        message = ("1 record of the accounts file cannot be loaded, and a save would remove it; accountctl verify tells why,"
                   " and --drop-unreadable removes such records")
        for words in CHANGES:
            with self.subTest(words=words):
                self.assert_refused(FAILED, message, *words)

    def test_are_changed_where_those_may_go_and_that_is_said(self):
        run = self.accountctl("--drop-unreadable", "rename", "M1", "Work")
        self.assertEqual((0, ["accountctl: 1 record that could not be loaded went with the save"]), (run.status, run.errors))
        self.assertEqual(["M1"], [each["Identifier"] for each in self.tree.read_plist(SETTINGS)["Accounts"]])


class AccountsInFilesOfTheFirstReleases(AccountctlTest):
    def test_are_not_joined_by_a_new_one_before_they_are_migrated(self):
        self.tree.write_plist(LEGACY_MAIL, {"Accounts": []})
        message = "the accounts are still in files of the first releases"
        self.assert_refused(FAILED, message, "add", "LDAP", "LDAPAccount")


class FailedSaves(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, CLOUD)

    def assert_not_saved(self, cause, **more):
        for words in CHANGES:
            with self.subTest(words=words):
                before = self.standing()
                run = self.accountctl(*words, **more)
                self.assertEqual((FAILED, [], 1), (run.status, run.output, len(run.errors)), run.errors)
                self.assertRegex(
                    run.errors[0], f"^accountctl: the accounts could not be saved to {self.tree.path(SETTINGS)}{cause}$"
                )
                self.assert_unchanged(before)

    def test_for_want_of_a_mobile_user_say_so(self):
        self.tree.write("etc/passwd", "")
        self.assert_not_saved(": Could not find the account mobile for .+: .+")

    def test_where_the_directory_may_not_be_written(self):
        directory = self.tree.path(SETTINGS).parent
        directory.chmod(0o555)
        self.addCleanup(directory.chmod, 0o755)
        self.assert_not_saved(r": Could not .+: Permission denied \(errno 13\)", prepare=without_capabilities(CAP_DAC_OVERRIDE))

    def test_are_none_where_the_environment_names_another_volume(self):
        if SHARED_MEMORY.stat().st_dev == self.scratch.stat().st_dev:
            self.skipTest(f"{SHARED_MEMORY} is no volume of its own here")
        with tempfile.TemporaryDirectory(dir=SHARED_MEMORY) as elsewhere:
            self.done("rename", "M1", "Work", environment={"TMPDIR": elsewhere})
            self.assertEqual([], os.listdir(elsewhere))


class FaultyInstallations(AccountctlTest):
    def test_without_the_configuration_of_types(self):
        self.put(HOME_MAIL)
        empty = self.scratch / "empty"
        empty.mkdir()
        for words in (["list"], ["types"], *CHANGES):
            with self.subTest(words=words):
                self.assert_refused(
                    FAULTY_INSTALLATION,
                    "Assertion failure in +[BasicAccount initialize], BasicAccount:"
                    " Could not find AccountTypesProperties.plist",
                    "--resources", empty, *words,
                )


class Output(AccountctlTest):
    def test_that_cannot_be_written_is_a_failure(self):
        with open("/dev/full", "wb") as full:
            run = subprocess.run([ACCOUNTCTL, "types"], stdout=full, stderr=subprocess.PIPE, check=False)
        self.assertEqual((FAILED, b"accountctl: the output could not be written\n"), (run.returncode, run.stderr))

    def test_that_nobody_reads_does_not_undo_a_change(self):
        self.put(HOME_MAIL)
        reader, writer = os.pipe()
        os.close(reader)
        words = ["--root", self.tree.root, "--json", "rename", "M1", "Work"]
        run = subprocess.run([ACCOUNTCTL, *words], stdout=writer, stderr=subprocess.PIPE, check=False)
        os.close(writer)
        self.assertEqual((FAILED, "Work"), (run.returncode, self.accounts()[0]["DisplayName"]))


class Help(AccountctlTest):
    def test_names_every_command_and_every_option(self):
        text = "\n".join(self.done("--help"))
        for name in ("list", "show ID", "verify [FILE]", "types", "enable ID", "disable ID", "rename ID", "add TYPE",
                     "remove ID", "save", "--root", "--home", "--resources", "--modules", "--json", "--version", "Exit status"):
            self.assertIn(name, text)

    def test_fits_a_terminal(self):
        for words in (["--help"], ["-h"], ["help"], ["help", "list"], ["help", "add"]):
            self.assertLessEqual(max(map(len, self.done(*words))), 80)

    def test_is_the_same_however_it_is_asked_for(self):
        self.assertEqual(self.done("--help"), self.done("-h"))
        self.assertEqual(self.done("--help"), self.done("help"))

    def test_on_a_command_says_what_it_does_and_takes(self):
        for command in re.findall(r"^  ([a-z][a-z-]+) ", "\n".join(self.done("--help")), re.MULTILINE):
            with self.subTest(command=command):
                told = self.done("help", command)
                self.assertTrue(told[0].startswith(f"Usage: accountctl [OPTION]... {command}"))
                self.assertGreater(len(told), 2)

    def test_version(self):
        self.assertRegex(self.done("--version")[0], r"^accountctl \d+\.\d+\.\d+$")


if __name__ == "__main__":
    unittest.main()
