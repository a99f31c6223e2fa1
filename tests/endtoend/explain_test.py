"""The explanation of a run: for people, for machines, and as facts in the trace."""

import base64
import json
import os
import pty
import re
import subprocess
import unittest
import zlib

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS_COPY
from device_case import HOST, DeviceTest

MOVED_BY = "_migrateAccountsFrom8B117:"
SECRET = "correct horse battery staple"


def account(identifier, type="CalDAV", **more):
    return {"Identifier": identifier, "Type": type, "Class": "SomeAccount", **more}


def secretive_device(test):
    device = test.device(Version=0, Accounts=[
        account("a", "Exchange", Password=SECRET, uniqueId="b", Cookies=[SECRET], Blob=SECRET.encode(),
                Nested={"AuthToken": SECRET}),
        account("c", "Unheard of", Password=SECRET),
        account("d", "Nimbra", uniqueId="e", **{"Subscribed Calendars": [{"Password": SECRET}]}) |
        {"Class": "NimbraAccount"}])
    device.write_plist(LEGACY_EXCHANGE, {"DAAccountsKey": [
        {"DAAccountConfigurationClass": "ASAccount", "DAAccountConfigurationAccountID": "a", "Password": SECRET}]})
    return device


def in_order_of_releases(stage):
    return [int(part) if part.isdigit() else part for part in re.split(r"(\d+)", stage)]


class ExplainTest(DeviceTest):
    def document(self, device, *options):
        run = self.run_host("--root", device.root, "--explain=json", *options)
        return json.loads("\n".join(run.output))

    def facts(self, device, kind):
        """The explained run's facts of this kind, each with the stage in which it was told."""
        return [{"in": stage["stage"], **fact} for stage in self.document(device)["stages"]
                for fact in stage["facts"] if fact["fact"] == kind]

    def text(self, device, *options):
        return self.run_host("--root", device.root, "--explain", *options).output


class Machines(ExplainTest):
    def test_are_told_of_every_stage_in_order(self):
        document = self.document(self.example("first-generation"))
        self.assertEqual((2, False, True), (document["schema"], document["rehearsal"], document["complete"]))
        stages = [stage["stage"] for stage in document["stages"] if stage["stage"] != "save"]
        self.assertEqual(["copy aside", "load"], stages[:2])
        self.assertEqual(sorted(stages[2:], key=in_order_of_releases), stages[2:])
        counts = {"kept": 0, "changed": 8, "added": 2, "converted": 0, "moved": 2, "folded": 1, "dropped": 0, "lost": 0}
        self.assertEqual({"dataClass": "accounts", "success": True, "verdict": "kept", "storedVersion": 0,
                          "accounts": 10, "version": CURRENT_VERSION, "counts": counts}, document["result"])

    def test_are_told_which_host_did_it_where_and_when(self):
        device = self.example("current")
        document = self.document(device)
        self.assertEqual((self.run_host("--version").output[0], str(device.root)),
                         (f"migration-host {document['host']}", document["root"]))
        self.assertRegex(document["time"], r"^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\dZ$")

    def test_are_told_a_step_in_words(self):
        stages = {stage["stage"]: stage.get("words") for stage in self.document(self.example("first-generation"))["stages"]}
        self.assertEqual("version 4 to 5: Gmail and Yahoo accounts get their own type, and their calendars",
                         stages["_migrateAccountsFrom7A242:"])
        self.assertIsNone(stages["load"])

    def test_are_told_from_what_an_account_was_converted(self):
        device = self.example("legacy-files")
        converted = {fact["account"]["name"]: fact for fact in self.facts(device, "converted")}
        boatyard = converted["Tern Boatyard"]
        self.assertEqual("mail conversion", boatyard["in"])
        self.assertEqual(f"MailAccounts[0] of {device.path(LEGACY_MAIL)}", boatyard["from"])
        self.assertIn({"key": "Class", "renamedFrom": "AccountType", "to": "IMAPAccount"}, boatyard["changes"])
        self.assertEqual("exchange conversion", converted["Coastguard"]["in"])

    def test_are_told_of_keys_that_changed(self):
        changed = self.facts(self.example("first-generation"), "changed")
        gmail = [fact for fact in changed if fact["in"] == "_migrateAccountsFrom7A242:"
                 and fact["account"]["name"] == "June at Gmail"]
        self.assertIn({"key": "Type", "from": "Mail", "to": "Gmail"}, gmail[0]["changes"])

    def test_are_told_of_moves_and_folds(self):
        device = self.example("first-generation")
        document = json.dumps(self.document(device))
        again = self.example("first-generation")
        moved = self.facts(again, "moved")
        self.assertEqual({("Wexmo", "Wexmo"), ("Nimbra", "Nimbra")},
                         {(fact["account"]["name"], fact["into"][0]["name"]) for fact in moved})
        self.assertEqual({MOVED_BY}, {fact["in"] for fact in moved})
        self.assertIn('"fact": "folded", "account": {"type": "CalDAV", "name": "June\'s Google Calendar"', document)

    def test_are_told_of_each_lost_account_by_a_code_and_where_its_data_still_are(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[account("a", "Unheard of"), account("b", "Mail", DisplayName="B"), 7])
        document = self.document(device)
        copy = str(device.path(SETTINGS_COPY))
        nameless = {"name": "", "where": copy}
        self.assertEqual(
            [{"code": "dropped-unknown-type", "reason": "its type is unknown", "detail": '"Unheard of"',
              "type": "Unheard of", "identifier": "a", **nameless},
             {"code": "dropped-unknown-class", "reason": "its class is unknown and no directory tells a better one",
              "type": "Mail", "identifier": "b", "name": "B", "where": copy},
             {"code": "dropped-no-record", "reason": "it is no account record", "where": copy}],
            document["result"]["lost"])
        self.assertEqual(("lost", 3, 3), (document["result"]["verdict"], document["result"]["counts"]["dropped"],
                                          document["result"]["counts"]["lost"]))

    def test_are_told_of_the_repair_while_saving(self):
        changed = self.facts(self.example("legacy-files"), "changed")
        repaired = [fact["changes"] for fact in changed if fact["in"] == "save"]
        self.assertEqual([[{"key": "Class", "from": "MailAccount", "to": "POPAccount"}]], repaired)

    def test_are_told_of_files_that_went(self):
        device = self.example("legacy-files")
        removed = [fact["file"] for fact in self.facts(device, "source-removed")]
        self.assertEqual([str(device.path(LEGACY_EXCHANGE)), str(device.path(LEGACY_MAIL))], removed)


class People(ExplainTest):
    def test_read_that_nothing_happened_in_a_few_lines(self):
        self.assertEqual(["What the run did", "", "No account was changed.", "",
                          f"result: success; everything was kept; 5 accounts of data version {CURRENT_VERSION}, "
                          f"stored before as version {CURRENT_VERSION}",
                          "accounts: 5 kept"], self.text(self.example("current"))[:-1])

    def test_read_what_became_of_an_account_under_the_stage(self):
        lines = self.text(self.example("first-generation"))
        at = lines.index("version 3 to 4: hosted accounts no longer sync notes (_migrateAccountsFrom7A241:)")
        self.assertEqual(['  Nimbra "Wexmo" (F4A2B3C5-D6E7-4F80-9A1B-2C3D4E5F6707)',
                          '    ~ Enabled Dataclasses: -"com.vorlix.Dataclass.Notes"'], lines[at + 1:at + 3])

    def test_read_a_hundred_accounts_that_changed_alike_in_a_minute(self):
        device = self.device(Version=1, Accounts=[account(f"a{n}", "Exchange") for n in range(100)])
        lines = self.text(device)
        self.assertLess(len(lines), 100)
        self.assertIn("  and 60 more accounts with other values", lines)

    def test_read_of_every_account_that_was_dropped(self):
        device = self.device(Version=CURRENT_VERSION, Accounts=[account(f"a{n}", "Unheard of") for n in range(100)])
        lost = [line for line in self.text(device) if line.startswith("  lost: ")]
        self.assertEqual(100, len(lost))

    def test_are_warned_when_legacy_files_went_although_the_save_failed(self):
        device = self.example("legacy-files")
        device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        lines = self.text(device)
        self.assertTrue(any(line.startswith("  NOT SAVED: Could not find the account mobile") for line in lines))
        lost = [line for line in lines if line.startswith("WARNING: lost: ") and "[not-saved]" in line]
        self.assertTrue(any('"Tern Boatyard"' in line and line.endswith("Accounts.plist.unsaved-1") for line in lost))
        self.assertTrue(any("THE ACCOUNTS WERE NOT SAVED" in line for line in lines))

    def test_are_warned_when_a_file_went_of_which_nothing_was_converted(self):
        device = self.device()
        device.write_plist(LEGACY_MAIL, {"MailAccounts": [{"uniqueId": "no class"}]})
        lines = self.text(device)
        self.assertIn(f"  lost: account (no class): its description in the legacy file has no class: MailAccounts[0] of"
                      f" {device.path(LEGACY_MAIL)} [refused-description]", lines)
        self.assertTrue(any(line.startswith("WARNING: ") for line in lines))


class Pages(ExplainTest):
    def page(self, device, *options):
        return "\n".join(self.run_host("--root", device.root, "--explain=html", *options).output)

    def shown(self, page):
        """The document that the page shows."""
        packed = re.search('<script type="application/json" id="document">([A-Za-z0-9+/=]*)</script>', page)[1]
        return json.loads(zlib.decompress(base64.b64decode(packed, validate=True)))

    def test_show_what_machines_are_told_and_the_accounts_that_stand_there_now(self):
        device = self.example("first-generation")
        told = self.document(device, "--dry-run")
        shown = self.shown(self.page(device))
        accounts = shown.pop("accounts")
        self.assertEqual(told["result"], shown["result"])
        self.assertEqual([stage["stage"] for stage in told["stages"]], [stage["stage"] for stage in shown["stages"]])
        parents = {each["identifier"]: each["name"] for each in accounts}
        self.assertEqual([("Wexmo", "Wexmo"), ("Nimbra", "Nimbra")],
                         [(each["name"], parents[each["parent"]]) for each in accounts if "parent" in each])
        self.assertEqual(told["result"]["accounts"], sum("parent" not in each for each in accounts))

    def test_of_a_rehearsal_have_the_accounts_as_they_would_be(self):
        shown = self.shown(self.page(self.example("first-generation"), "--dry-run"))
        self.assertTrue(shown["rehearsal"])
        self.assertIn("Gmail", {each["type"] for each in shown["accounts"]})

    def test_have_nothing_in_them_that_a_text_of_a_device_could_end(self):
        evil = "</script><script>alert(1)</script>@EXPLANATIONS@"
        device = self.device(Version=0, Accounts=[account("a", DisplayName=evil), account("b", DisplayName="x" * 5)])
        page = self.page(device)
        self.assertNotIn("alert(1)", page)
        self.assertEqual(evil, self.shown(page)["accounts"][0]["name"])

    def test_of_a_thousand_accounts_stay_below_a_megabyte(self):
        names = [f"{number:04} {os.urandom(12).hex()}" for number in range(1000)]
        accounts = [account(name, "Mail", DisplayName=name, uniqueId=name[::-1], Hostname=f"{name}.example") | {"Class": "IMAPAccount"}
                    for name in names]
        page = self.page(self.device(Version=0, Accounts=accounts))
        self.assertLess(len(page.encode()), 1_000_000)
        self.assertLessEqual(set(names), {each["name"] for each in self.shown(page)["accounts"]})

    def test_of_an_earlier_run_are_made_of_what_its_snapshot_keeps(self):
        device, snapshots = self.example("first-generation"), ("--snapshots", self.scratch / "snapshots")
        self.run_host("--root", device.root, *snapshots)
        shown = self.shown(self.page(device, *snapshots, "--of", "latest"))
        told = self.document(device, *snapshots, "--of", "latest")
        self.assertEqual(told, shown)

    def test_are_refused_to_a_terminal_before_anything_is_touched(self):
        device = self.example("first-generation")
        before = device.entries()
        terminal, inner = pty.openpty()
        ended = subprocess.run([HOST, "--root", device.root, "--explain=html"], stdout=inner, stderr=subprocess.PIPE, text=True)
        os.close(inner)
        os.close(terminal)
        self.assertEqual(2, ended.returncode)
        self.assertIn("send it to a file", ended.stderr)
        self.assertEqual(before, device.entries())

    def test_hide_secrets(self):
        shown = self.shown(self.page(secretive_device(self)))
        self.assertNotIn(SECRET, json.dumps(shown))
        self.assertIn("<hidden>", json.dumps(shown))


class Secrets(ExplainTest):
    def test_are_shown_nowhere(self):
        for options in (["--explain"], ["--explain=json"]):
            trace = self.scratch / "trace"
            device = secretive_device(self)
            run = self.run_host("--root", device.root, "--trace", trace, *options)
            told = "\n".join(run.output + run.errors) + trace.read_text()
            self.assertNotIn(SECRET, told)
            self.assertNotIn(SECRET.encode().hex(), told)
            self.assertIn("<hidden>", "\n".join(run.output))


class Facts(ExplainTest):
    def test_stand_in_the_trace_as_in_the_explanation(self):
        device, trace = self.example("legacy-files"), self.scratch / "trace"
        document = self.document(device, "--trace", trace)
        events = [json.loads(line) for line in trace.read_text().splitlines()]
        explained = [{"stage": stage["stage"], **({"within": stage["within"]} if "within" in stage else {}), **fact}
                     for stage in document["stages"] for fact in stage["facts"]]
        facts = [event for event in events if event["event"] == "fact"]
        self.assertEqual([{"event": "fact", **fact} for fact in explained], facts)
        self.assertEqual("result", events[-1]["event"])

    def test_stand_there_only_where_an_explanation_is_asked_for(self):
        run = self.example("first-generation").migrate(HOST)
        self.assertEqual(([], []), (run.output, run.told("fact")))


class Terminals(ExplainTest):
    def test_are_not_steered_by_what_is_explained(self):
        device = self.device(Version=11, Accounts=[
            {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "a\u009b2Jb\nc", "DisplayName": "\u202ed\x1b[31m"},
            {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "a\u009b2Jb\nc"},
        ])
        lines = device.migrate(HOST, "--explain", "--dry-run").output
        self.assertEqual([], [line for line in lines if line.startswith("c")])
        shown = "\n".join(lines)
        self.assertIn("2J", shown)
        for mark in "\u009b\u202e\x1b":
            self.assertNotIn(mark, shown)


class StandardOutput(ExplainTest):
    def test_that_cannot_be_written_is_said_and_does_not_change_the_status(self):
        with open("/dev/full", "wb") as full:
            run = subprocess.run([str(HOST), "--root", str(self.example("current").root), "--explain"],
                                               stdout=full, stderr=subprocess.PIPE, check=False)
        self.assertEqual((9, b"migration-host: the explanation could not be written to standard output\n"),
                         (run.returncode, run.stderr))


if __name__ == "__main__":
    unittest.main()
