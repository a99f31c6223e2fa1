"""The explanation of a run: for people, for machines, and as steps of the trace."""

import json
import re
import os
import pty
import subprocess
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL
from device_case import HOST, PLUGINS, DeviceTest

MOVED_BY = "_migrateAccountsFrom8B117:"
SECRET = "correct horse battery staple"


def account(identifier, type="CalDAV", **more):
    return {"Identifier": identifier, "Type": type, "Class": "SomeAccount", **more}


def in_order_of_releases(stage):
    return [int(part) if part.isdigit() else part for part in re.split(r"(\d+)", stage)]


class ExplainTest(DeviceTest):
    def document(self, device, *options):
        run = self.run_host("--root", device.root, "--explain=json", *options)
        return json.loads("\n".join(run.output))

    def steps(self, device, action):
        """The explained run's steps of this kind, each with the stage in which it was taken."""
        return [{"in": stage["stage"], **step} for stage in self.document(device)["stages"]
                for step in stage["steps"] if step["action"] == action]

    def text(self, device, *options):
        return self.run_host("--root", device.root, "--explain", *options).output


class Machines(ExplainTest):
    def test_are_told_of_every_stage_in_order(self):
        document = self.document(self.example("first-generation"))
        self.assertEqual((1, False, True), (document["schema"], document["rehearsal"], document["complete"]))
        stages = [stage["stage"] for stage in document["stages"] if stage["stage"] != "save"]
        self.assertEqual("load", stages[0])
        self.assertEqual(sorted(stages[1:], key=in_order_of_releases), stages[1:])
        self.assertEqual({"dataClass": "accounts", "success": True, "saved": True, "accounts": 10,
                          "version": CURRENT_VERSION, "lost": []}, document["result"])

    def test_are_told_from_what_an_account_was_converted(self):
        device = self.example("legacy-files")
        converted = {step["account"]["name"]: step for step in self.steps(device, "converted")}
        boatyard = converted["Tern Boatyard"]
        self.assertEqual("mail conversion", boatyard["in"])
        self.assertEqual(f"MailAccounts[0] of {device.path(LEGACY_MAIL)}", boatyard["reason"])
        self.assertIn({"key": "Class", "renamedFrom": "AccountType", "to": "IMAPAccount"}, boatyard["changes"])
        self.assertEqual("exchange conversion", converted["Coastguard"]["in"])

    def test_are_told_of_keys_that_changed(self):
        changed = self.steps(self.example("first-generation"), "changed")
        gmail = [step for step in changed if step["in"] == "_migrateAccountsFrom7A242:"
                 and step["account"]["name"] == "June at Gmail"]
        self.assertIn({"key": "Type", "from": "Mail", "to": "Gmail"}, gmail[0]["changes"])

    def test_are_told_of_moves_and_folds(self):
        device = self.example("first-generation")
        document = json.dumps(self.document(device))
        again = self.example("first-generation")
        moved = self.steps(again, "moved")
        self.assertEqual({("Wexmo", "Wexmo"), ("Nimbra", "Nimbra")},
                         {(step["account"]["name"], step["into"][0]["name"]) for step in moved})
        self.assertEqual({MOVED_BY}, {step["in"] for step in moved})
        self.assertIn('"action": "folded", "account": {"type": "CalDAV", "name": "June\'s Google Calendar"', document)

    def test_are_told_by_which_rule_an_account_was_dropped(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[account("a", "Unheard of"), account("b", "Mail"), 7])
        self.assertEqual(
            ["its type is unknown: \"Unheard of\"",
             "the mail application does not know its class, and its AccountPath names none",
             "it is no account record"],
            [step["reason"] for step in self.steps(device, "dropped")])

    def test_are_told_of_the_repair_while_saving(self):
        changed = self.steps(self.example("legacy-files"), "changed")
        repaired = [step["changes"] for step in changed if step["in"] == "save"]
        self.assertEqual([[{"key": "Class", "from": "MailAccount", "to": "POPAccount"}]], repaired)

    def test_are_told_of_files_that_went(self):
        device = self.example("legacy-files")
        removed = [step["file"] for step in self.steps(device, "source-removed")]
        self.assertEqual([str(device.path(LEGACY_EXCHANGE)), str(device.path(LEGACY_MAIL))], removed)


class People(ExplainTest):
    def test_read_that_nothing_happened_in_a_few_lines(self):
        self.assertEqual(["What the run did", "", "No account was changed.", "",
                          f"result: success; 5 accounts of data version {CURRENT_VERSION}"],
                         self.text(self.example("current")))

    def test_read_what_became_of_an_account_under_the_stage(self):
        lines = self.text(self.example("first-generation"))
        at = lines.index("_migrateAccountsFrom7A241:")
        self.assertEqual(['  Nimbra "Wexmo" (F4A2B3C5-D6E7-4F80-9A1B-2C3D4E5F6707)',
                          '    ~ Enabled Dataclasses: -"com.vorlix.Dataclass.Notes"'], lines[at + 1:at + 3])

    def test_read_a_hundred_accounts_that_changed_alike_in_a_minute(self):
        device = self.device(Version=1, Accounts=[account(f"a{n}", "Exchange") for n in range(100)])
        lines = self.text(device)
        self.assertLess(len(lines), 100)
        self.assertIn("  and 60 more accounts with other values", lines)

    def test_read_of_every_account_that_was_dropped(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[account(f"a{n}", "Unheard of") for n in range(100)])
        dropped = [line for line in self.text(device) if line.startswith("  dropped: ")]
        self.assertEqual(100, len(dropped))

    def test_are_warned_when_legacy_files_went_although_the_save_failed(self):
        device = self.example("legacy-files")
        device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        lines = self.text(device)
        self.assertTrue(any(line.startswith("  NOT SAVED: Could not find the account mobile") for line in lines))
        self.assertIn(f"WARNING: the accounts of {device.path(LEGACY_MAIL)} are lost: the file was removed although"
                      " they were not saved.", lines)
        self.assertTrue(any("THE ACCOUNTS WERE NOT SAVED" in line for line in lines))

    def test_are_warned_when_a_file_went_of_which_nothing_was_converted(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"uniqueId": "no class"}]})
        lines = self.text(device)
        self.assertIn(f"  not converted: MailAccounts[0] of {device.path(LEGACY_MAIL)} has no class, so no account of"
                      " this file is converted", lines)
        self.assertTrue(any(line.startswith("WARNING: ") for line in lines))


class Secrets(ExplainTest):
    def secretive_device(self):
        device = self.device(Version=0, Accounts=[
            account("a", "Exchange", Password=SECRET, uniqueId="b", Cookies=[SECRET], Blob=SECRET.encode(),
                    Nested={"AuthToken": SECRET}),
            account("c", "Unheard of", Password=SECRET),
            account("d", "Nimbra", uniqueId="e", **{"Subscribed Calendars": [{"Password": SECRET}]}) |
            {"Class": "NimbraAccount"}])
        device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [
            {"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": "a", "Password": SECRET}]})
        return device

    def test_are_shown_nowhere(self):
        for options in (["--explain"], ["--explain=json"]):
            trace = self.scratch / "trace"
            device = self.secretive_device()
            run = self.run_host("--root", device.root, "--trace", trace, *options)
            told = "\n".join(run.output + run.errors) + trace.read_text()
            self.assertNotIn(SECRET, told)
            self.assertNotIn(SECRET.encode().hex(), told)
            self.assertIn("<hidden>", "\n".join(run.output))


class Steps(ExplainTest):
    def test_stand_in_the_trace_as_in_the_explanation(self):
        device, trace = self.example("legacy-files"), self.scratch / "trace"
        document = self.document(device, "--trace", trace)
        events = [json.loads(line) for line in trace.read_text().splitlines()]
        explained = [{"stage": stage["stage"], **({"within": stage["within"]} if "within" in stage else {}), **step}
                     for stage in document["stages"] for step in stage["steps"]]
        steps = [event for event in events if event["event"] == "step"]
        self.assertEqual([{"event": "step", **step} for step in explained], steps)
        self.assertEqual("result", events[-1]["event"])

    def test_stand_there_only_where_an_explanation_is_asked_for(self):
        run = self.example("first-generation").migrate(HOST)
        self.assertEqual(([], []), (run.output, run.told("step")))


class Progress(ExplainTest):
    def on_terminal(self, direction):
        """What a run shows on a terminal."""
        device = self.device()
        arguments = [str(HOST), "--root", str(device.root), "--plugin", str(PLUGINS / "directed_migrator.so")]
        child, terminal = pty.fork()
        if child == 0:
            os.execve(arguments[0], arguments, {**os.environ, "TEST_PLUGIN": direction})
        shown = b""
        while True:
            try:
                shown += os.read(terminal, 4096)
            except OSError:
                break
        os.close(terminal)
        self.assertEqual(0, os.waitstatus_to_exitcode(os.waitpid(child, 0)[1]))
        return shown.decode()

    def test_is_shown_on_one_line_of_a_terminal_and_taken_away(self):
        wipe = "\r\x1b[K"
        self.assertEqual(f"{wipe}slow: 256 of 1000 accounts{wipe}done\r\n", self.on_terminal("work slowly"))

    def test_of_a_short_run_is_not_shown(self):
        self.assertEqual("", self.on_terminal("succeed"))

    def test_is_shown_nowhere_else(self):
        run = self.run_directed("work slowly", "--explain")
        self.assertEqual(["done"], run.errors)


class StandardOutput(ExplainTest):
    def test_that_cannot_be_written_is_said_and_does_not_change_the_status(self):
        with open("/dev/full", "wb") as full:
            run = subprocess.run([str(HOST), "--root", str(self.example("current").root), "--explain"],
                                               stdout=full, stderr=subprocess.PIPE, check=False)
        self.assertEqual((0, b"migration-host: the explanation could not be written to standard output\n"),
                         (run.returncode, run.stderr))


if __name__ == "__main__":
    unittest.main()
