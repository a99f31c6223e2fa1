"""accountctl and the account modules: who is told of a change, and that an image's own modules are left closed."""

import unittest

from accountctl_case import DIRECTORY, HOME_MAIL, MAIL, NOTES, RESOURCES, AccountctlTest

FAULTY_INSTALLATION = 4
REFUSED = (
    "Assertion failure in +[AccountsManager _notifierClassNamesForAccountType:dataclass:], AccountsManager:"
    " Could not load the account creator framework "
)


class Notifiers(AccountctlTest):
    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, DIRECTORY)
        self.journal = self.scratch / "journal"

    def edit(self, *words, notifier="GatedNotifier", modules=("--modules",)):
        resources = self.resources_with_notifier(notifier)
        return self.accountctl(
            "--resources", resources, *modules, *words, environment={"NOTIFIER_JOURNAL": str(self.journal)}
        )

    def told(self):
        return self.journal.read_text(encoding="utf-8").splitlines() if self.journal.exists() else []

    def test_hear_of_a_change_before_it_is_made_when_it_is_saved_and_after(self):
        self.assertEqual(0, self.edit("disable", "M1", "Notes").status)
        self.assertEqual([f"will M1 {NOTES}", "changes of 1", f"did M1 {NOTES}"], self.told())

    def test_hear_of_a_new_name_for_each_data_class(self):
        self.assertEqual(0, self.edit("rename", "M1", "Work").status)
        expected = [f"will M1 {MAIL}", f"will M1 {NOTES}", "changes of 1", f"did M1 {MAIL}", f"did M1 {NOTES}"]
        self.assertEqual(expected, self.told())

    def test_of_another_root_hear_nothing_unless_asked_for(self):
        self.assertEqual(0, self.edit("disable", "M1", "Notes", modules=()).status)
        self.assertEqual([], self.told())
        self.assertEqual([MAIL], self.accounts()[0]["Enabled Dataclasses"])

    def assert_answers(self, notifier, message, saved=True):
        run = self.edit("disable", "M1", "Notes", notifier=notifier)
        self.assertEqual((FAULTY_INSTALLATION, [], [f"accountctl: {message}"]), (run.status, run.output, run.errors))
        self.assertEqual([MAIL] if saved else [MAIL, NOTES], self.accounts()[0]["Enabled Dataclasses"])

    def test_that_throw_before_a_change_prevent_it(self):
        self.assert_answers("ThrowsBefore", "nothing was changed: no pen at hand", saved=False)

    def test_that_throw_at_a_save_do_not_undo_it(self):
        self.assert_answers("ThrowsAtSave", "the accounts were saved, but not announced: no pen at hand")

    def test_that_throw_after_a_change_do_not_undo_it(self):
        self.assert_answers("ThrowsAfter", "the accounts were saved, but not announced: no pen at hand")

    def test_that_no_module_defines_prevent_a_change(self):
        self.assert_answers(
            "NobodyNotifier",
            "nothing was changed: Assertion failure in +[AccountsManager accountWillChange:forDataclass:],"
            " AccountsManager: Could not find a class for class name NobodyNotifier",
            saved=False,
        )

    def test_that_do_not_listen_to_saves_are_said_to_be_at_fault(self):
        run = self.edit("disable", "M1", "Notes", notifier="DeafNotifier")
        self.assertEqual((FAULTY_INSTALLATION, 1), (run.status, len(run.errors)))
        self.assertRegex(run.errors[0], "^accountctl: the accounts were saved, but not announced: .*DeafNotifier")
        self.assertEqual([MAIL], self.accounts()[0]["Enabled Dataclasses"])


class ShippedModulesOfAnImage(AccountctlTest):
    """The image names modules, by the shipped configuration, that do not stand on it."""

    def setUp(self):
        super().setUp()
        self.put(HOME_MAIL, DIRECTORY)

    def test_are_not_missed_while_they_are_not_asked_for(self):
        self.done("rename", "M1", "Work")
        self.assertEqual("Work", self.accounts()[0]["DisplayName"])

    def test_that_cannot_be_opened_prevent_a_change(self):
        run = self.accountctl("--modules", "rename", "M1", "Work")
        self.assertEqual((FAULTY_INSTALLATION, 1), (run.status, len(run.errors)))
        self.assertTrue(run.errors[0].startswith(f"accountctl: nothing was changed: {REFUSED}{self.tree.root}/"))
        self.assertEqual("Home", self.accounts()[0]["DisplayName"])

    def test_that_cannot_be_opened_do_not_keep_an_account_from_being_shown(self):
        self.assertIn("Name        Home", self.done("--modules", "show", "M1"))

    def test_tell_of_an_accounts_service_where_they_may(self):
        modules = RESOURCES.parent.parent
        inside = self.tree.path(str(modules).lstrip("/"))
        inside.parent.mkdir(parents=True)
        inside.symlink_to(modules)
        self.assertIn("Service     imap.example.com:993 (secure)", self.done("--modules", "show", "M1"))
        self.assertNotIn("Service", "\n".join(self.done("show", "M1")))


if __name__ == "__main__":
    unittest.main()
