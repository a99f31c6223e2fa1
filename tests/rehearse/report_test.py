"""The report of a fleet, in a browser: what it tells, how it is searched, and that it stays quick."""

import json
import os
import time
import unittest
import zlib

from selenium.webdriver.common.keys import Keys
from selenium.webdriver.support.ui import Select, WebDriverWait

from browser_case import BrowserTest
from device import CURRENT_VERSION
from migration_rehearse.rehearsal import Identified, Rehearsed
from migration_rehearse.results import Results
from rehearse_case import KEPT, UNFIXABLE

EVIL = "<img src=x onerror=alert(1)> "
ROWS = "#devices ~ .scroll tbody tr"
NAMES = ROWS + " th"


class ReportTest(BrowserTest):
    def report(self, *options, results=None):
        page = self.scratch / "report.html"
        self.command("report", results or self.file, "--output", page, *options)
        return page

    def simulated(self, count):
        """A result file of this many devices, each with an explanation of its own."""
        with Results(self.file) as results:
            release = results.release("1", "d")
            for number in range(count):
                results.add_image(Identified(f"/fleet/device-{number:06}", "directory", "", str(number)))
                results.add(str(number), release, self.simulated_rehearsal(number))
        return self.file

    def simulated_rehearsal(self, number):
        account = {"type": "Mail", "name": f"Account {number}", "identifier": f"identifier-{number * 7919}"}
        facts = [{"fact": "changed", "account": account, "changes": [{"key": f"Key {each}", "to": each * number}]}
                 for each in range(10)]
        explanation = {"stages": [{"stage": "load", "facts": facts}], "result": {"success": True, "verdict": "kept"}}
        losses = {f"code-{number // 10 % 5}": 1 + number % 3} if number % 10 == 0 else {}
        return Rehearsed(
            "lost" if losses else "kept", stored_version=number % (CURRENT_VERSION + 1),
            accounts=number % 40, losses=losses,
            counts={"changed": 1, "lost": sum(losses.values())}, facts={("load", "changed", ""): 10},
            seconds=0.01 * (1 + number % 97), peak_memory=(8 + number % 5) << 20, fingerprint=number.to_bytes(16, "big"),
            document=zlib.compress(json.dumps({"console": [], "explanation": explanation}).encode()))


class Report(ReportTest):
    made = {}  # the page, once for all tests

    def setUp(self):
        super().setUp()
        if not self.made:
            images = [self.image("kept"), self.image(EVIL + "lost", [KEPT, UNFIXABLE], version=3),
                      self.image("old", version=0)]
            self.rehearse(*images, "/nowhere/missing", status=3)
            self.made["page"] = self.report().read_bytes()
        self.page = self.scratch / "opened.html"
        self.page.write_bytes(self.made["page"])
        self.opened(self.page)

    def names(self):
        """Of the devices that are shown, without their directories."""
        return [name.rpartition("/")[2] for name in self.texts(NAMES)]

    def test_tells_of_verdicts_versions_losses_and_causes(self):
        self.assertEqual(["1 device of 4 would lose something. 1 could not be rehearsed."], self.texts(".verdict"))
        self.assertEqual(["2\nnothing lost", "1\naccounts lost", "1\nnot rehearsed"], self.texts(".tiles li"))
        self.assertIn("version 3 1 1", self.texts("#versions ~ .scroll tbody tr"))
        self.assertEqual(["missing 1 there is no such directory or file Show the images"],
                         self.texts("#causes ~ .scroll tbody tr"))
        self.assertEqual(1, len(self.all("#losses ~ .scroll tbody tr")))
        self.assertEqual("load", self.one("#steps ~ .scroll tbody th").text)
        self.assertEqual(3, len(self.all("#distributions ~ .columns svg")))
        self.assertEqual(4, len(self.all(ROWS)))

    def test_shows_the_devices_behind_a_reason(self):
        self.one("#losses ~ .scroll button").send_keys("\n")
        self.assertEqual([EVIL + "lost"], self.names())

    def test_is_searched_by_words_and_verdicts(self):
        self.one("input").send_keys("old version 0")
        self.assertEqual(["old"], self.names())
        self.assertEqual("1 device, page 1 of 1", self.one("[aria-live]").text)
        self.one("input").clear()
        Select(self.one("select")).select_by_visible_text("not rehearsed")
        self.assertEqual(["missing"], self.names())

    def test_sorts_by_a_column(self):
        self.one("#devices ~ .scroll thead th:nth-child(3) button").click()
        self.assertEqual("descending", self.one("#devices ~ .scroll thead th:nth-child(3)").get_attribute("aria-sort"))
        self.assertEqual(["12", "3", "0", "–"], self.texts(ROWS + " td:nth-child(3)"))

    def test_opens_a_devices_own_explanation_and_goes_back_by_the_keyboard(self):
        button = next(each for each in self.all(NAMES + " button") if each.text.endswith("lost"))
        button.send_keys(Keys.ENTER)
        WebDriverWait(self.browser, 20).until(lambda _: self.all("dialog[open] .list .who"))
        self.assertEqual("1 account would be lost.", self.one("dialog .verdict").text)
        self.one("dialog button").send_keys(Keys.ESCAPE)
        self.assertEqual([], self.all("dialog[open]"))
        self.assertEqual(button, self.browser.switch_to.active_element)

    def test_says_why_an_image_could_not_be_rehearsed(self):
        next(each for each in self.all(NAMES + " button") if each.text.endswith("missing")).click()
        WebDriverWait(self.browser, 20).until(lambda _: self.all("dialog[open] .verdict"))
        self.assertEqual("not rehearsed", self.one("dialog .verdict").text)

    def test_asks_for_nothing_and_can_be_used_by_anybody(self):
        next(each for each in self.all(NAMES + " button") if each.text.endswith("old")).click()
        WebDriverWait(self.browser, 20).until(lambda _: self.all("dialog[open] .verdict"))
        self.assert_quiet(self.page)
        self.assert_accessible()
        self.assertEqual("", self.asks("window.broken || ''"))


class LargeReport(ReportTest):
    def test_of_ten_thousand_devices_is_quick(self):
        self.simulated(10_000)
        page = self.report()
        self.assertLess(os.path.getsize(page), 16 << 20)
        self.opened(page)
        self.assertEqual(100, len(self.all(ROWS)))
        self.assertLess(self.asks("document.querySelectorAll('*').length"), 4000)
        taken = """(() => { const begun = performance.now(); const input = document.querySelector('input');
            input.value = 'device-009 code-0'; input.dispatchEvent(new Event('input')); return performance.now() - begun; })()"""
        self.assertLess(self.asks(taken), 1000)
        self.assertEqual("20 devices, page 1 of 1", self.one("[aria-live]").text)
        self.one(NAMES + " button").click()
        WebDriverWait(self.browser, 20).until(lambda _: self.all("dialog[open] .list .who"))
        self.assertEqual("Account 9000", self.one("dialog .list .who").text)

    def test_of_more_devices_counts_all_and_names_those_that_matter(self):
        self.simulated(2000)
        self.opened(self.report("--devices", 300))
        self.assertIn("200 devices of 2,000 would lose something.", self.texts(".verdict"))
        self.assertEqual("300 devices, page 1 of 3", self.one("[aria-live]").text)
        Select(self.one("select")).select_by_visible_text("accounts lost")
        self.assertEqual("200 devices, page 1 of 2", self.one("[aria-live]").text)

    def test_names_a_device_behind_each_reason_however_few_they_are(self):
        with Results(self.simulated(2000)) as results:
            rare = self.simulated_rehearsal(1990)._replace(losses={"rare": 1}, seconds=0.01)
            results.add_image(Identified("/fleet/zzz", "directory", "", "zzz"))
            results.add("zzz", results.chosen_release(), rare)
        self.opened(self.report("--devices", 100))
        self.one("button[aria-label='Show the devices: rare']").send_keys("\n")
        self.assertEqual(["/fleet/zzz"], self.texts(NAMES))

    def test_offers_no_devices_behind_a_reason_where_none_is_named(self):
        self.simulated(2000)
        self.opened(self.report("--devices", 3))
        self.assertEqual(5, len(self.all("#losses ~ .scroll tbody tr")))
        self.assertTrue(1 <= len(self.all("#losses ~ .scroll button")) <= 3)

    def test_is_made_of_the_release_that_is_asked_for(self):
        with Results(self.simulated(3)) as results:
            results.release("2", "e")
        self.assertIn("release 1 (d)", self.command("report", self.file, "--release", 1, "--output", self.scratch / "x"))
        self.assertIn("no release 3", self.command("report", self.file, "--release", 3, status=4))

    def test_is_not_made_where_it_cannot_be_written(self):
        self.simulated(1)
        begun = time.monotonic()
        self.command("report", self.file, "--output", self.scratch / "no/where", status=4)
        self.assertLess(time.monotonic() - begun, 100)


if __name__ == "__main__":
    unittest.main()
