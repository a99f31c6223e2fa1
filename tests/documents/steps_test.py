"""The examples of docs/STEPS.md: each made by the real host. With --write, the page is written anew with what came out."""

import json
import os
import re
import sys
import unittest
from pathlib import Path

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS
from device_case import DeviceTest

DOCUMENT = Path(os.environ["SOURCE_TREE"]) / "docs/STEPS.md"
SOURCE = (Path(os.environ["SOURCE_TREE"]) / "migrator/version_steps.cpp").read_text(encoding="utf-8")
EXAMPLE = re.compile(
    r"^Before, (?:of data version (?P<version>\d+)|in the legacy (?P<legacy>mail|Exchange) file)"
    r"(?:, where `(?P<question>\w+)` is `(?P<answer>\w+)`)?:\n\n```json\n(?P<before>.*?)```\n\nAfter:\n\n```json\n(?P<after>.*?)```",
    re.M | re.S)
UUID = re.compile(r"\b[0-9A-F]{8}(?:-[0-9A-F]{4}){3}-[0-9A-F]{12}\b")
ON_DEVICE = "OnMyDevice"
WIDTH = 120


def text(value, indentation=""):
    """As JSON for people: on one line where that is short, else a line for each element or member."""
    flat = json.dumps(value, ensure_ascii=False)
    if len(indentation + flat) <= WIDTH or not isinstance(value, (dict, list)):
        return flat
    inner = indentation + "  "
    if isinstance(value, list):
        return "[\n" + ",\n".join(inner + text(each, inner) for each in value) + f"\n{indentation}]"
    members = [f"{json.dumps(key, ensure_ascii=False)}: {text(each, inner)}" for key, each in value.items()]
    return "{\n" + ",\n".join(inner + each for each in members) + f"\n{indentation}}}"


def named_alike(after, before):
    """With identifiers that were made anew called NEW-1, NEW-2 and so on, as they appear."""
    names = {}
    known = set(UUID.findall(before))
    return UUID.sub(lambda match: match[0] if match[0] in known else names.setdefault(match[0], f"NEW-{len(names) + 1}"), after)


class Steps(DeviceTest):
    def after(self, example):
        """The accounts that the real host leaves of an example's device."""
        before = json.loads(example["before"])
        device = self.device()
        if example["legacy"]:
            device.write_plist(LEGACY_MAIL if example["legacy"] == "mail" else LEGACY_EXCHANGE, before)
        else:
            device.write_plist(SETTINGS, {"Version": int(example["version"]), "Accounts": before})
        device.write_plist("etc/vorlix/device-info.plist", {"CPUArchitecture": "x86_64", **(
            {example["question"]: example["answer"]} if example["question"] else {})})
        self.assertEqual(0, self.run_host("--root", device.root).status)
        (device.root / "etc/vorlix/device-info.plist").unlink()
        settings = device.read_plist(SETTINGS)
        self.assertEqual(CURRENT_VERSION, settings["Version"])
        kept = [each for each in settings["Accounts"] if each["Type"] != ON_DEVICE or ON_DEVICE in example["before"]]
        for path in (LEGACY_MAIL, LEGACY_EXCHANGE, SETTINGS):
            device.path(path).unlink(missing_ok=True)
        return named_alike(text(kept), example["before"])

    def test_leave_what_the_page_says(self):
        examples = [match.groupdict() for match in EXAMPLE.finditer(DOCUMENT.read_text(encoding="utf-8"))]
        self.assertGreater(len(examples), 14)
        for example in examples:
            with self.subTest(before=example["before"]):
                self.assertEqual(self.after(example), example["after"].rstrip("\n"))

    def test_are_all_on_the_page_each_with_an_example_of_its_own(self):
        page = DOCUMENT.read_text(encoding="utf-8")
        stored = [int(version) for version in re.findall(r'^    \{(\d+), "_migrate', SOURCE, re.M)]
        self.assertEqual(list(range(CURRENT_VERSION)), stored)
        for version in stored:
            self.assertIn(f"\n## Version {version} to {version + 1}\n", page)
            self.assertIn(f"\nBefore, of data version {version}", page)
        self.assertEqual(page.count("```json"), 2 * len(EXAMPLE.findall(page)))


def write():
    """The page with what the host leaves now."""
    case = Steps()
    case.setUp()

    def filled(match):
        example = match.groupdict()
        return match[0][: match.start("after") - match.start()] + case.after(example) + "\n```"

    DOCUMENT.write_text(EXAMPLE.sub(filled, DOCUMENT.read_text(encoding="utf-8")), encoding="utf-8")
    case.doCleanups()


if __name__ == "__main__":
    write() if sys.argv[1:] == ["--write"] else unittest.main()
