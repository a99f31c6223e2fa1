"""The types and the documentation of the Python module, as a type checker and `help()` read them."""

import inspect
import os
import pydoc
import re
import subprocess
import tempfile
import typing
import unittest
from textwrap import dedent

from python_module_case import MODULES, PythonModule
import account_settings
from account_settings import Code

CLIENT = """
    from account_settings import Account, AccountSettings, Accounts, Change, Edit, Property, Settable, Watch

    def named(accounts: Accounts, identifier: str) -> str:
        account: Account | None = accounts.get(identifier)
        return account.display_name or "" if account else ""

    def put(edit: Edit, properties: dict[str, str], ports: list[int]) -> None:
        account = edit.accounts["M1"]
        account["Ports"] = ports
        account.update(properties)
        value: Settable = {"Each": [account["Ports"], 1.5, (True, b"")]}
        edit.add("Mail", "IMAPAccount", {"Kept": value})

    def told(change: Change) -> None:
        port: Property | None = change.account.property("Port")
        print(change.kind.name, port, *change.keys)

    settings = AccountSettings("/", time_limit=None)
    seen = settings.accounts
    watch: Watch = settings.watch(told, since=seen)
"""
MISTAKES = {
    'seen["M1"]["Port"] = 1': "Unsupported target for indexed assignment",
    "settings.watch(told, since=seen.of_type('Mail'))": 'Argument "since"',
    "settings.edit()['M1']['Port'] = object()": "Incompatible types in assignment",
    "seen.get('M1').type": "has no attribute",
    "AccountSettings(time_limit='1')": 'Argument "time_limit"',
}


class Types(PythonModule):
    @classmethod
    def setUpClass(cls):
        cls.cache = tempfile.TemporaryDirectory()
        cls.addClassCleanup(cls.cache.cleanup)

    def checked(self, *files):
        environment = {**os.environ, "MYPYPATH": str(MODULES)}
        command = ["mypy", "--strict", f"--cache-dir={self.cache.name}", *files]
        run = subprocess.run(command, env=environment, capture_output=True, text=True, check=False)
        self.assertEqual("", run.stderr)
        return run.stdout

    def test_are_sound_in_the_module(self):
        self.assertRegex(self.checked(MODULES / "account_settings", MODULES / "_account_settings"), "^Success: ")

    def test_suit_a_program_and_show_its_mistakes(self):
        program = self.scratch / "client.py"
        program.write_text(dedent(CLIENT) + "".join(mistake + "\n" for mistake in MISTAKES), encoding="utf-8")
        first, found = len(dedent(CLIENT).splitlines()) + 1, self.checked(program).splitlines()
        self.assertRegex(found.pop(), f"^Found {len(MISTAKES)} errors")
        for line, (each, words) in enumerate(zip(found, MISTAKES.values(), strict=True), first):
            self.assertIn(f"client.py:{line}: error: ", each)
            self.assertIn(words, each)

    def test_are_known_while_the_program_runs(self):
        for name in account_settings.__all__:
            kind = getattr(account_settings, name)
            if not inspect.isclass(kind):
                continue
            typing.get_type_hints(kind)
            for member in vars(kind).values():
                function = getattr(member, "fget", getattr(member, "__func__", member))
                if inspect.isfunction(function) and function.__module__.startswith("_account"):
                    self.assertIn("return", {"return": None, **typing.get_type_hints(function)})


class Help(unittest.TestCase):
    page = pydoc.plain(pydoc.render_doc(account_settings))

    def test_is_worth_reading(self):
        for text in ("with settings.edit() as edit", "time_limit: the seconds for which", "The accounts as the file has them now"):
            self.assertIn(text, self.page)

    def test_says_what_each_code_means(self):
        for code in Code:
            self.assertRegex(self.page, rf"(?m)^[ |]*{code.name}: [a-z]")

    def test_shows_nothing_private(self):
        self.assertEqual([], re.findall(r"(?m)\b_account\w*|SUBMODULES|^[ |]*_[a-z]\w*\(|\bHandle\b", self.page))

    def test_explains_whatever_is_public(self):
        for name in account_settings.__all__:
            kind = getattr(account_settings, name)
            if inspect.isclass(kind):
                members = {each: member for each, member in vars(kind).items() if re.match("[a-z]", each)}
                documented = {each: inspect.getdoc(member) for each, member in members.items()
                              if isinstance(member, property) or inspect.isroutine(member)}
                self.assertEqual([], [f"{name}.{each}" for each, text in {"": kind.__doc__, **documented}.items() if not text])


if __name__ == "__main__":
    unittest.main()
