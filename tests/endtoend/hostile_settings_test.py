"""Settings files that nobody could want: no crash, no hang, no flood of memory, and what can be kept is kept."""

import os
import plistlib
import resource
import struct
import unittest

from device import CURRENT_VERSION, SETTINGS, SETTINGS_COPY, TEMPORARY, exactly
from device_case import HOST, DeviceTest

KEPT = SETTINGS_COPY + ".unreadable-1"
EMPTY = {"Accounts": [], "Version": CURRENT_VERSION}
MEBIBYTE = 1024  # of the unit in which the system counts
# Of the processor, whatever else the machine does, and for a whole run.
MOST_SECONDS = 60 if os.environ["SANITIZE"] else 1
REJECTED = "ERROR: Failed to create a BasicAccount from "
GOOD = {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "GOOD", "DisplayName": "Good"}


def binary_list(objects, root=0, width=4):
    """A binary property list of the encoded objects; they refer to each other in `width` bytes."""
    body, offsets = bytearray(b"bplist00"), []
    for encoded in objects:
        offsets.append(len(body))
        body += encoded
    table = len(body)
    body += b"".join(offset.to_bytes(width, "big") for offset in offsets)
    return bytes(body) + struct.pack(">6xBBQQQ", width, width, len(objects), root, table)


def array_of(*references, width=4):
    return bytes([0xA0 | len(references)]) + b"".join(each.to_bytes(width, "big") for each in references)


def settings_of(*objects, width=4):
    """A settings file whose "Accounts" is the first of the encoded objects; these begin with number 2."""
    root = b"\xd1" + (1).to_bytes(width, "big") + (2).to_bytes(width, "big")
    return binary_list([root, b"\x58Accounts", *objects], width=width)


def nested_arrays(depth):
    return settings_of(*[array_of(2 + level + 1) for level in range(depth)], array_of())


def doubled_references(times):
    """An array that holds an array twice that holds an array twice: 2^times elements in some hundred bytes."""
    return settings_of(
        *[array_of(2 + level + 1, 2 + level + 1, width=1) for level in range(times)], b"\x50", width=1
    )


def circular_reference():
    return settings_of(array_of(2))


UNREADABLE = {
    "empty": b"",
    "text": b"These are no account settings.",
    "only a header": b"bplist00",
    "truncated": plistlib.dumps({"Accounts": [GOOD], "Version": CURRENT_VERSION}, fmt=plistlib.FMT_BINARY)[:-20],
    "truncated XML": plistlib.dumps({"Accounts": [GOOD], "Version": CURRENT_VERSION})[:-40],
    "an array at the root": plistlib.dumps([GOOD], fmt=plistlib.FMT_BINARY),
    "a text at the root": plistlib.dumps("Accounts", fmt=plistlib.FMT_BINARY),
    "nested a million deep": nested_arrays(1_000_000),
    "nested a million deep in XML": b"<plist version='1.0'>" + b"<array>" * 1_000_000 + b"</array>" * 1_000_000 + b"</plist>",
    "2^30 shared references": doubled_references(30),
    "a circular reference": circular_reference(),
    "zeros": bytes(4096),
}


def folding(count):
    """As many mail accounts of one user as calendar accounts, each of which belongs to each of them."""
    calendars = {
        "Type": "CalDAV",
        "Class": "MobileCalDAVAccount",
        "CalDAVPrincipalConfiguration": {"Login_Key": "jane", "CalDAV_Server_Key": "www.google.com"},
        "CalDAVAccountConfiguration": {"CalDAV_PrincipalPath_Key": "/calendar/dav/jane/user"},
    }
    mail = {"Type": "Mail", "Class": "GmailAccount", "Username": "jane"}
    return [{**each, "Identifier": each["Type"] + str(number)} for each in (calendars, mail) for number in range(count)]


def of_one_identifier(count):
    return [{"Type": "Nimbra", "Class": "NimbraAccount", "Identifier": "A", "Username": str(each)} for each in range(count)]


def children_of_long_lists(count):
    child = {"Type": "CalDAV", "Class": "X"}
    listed = ["com.vorlix.Dataclass.Notes"] * 20_000
    children = [{**child, "Identifier": str(number)} for number in range(count)]
    parent = {"Type": "VorlixAccount", "Class": "KQAccount", "Identifier": "P"}
    return [{**parent, "Enabled Dataclasses": listed, "ChildAccounts": children}]


MULTIPLYING = {
    "accounts of one identifier": of_one_identifier(350),
    "pairs of a mail account and its calendar account": folding(300),
    "data classes in lists that children inherit": children_of_long_lists(5_000),
}


def processor_seconds():
    """What all programs that have ended took."""
    used = resource.getrusage(resource.RUSAGE_CHILDREN)
    return used.ru_utime + used.ru_stime


class HostileSettings(DeviceTest):
    def run_in_time(self, device):
        before = processor_seconds()
        run = device.migrate(HOST)
        self.assertLess(processor_seconds() - before, MOST_SECONDS)
        return run

    def migrate(self, content, kept=()):
        device = self.device()
        for path in device.path(SETTINGS_COPY).parent.glob("*.unreadable-*"):
            path.unlink()
        device.write(SETTINGS, content)
        device.path(SETTINGS).chmod(0o600)
        before = device.entries()
        run = self.run_in_time(device)
        self.assertEqual(0, run.status, run.errors)
        self.assertEqual(("result", True), (run.events[-1]["event"], run.events[-1]["success"]))
        self.assertEqual(sorted({*before, TEMPORARY, SETTINGS_COPY, *kept}), sorted(device.entries()))
        for path in (SETTINGS_COPY, *kept):
            self.assertEqual(content, device.read(path))
        return device, run

    def test_an_unreadable_file_gives_an_empty_one(self):
        for name, content in UNREADABLE.items():
            with self.subTest(name):
                device, run = self.migrate(content, [KEPT])
                self.assertEqual(EMPTY, device.read_plist(SETTINGS))
                self.assertEqual([], run.console())

    def test_accounts_that_the_steps_would_multiply_are_refused_in_words_and_left_as_they_are(self):
        for what, accounts in MULTIPLYING.items():
            with self.subTest(what):
                content = plistlib.dumps({"Accounts": accounts, "Version": 0}, fmt=plistlib.FMT_BINARY)
                device = self.device()
                device.write(SETTINGS, content)
                run = self.run_in_time(device)
                self.assertEqual(1, run.status, run.errors)
                self.assertIn("The migration was given up. It is refused as hostile: it has ", run.errors[-1])
                self.assertIn(what, run.errors[-1])
                self.assertEqual(content, device.read(SETTINGS))

    def test_an_account_nested_as_deeply_as_may_be_is_saved_below_its_new_parent(self):
        deep = []
        for _ in range(250):
            deep = [deep]
        hosted = {"Type": "Nimbra", "Class": "NimbraAccount", "Identifier": "A", "Deep": deep}
        device = self.device()
        device.write(SETTINGS, plistlib.dumps({"Accounts": [hosted], "Version": 0}, fmt=plistlib.FMT_BINARY))
        run = self.run_in_time(device)
        self.assertEqual(0, run.status, run.errors)
        parents = [each for each in device.read_plist(SETTINGS)["Accounts"] if "ChildAccounts" in each]
        self.assertEqual([deep], [each["ChildAccounts"][0]["Deep"] for each in parents])

    def test_a_small_file_takes_little_memory(self):
        content = doubled_references(30)
        self.assertLess(len(content), 200)
        self.migrate(plistlib.dumps(EMPTY))
        usual = resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss
        self.migrate(content, [KEPT])
        self.assertLess(resource.getrusage(resource.RUSAGE_CHILDREN).ru_maxrss, usual + 4 * MEBIBYTE)

    def test_elements_of_the_wrong_kind_are_skipped_and_named(self):
        wrong = [1, "text", [], {}, b"\x00", True, {"Type": 7, "Class": []}]
        device, run = self.migrate(plistlib.dumps({"Accounts": [*wrong, GOOD], "Version": CURRENT_VERSION}))
        self.assertEqual({"Accounts": [GOOD], "Version": CURRENT_VERSION}, device.read_plist(SETTINGS))
        rejected = [message for message in run.messages() if message.startswith(REJECTED)]
        # The file is read twice: once as the run begins and once as it is saved.
        self.assertEqual(2 * len(wrong), len(rejected))

    def test_accounts_that_are_no_array_count_as_none(self):
        for accounts in ("text", 3, {"0": GOOD}):
            with self.subTest(accounts=accounts):
                device, _ = self.migrate(plistlib.dumps({"Accounts": accounts, "Version": CURRENT_VERSION}))
                self.assertEqual(EMPTY, device.read_plist(SETTINGS))

    def test_values_of_the_wrong_kind_stay_as_they_are(self):
        odd = {**GOOD, "DisplayName": 7, "Enabled Dataclasses": "Mail", "ChildAccounts": [1, {}, "x"], "Username": []}
        device, _ = self.migrate(plistlib.dumps({"Accounts": [odd], "Version": CURRENT_VERSION}))
        self.assertEqual(exactly({"Accounts": [odd], "Version": CURRENT_VERSION}), exactly(device.read_plist(SETTINGS)))

    def test_keys_beside_accounts_and_version_are_not_written(self):
        device, _ = self.migrate(plistlib.dumps({"Accounts": [GOOD], "Version": CURRENT_VERSION, "Other": 1}))
        self.assertEqual({"Accounts": [GOOD], "Version": CURRENT_VERSION}, device.read_plist(SETTINGS))


if __name__ == "__main__":
    unittest.main()
