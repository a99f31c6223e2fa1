"""What the tests of pages share: a page in a headless browser, which must neither ask for anything nor complain."""

import json
import re
import tempfile

from selenium import webdriver
from selenium.webdriver.chrome.service import Service
from selenium.webdriver.common import utils
from selenium.webdriver.support.ui import WebDriverWait

from rehearse_case import REHEARSE, RehearseTest

TEMPLATE = REHEARSE.parent.parent / "share/account-settings/pages/page.html"
COLOURS = ("paper", "panel", "ink", "faint", "accent", "kept", "lost", "not-saved", "failed", "refused")


class Driver(Service):
    """The browser's driver by the address of this machine, since a minimal system does not know the name localhost."""

    ADDRESS = "127.0.0.1"

    @property
    def service_url(self):
        return f"http://{self.ADDRESS}:{self.port}"

    def is_connectable(self):
        return utils.is_connectable(self.port, self.ADDRESS)


class BrowserTest(RehearseTest):
    """One browser for all tests of a class."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        profile = tempfile.TemporaryDirectory(ignore_cleanup_errors=True)
        cls.addClassCleanup(profile.cleanup)
        options = webdriver.ChromeOptions()
        for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage",
                         "--window-size=1200,900", "--remote-debugging-pipe", f"--user-data-dir={profile.name}"):
            options.add_argument(argument)
        options.set_capability("goog:loggingPrefs", {"browser": "ALL", "performance": "ALL"})
        cls.browser = webdriver.Chrome(service=Driver("/usr/bin/chromedriver"), options=options)
        cls.addClassCleanup(cls.browser.quit)

    def opened(self, page, scheme="light"):
        """The page in the browser, anew."""
        self.emulate(media="", features=[{"name": "prefers-color-scheme", "value": scheme},
                                         {"name": "prefers-reduced-motion", "value": "reduce"}])
        self.browser.get("about:blank")
        self.browser.get_log("performance")
        self.browser.get(f"file://{page}")
        shown = [f"file://{page}", "complete"]
        WebDriverWait(self.browser, 30).until(lambda _: self.asks("[location.href, document.readyState]") == shown)

    def emulate(self, **media):
        self.browser.execute_cdp_cmd("Emulation.setEmulatedMedia", media)

    def asks(self, script, *arguments):
        return self.browser.execute_script(f"return {script}", *arguments)

    def all(self, selector):
        return self.browser.find_elements("css selector", selector)

    def one(self, selector):
        return self.browser.find_element("css selector", selector)

    def texts(self, selector):
        return [each.text for each in self.all(selector)]

    def assert_quiet(self, page):
        """Nothing on the console, and no request but the one for the page."""
        self.assertEqual([], self.browser.get_log("browser"))
        events = [json.loads(entry["message"])["message"] for entry in self.browser.get_log("performance")]
        asked = [event["params"]["request"]["url"] for event in events if event["method"] == "Network.requestWillBeSent"]
        self.assertEqual([f"file://{page}"], [url for url in asked if not url.startswith(("data:", "blob:", "chrome:"))])

    def assert_accessible(self):
        """What a screen reader and a keyboard need first."""
        self.assertEqual("en", self.asks("document.documentElement.lang"))
        self.assertTrue(self.browser.title)
        nameless = """[...document.querySelectorAll('button, input, select, a, svg, dialog')].filter(each =>
            !(each.innerText || '').trim() && !each.ariaLabel && !(each.labels || []).length
            && !each.getAttribute('aria-labelledby') && !each.closest('[aria-hidden]')).map(each => each.outerHTML)"""
        self.assertEqual([], self.asks(nameless))
        levels = self.asks("[...document.querySelectorAll('h1, h2, h3, h4')].map(each => Number(each.tagName[1]))")
        self.assertEqual(1, levels[0])
        self.assertTrue(all(after <= before + 1 for before, after in zip(levels, levels[1:])), levels)
        self.assertEqual(0, self.asks("document.querySelectorAll('table:not(:has(caption)), thead th:not([scope])').length"))
        self.assertEqual(1, self.asks("document.querySelectorAll('main').length"))

    def assert_readable(self):
        """Every colour of text has a contrast of at least 4.5 to what is below it."""
        style = "getComputedStyle(document.documentElement)"
        found = {name: self.asks(f"{style}.getPropertyValue('--{name}')") for name in COLOURS}
        for ground in ("paper", "panel"):
            for name in COLOURS[2:]:
                self.assertGreaterEqual(contrast(found[name], found[ground]), 4.5, (name, ground))


def contrast(one, other):
    light, dark = sorted((luminance(one), luminance(other)), reverse=True)
    return (light + 0.05) / (dark + 0.05)


def luminance(colour):
    parts = [int(part, 16) / 255 for part in re.findall("[0-9a-f]{2}", colour.lower())]
    linear = [part / 12.92 if part <= 0.04045 else ((part + 0.055) / 1.055) ** 2.4 for part in parts]
    return 0.2126 * linear[0] + 0.7152 * linear[1] + 0.0722 * linear[2]
