"""Two releases compared: what differs, by kind with the smallest example, and what a gate lets pass."""

import json
import unittest
from collections import Counter

from migration_rehearse.rehearsal import Identified, Rehearsed
from migration_rehearse.results import Results
from rehearse_case import RehearseTest

LOADED = {("load", "loaded", ""): 1}


def ended(verdict="kept", mark=0, codes=(), facts=LOADED, accounts=1, **more):
    """A rehearsal; `mark` stands for all that is in its explanation. A code that is there twice lost two accounts."""
    return Rehearsed(verdict, accounts=accounts, losses=Counter(codes), counts={"lost": len(codes)}, facts=facts,
                     fingerprint=bytes([mark]) * 16, **more)


def failed(cause):
    return Rehearsed("unrehearsed", cause)


class CompareTest(RehearseTest):
    def filled(self, name, digest, **devices):
        path = self.scratch / name
        with Results(path) as results:
            release = results.release("1", digest)
            for device, rehearsed in devices.items():
                results.add_image(Identified(f"/fleet/{device}", "directory", "", device))
                results.add(device, release, rehearsed)
        return path

    def forget_image(self, name, device):
        """The image has other contents by now."""
        with Results(self.scratch / name) as results:
            results.change("UPDATE images SET content = 'other' WHERE content = ?", (device,))

    def compared(self, old, new, *options, status=1):
        files = self.filled("old", "d", **old), self.filled("new", "e", **new)
        return self.command("compare", *files, *options, status=status)


class Compare(CompareTest):
    def difference(self, old, new):
        return json.loads(self.compared({"device": old}, {"device": new}, "--json"))["differences"][0]

    def test_says_that_nothing_differs(self):
        told = self.compared({"a": ended(), "b": ended("lost")}, {"a": ended(), "b": ended("lost")}, status=0)
        self.assertRegex(told, r"^2 devices under release 1 \(d\) and under 1 \(e\):\n +2  end the same\n")

    def test_tells_of_verdicts_losses_facts_numbers_and_values_apart(self):
        more = {**LOADED, ("save", "saved", ""): 1}
        self.assertEqual(["kept", "lost"], self.difference(ended(), ended("lost", 1, ["c"]))["verdicts"])
        self.assertEqual(["c"], self.difference(ended("lost"), ended("lost", 2, ["c"]))["lost_more"])
        self.assertEqual(["save saved"], self.difference(ended(mark=3), ended(mark=4, facts=more))["facts_more"])
        self.assertTrue(self.difference(ended(mark=5), ended(mark=6, facts={("load", "loaded", ""): 2}))["is_by_numbers"])
        self.assertIn("other values only", self.compared({"x": ended(mark=7)}, {"x": ended(mark=8)}))

    def test_names_the_smallest_example_of_each_kind(self):
        sizes = {"large": 9, "small": 2, "middle": 5}
        told = self.compared({name: ended(accounts=size) for name, size in sizes.items()},
                             {name: ended("lost", 1, accounts=size) for name, size in sizes.items()})
        self.assertRegex(told, r"\n +3  kept → lost\n +such as /fleet/small\n")

    def test_lists_each_device_that_ends_differently_and_each_that_breaks_a_rule(self):
        listed = self.scratch / "listed"
        new = {"a": ended(), "b\n": ended("lost", 1, ["c"]), "d": ended("lost", 2, ["c"])}
        self.compared(dict.fromkeys(new, ended()) | {"e": ended()}, new, "--gate", "none-lost,all-rehearsed", "--output", listed)
        told = [json.loads(line) for line in listed.read_text().splitlines()]
        lost = "kept → lost; loses by: c"
        self.assertEqual([{"device": "/fleet/b\n", "difference": lost}, {"device": "/fleet/d", "difference": lost},
                          {"device": "/fleet/b\n", "breaks": "none-lost"}, {"device": "/fleet/d", "breaks": "none-lost"},
                          {"device": "/fleet/e", "breaks": "all-rehearsed"}], told)
        self.compared({"a": ended()}, {"a": ended()}, "--output", self.scratch / "no/where", status=4)

    def test_compares_only_what_both_have(self):
        told = self.compared({"a": ended(), "b": ended()}, {"b": ended(), "c": ended(), "e": ended()}, status=0)
        self.assertIn("1 devices are in the earlier results only.\n2 devices are in the later results only.", told)

    def test_counts_nothing_that_no_image_has_any_more(self):
        self.filled("old", "d", a=ended(), b=ended())
        self.filled("new", "e", a=ended(), b=ended("lost", 1), c=ended("lost", 1))
        self.forget_image("old", "b")
        self.forget_image("new", "c")
        told = self.command("compare", self.scratch / "old", self.scratch / "new")
        self.assertRegex(told, "^1 devices under .*\n +1  end the same\n1 devices are in the later results only.\n")

    def test_takes_two_releases_of_one_file(self):
        path = self.filled("both", "d", a=ended())
        self.command("compare", path, path, status=4)
        self.filled("both", "e", a=ended("lost", 1))
        self.assertIn("kept → lost", self.command("compare", path, path, "--earlier", "d", status=1))


class Gate(CompareTest):
    OLD = {"kept": ended(), "lossy": ended("lost", 1, ["c"]), "slow": ended(processor_seconds=0.2)}

    def gate(self, rules, status, *options, **new):
        return self.compared(self.OLD, {**self.OLD, **new}, "--gate", rules, *options, status=status)

    def test_passes_what_breaks_no_rule(self):
        self.gate("none-newly-lost,none-different,all-rehearsed,none-slower=1.5", 0)
        self.gate("none-newly-lost", 0, kept=ended(mark=9))

    def test_stops_each_thing_that_it_names(self):
        self.assertIn("1 devices break none-lost", self.gate("none-lost", 1))
        self.assertIn("break none-newly-lost", self.gate("none-newly-lost", 1, kept=ended("not saved", 2)))
        self.assertIn("break none-newly-lost", self.gate("none-newly-lost", 1, lossy=ended("lost", 2, ["c", "more"])))
        self.assertIn("break none-different", self.gate("none-different", 1, kept=ended(mark=9)))
        self.assertIn("break all-rehearsed", self.gate("all-rehearsed", 1, kept=Rehearsed("unrehearsed", "timeout")))
        self.assertIn("break none-slower", self.gate("none-slower=2", 1, slow=ended(processor_seconds=0.5)))

    def test_takes_what_the_release_could_not_do_as_lost(self):
        for cause in ("crashed", "timeout", "memory", "too-much-output", "no-explanation", "worker-died"):
            self.assertIn("1 devices break none-newly-lost", self.gate("none-newly-lost", 1, kept=failed(cause)), cause)
            self.assertIn("2 devices break none-lost", self.gate("none-lost", 1, kept=failed(cause)), cause)

    def test_takes_what_is_wrong_with_an_image_as_no_loss(self):
        self.gate("none-newly-lost", 0, kept=failed("damaged-archive"))
        self.assertIn("1 devices break none-lost", self.gate("none-lost", 1, kept=failed("unreadable")))

    def test_takes_what_the_earlier_release_could_not_do_either_as_no_new_loss(self):
        self.compared({"a": failed("crashed")}, {"a": failed("crashed")}, "--gate", "none-newly-lost", status=0)

    def test_names_a_device_that_breaks_a_rule(self):
        self.assertIn("1 devices break none-lost, such as /fleet/lossy (no", self.gate("none-lost", 1))
        told = json.loads(self.gate("none-lost", 1, "--json").partition("\nmigration-rehearse")[0])
        self.assertEqual({"none-lost": {"devices": 1, "example": "/fleet/lossy"}}, told["broken"])

    def test_tells_losses_apart_by_their_codes(self):
        for codes in (["other"], ["c", "other"], ["c", "c"]):
            self.gate("none-newly-lost", 1, lossy=ended("lost", 2, codes))
        self.gate("none-newly-lost", 0, lossy=ended("lost", 3, ["c"]))

    def test_takes_a_worse_end_as_a_new_loss(self):
        for verdict in ("not saved", "failed", "refused"):
            self.gate("none-newly-lost", 1, lossy=ended(verdict, 2, ["c"]))

    def test_stops_what_was_compared_with_nothing(self):
        for new in ({}, {"another": ended()}):
            told = self.compared(self.OLD, new, "--gate", "none-lost", status=1)
            self.assertIn("gate: no device was compared, so none can pass", told)
        gone = Identified("/fleet/gone", "", "", "none:gone", ("missing", ""))
        for name in ("old", "new"):
            self.filled(name, name)
            with Results(self.scratch / name) as results:
                results.add_image(gone)
                results.add(gone.content, results.chosen_release(), failed("missing"))
        self.command("compare", self.scratch / "old", self.scratch / "new", "--gate", "none-lost", status=1)

    def test_stops_where_a_device_was_left_out(self):
        told = self.compared(self.OLD, {"kept": ended()}, "--gate", "all-rehearsed,none-lost", status=1)
        self.assertIn("2 devices break all-rehearsed", told)
        self.compared({"kept": ended()}, {**self.OLD, "lossy": ended()}, "--gate", "all-rehearsed", status=0)

    def test_forgets_what_no_image_has_any_more(self):
        files = self.filled("old", "d", a=ended()), self.filled("new", "e", a=ended(), b=ended("lost", 1))
        self.command("compare", *files, "--gate", "none-lost", status=1)
        self.forget_image("new", "b")
        self.command("compare", *files, "--gate", "none-lost")

    def test_says_what_is_no_rule(self):
        for rules in ("none", "none-slower", "none-slower=fast", "none-slower=nan", "none-slower=-1", "none-lost=1", ""):
            self.gate(rules, 2)


if __name__ == "__main__":
    unittest.main()
