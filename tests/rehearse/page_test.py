"""The page of one explanation, in a browser, as the host writes it."""

import os
import subprocess
import unittest

from selenium.webdriver.common.keys import Keys
from selenium.webdriver.support.ui import Select

from browser_case import BrowserTest
from device import SETTINGS, Device
from device_case import HOST
from rehearse_case import KEPT, UNFIXABLE

EVIL = "</script><script>document.title='broken'</script><img src=x onerror=alert(1)>"
MAIL = {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "M", "uniqueId": "U", "DisplayName": "Quarry Road"}
NARROW = {"width": 400, "height": 800, "deviceScaleFactor": 1, "mobile": False}


class Page(BrowserTest):
    def page(self, *accounts, version=0, options=("--dry-run",)):
        """A page about a device with these accounts."""
        return self.page_about(self.image("device", accounts, version=version), *options)

    def page_about(self, root, *options):
        page = self.scratch / "page.html"
        with open(page, "w", encoding="utf-8") as file:
            subprocess.run([HOST, "--root", root, "--explain=html", *options], stdout=file, stderr=subprocess.DEVNULL, check=False)
        return page

    def accounts(self):
        """Each account that is to be seen: its name, what it was, what it is."""
        return [tuple(each.find_element("css selector", part).text for part in (".who", ".before", ".after"))
                for each in self.all(".list > li") if each.is_displayed()]

    def tracks(self):
        return self.asks("[...document.querySelectorAll('.track')].map(each => each.getAttribute('aria-label'))")

    def test_tells_the_verdict_and_every_account_with_its_way(self):
        page = self.page(KEPT, UNFIXABLE, {**MAIL, "DisplayName": EVIL})
        self.opened(page)
        self.assertEqual("What a run would do to the accounts", self.browser.title)
        self.assertEqual(["1 account would be lost."], self.texts(".verdict"))
        self.assertEqual([("UNFIXABLE", "Mail", "lost"), (EVIL, "Mail", "Mail\nchanged"), ("KEPT", "LDAP", "LDAP\nas before")],
                         [row for row in self.accounts() if row[0] != "DeviceLocalAccount"])
        self.assertIn("load: lost", self.tracks())
        self.assertIn("version 2: changed; version 5: changed", self.tracks())
        self.assertIn("no step touched it", self.tracks())
        self.assert_quiet(page)
        self.assert_accessible()

    def test_tells_what_an_account_was_and_where_it_went(self):
        self.opened(self.page_about(self.example("first-generation").root, "--dry-run"))
        told = self.accounts()
        self.assertIn(("June at Gmail", "Mail", "Gmail\nchanged"), told)
        self.assertIn(("June's Google Calendar", "CalDAV", "in Gmail “June at Gmail”\nfolded into another"), told)
        self.assertIn(("Wexmo", "Nimbra", "Nimbra in VorlixAccount “Wexmo”\nmoved"), told)
        self.assertIn(("Wexmo", "", "VorlixAccount\nnew"), told)

    def test_tells_from_which_legacy_file_an_account_came(self):
        self.opened(self.page_about(self.example("legacy-files").root))
        before = {name: before for name, before, _ in self.accounts()}
        self.assertRegex(before["Tern Boatyard"], r"^MailAccounts\[0\] of /.*/Accounts\.plist$")

    def test_shows_losses_first_with_a_command_that_takes_the_device_back(self):
        snapshots = self.scratch / "snapshots"
        page = self.page(KEPT, UNFIXABLE, options=("--snapshots", snapshots))
        root = self.scratch / "device"
        self.assertEqual([KEPT["Identifier"]], [each["Identifier"] for each in Device(root).read_plist(SETTINGS)["Accounts"]
                                                if each["Type"] != "OnMyDevice"])
        self.opened(page)
        self.assertIn("1 account was lost.", self.texts(".verdict"))
        self.assertEqual("What is lost, and the way back", self.texts("h2")[0])
        command = next(text for text in self.texts(".command code") if text.startswith("migration-host "))
        self.run_command(command)
        self.assertIn(UNFIXABLE, Device(root).read_plist(SETTINGS)["Accounts"])

    def run_command(self, command):
        path = f"{HOST.parent}:{os.environ['PATH']}"
        subprocess.run(["bash", "-c", command], env={**os.environ, "PATH": path}, check=True, stdout=subprocess.DEVNULL)

    def test_brings_an_account_back_by_the_command_beside_it(self):
        page = self.page(KEPT, {**UNFIXABLE, "Note": "mine"}, options=("--snapshots", self.scratch / "snapshots"))
        self.opened(page)
        self.run_command(self.one(".cards .command code").text)
        accounts = Device(self.scratch / "device").read_plist(SETTINGS)["Accounts"]
        (found,) = [each for each in accounts if each["Identifier"] == UNFIXABLE["Identifier"]]
        self.assertEqual(("IMAPAccount", "mine"), (found["Class"], found["Note"]))

    def test_writes_commands_so_that_a_shell_reads_what_people_read(self):
        names = ["it's; echo \"oops\" $(id)", "plain", "turned\u202ebackwards"]
        self.opened(self.page(*({**UNFIXABLE, "Identifier": name} for name in names), options=()))
        commands = self.texts(".cards .command code")
        words = [subprocess.run(["bash", "-c", f'printf "%s\\n" {command}'], capture_output=True, text=True).stdout.splitlines()
                 for command in commands]
        self.assertEqual(names[:2], [each[-3] for each in words])

    def test_finds_accounts_by_words_and_by_what_happened(self):
        page = self.page(KEPT, UNFIXABLE, *({**MAIL, "Identifier": f"M{each}", "uniqueId": f"U{each}", "DisplayName": f"Quarry {each}"}
                                            for each in range(3)))
        self.opened(page)
        search = self.one("input[type=search]")
        search.send_keys("quarry 2")
        self.assertEqual(["Quarry 2"], [name for name, *_ in self.accounts()])
        self.assertEqual("1 of 6 accounts", self.one("[aria-live]").text)
        search.send_keys(Keys.CONTROL, "a")
        search.send_keys("dropped-unknown-class")
        self.assertEqual(["UNFIXABLE"], [name for name, *_ in self.accounts()])
        search.clear()
        search.send_keys(" ")
        Select(self.one("select")).select_by_value("kept")
        self.assertEqual(["KEPT"], [name for name, *_ in self.accounts()])
        self.assert_quiet(page)

    def test_opens_each_account_and_each_step_by_the_keyboard(self):
        self.opened(self.page(MAIL))
        mail = next(each for each in self.all(".list details") if "Quarry Road" in each.text)
        mail.find_element("css selector", "summary").send_keys("\n")
        self.assertIn("version 1 to 2: each account keeps the identifier it was synced by", mail.text)
        self.assertIn("Identifier (was uniqueId) “M” → “U”", mail.text)
        step = next(each for each in self.all("details") if each.text.startswith("load"))
        step.find_element("css selector", "summary").send_keys("\n")
        self.assertIn("read 1 account of data version 0", step.text)

    def test_hides_secrets(self):
        page = self.page({**MAIL, "Type": "Nimbra", "Class": "NimbraAccount", "Password": "geheim", "Subscribed Calendars": [{"Password": "geheim"}]})
        self.opened(page)
        self.assertNotIn("geheim", self.asks("document.documentElement.innerHTML"))

    def test_shows_all_of_it_on_paper(self):
        self.opened(self.page(KEPT, UNFIXABLE))
        self.emulate(media="print")
        self.assertTrue(all(each.is_displayed() for each in self.all("details ul > li:first-child")))
        self.assertFalse(any(each.is_displayed() for each in self.all(".filters")))

    def test_can_be_read_in_light_and_in_the_dark(self):
        page = self.page(KEPT)
        self.opened(page, "light")
        light = self.asks("getComputedStyle(document.documentElement).backgroundColor")
        self.assert_readable()
        self.emulate(features=[{"name": "prefers-color-scheme", "value": "dark"}])
        self.assertNotEqual(light, self.asks("getComputedStyle(document.documentElement).backgroundColor"))
        self.assert_readable()

    def test_fits_a_telephone(self):
        page = self.page(UNFIXABLE, {**MAIL, "DisplayName": "A name that is far too long for it " * 5, "Hostname": "h" * 300}, options=())
        self.browser.execute_cdp_cmd("Emulation.setDeviceMetricsOverride", NARROW)
        self.addCleanup(self.browser.execute_cdp_cmd, "Emulation.clearDeviceMetricsOverride", {})
        self.opened(page)
        for each in self.all("summary"):
            each.click()
        self.assertLessEqual(self.asks("document.documentElement.scrollWidth"), 400)

    def test_is_there_in_a_second_with_a_thousand_accounts(self):
        page = self.page(*({**MAIL, "Identifier": f"M{each}", "uniqueId": f"U{each}", "DisplayName": f"Quarry {each}"}
                           for each in range(1000)))
        self.opened(page)
        self.assertEqual("1,001 accounts", self.one("[aria-live]").text)
        self.assertLess(self.asks("performance.now() - performance.timing.domInteractive + performance.timing.navigationStart"), 5000)
        taken = """(() => { const begun = performance.now(); const input = document.querySelector('input');
            input.value = 'quarry 77'; input.dispatchEvent(new Event('input')); document.body.getBoundingClientRect();
            return performance.now() - begun; })()"""
        self.assertLess(self.asks(taken), 1000)
        self.assertEqual(19, self.asks("document.querySelectorAll('.list > li:not([hidden])').length"))


if __name__ == "__main__":
    unittest.main()
