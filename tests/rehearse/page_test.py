"""The page of one explanation, in a browser: the template filled with what the host prints."""

import subprocess
import unittest

from browser_case import TEMPLATE, BrowserTest
from device_case import HOST
from rehearse_case import KEPT, UNFIXABLE

EVIL = "</script><script>document.title='broken'</script><img src=x onerror=alert(1)>"


class Page(BrowserTest):
    def page(self, *accounts, version=0):
        root = self.image("device", accounts, version=version)
        told = subprocess.run([HOST, "--root", root, "--dry-run", "--explain=json"], capture_output=True, text=True).stdout
        page = self.scratch / "page.html"
        template = TEMPLATE.read_text()
        page.write_text(template.replace("@DOCUMENT@", told.replace("<", "\\u003c")).replace("@EXPLANATIONS@", ""))
        return page

    def test_tells_the_verdict_and_every_account_with_its_path(self):
        mail = {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "M", "DisplayName": EVIL}
        page = self.page(KEPT, UNFIXABLE, mail)
        self.opened(page)
        self.assertEqual("What a run would do to the accounts", self.browser.title)
        self.assertEqual(["Accounts would be lost."], self.texts(".verdict"))
        self.assertIn(f"Mail “{EVIL}”", self.texts(".path tbody th"))
        self.assertIn("~changed", [text.replace("\n", "") for text in self.asks(
            "[...document.querySelectorAll('.path td')].map(each => each.textContent)")])
        self.assert_quiet(page)
        self.assert_accessible()

    def test_opens_each_step_by_the_keyboard(self):
        page = self.page({"Type": "Mail", "Class": "IMAPAccount", "Identifier": "M", "uniqueId": "U"})
        self.opened(page)
        step = self.all("details")[1]  # after the copy aside
        step.find_element("css selector", "summary").send_keys("\n")
        self.assertEqual("true", step.get_attribute("open"))
        self.assertIn("read 1 account of data version 0", step.text)

    def test_shows_all_of_it_on_paper(self):
        self.opened(self.page(KEPT, UNFIXABLE))
        self.emulate(media="print")
        self.assertTrue(all(each.is_displayed() for each in self.all("details ul > li:first-child")))

    def test_can_be_read_in_light_and_in_the_dark(self):
        page = self.page(KEPT)
        self.opened(page, "light")
        light = self.asks("getComputedStyle(document.documentElement).backgroundColor")
        self.assert_readable()
        self.emulate(features=[{"name": "prefers-color-scheme", "value": "dark"}])
        self.assertNotEqual(light, self.asks("getComputedStyle(document.documentElement).backgroundColor"))
        self.assert_readable()


if __name__ == "__main__":
    unittest.main()
