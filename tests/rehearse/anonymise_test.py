"""Devices anonymised: the migration does the same with them, and nothing that tells of anybody is left.

ANONYMISED_DEVICES says of how many random devices that is tried (default: a few)."""

import contextlib
import os
import plistlib
import shutil
import tarfile
import unittest

from device import EXAMPLES, LEGACY_EXCHANGE, LEGACY_MAIL, PREFERENCES, SETTINGS, Device
from device_case import HOST
from migration_rehearse import alphabets, anonymise, host
from migration_rehearse.replacing import Replacer
from migration_rehearse.vocabulary import CLASSES, DATACLASSES, KEYS, TEXTS, TYPES
from random_devices import RandomDevice
from rehearse_case import REHEARSE, RehearseTest

COUNT = int(os.environ.get("ANONYMISED_DEVICES", "12"))
KEY = b"the key of a campaign, kept by who collects"
GOLDEN = EXAMPLES.parent.parent / "tests/endtoend/devices"
RESOURCES = REHEARSE.parent.parent / os.environ["DATA_DIRECTORY"] / "account-settings"
PERSON = {
    "Type": "Mail", "Class": "GmailAccount", "Identifier": "Janes-Identifier", "DisplayName": "Jane Smithson",
    "Username": "janesmithson@gmail.com", "Password": "swordfish!9", "Hostname": "imap.smithson.example", "Port": 993,
    "AccountPath": "Mail/IMAP-janesmithson@gmail.com@imap.gmail.com", "Phone": 15550123456, "Picture": b"\xff\xd8portrait",
    "EmailAddresses": {"janesmithson@smithson.example": "Jane Smithson"},
}


class Devices(RehearseTest):
    def anonymised(self, root):
        """The contents of the archive's files; it is made only if the migration does the same with it."""
        output = self.scratch / "anonymised.tar.gz"
        anonymise.anonymise(str(root), KEY, str(output), host.Host(str(HOST)))
        with tarfile.open(output) as archive:
            return {entry.name: archive.extractfile(entry).read() for entry in archive if entry.isfile()}

    def test_of_every_stored_version_end_the_same(self):
        for directory in sorted(GOLDEN.iterdir()):
            with self.subTest(device=directory.name):
                device = Device(self.scratch / directory.name)
                device.set_mobile(os.getuid(), os.getgid())
                for name, path in (("settings", SETTINGS), ("device-info", "etc/vorlix/device-info.plist"),
                                   ("profile-restrictions", "etc/vorlix/profile-restrictions.plist"),
                                   ("external-sources", PREFERENCES + "/com.vorlix.external-sources.plist")):
                    if (directory / f"{name}.plist").exists():
                        device.write(path, (directory / f"{name}.plist").read_bytes())
                self.anonymised(device.root)

    def test_of_the_examples_end_the_same_and_keep_nobodys_words(self):
        for example in ("current", "first-generation", "legacy-files"):
            files = self.anonymised(Device.like(example, self.scratch / example).root)
            for word in (b"Hollis", b"jhollis", b"june", b"Quarry", b"hollis.example"):
                self.assertNotIn(word, b"".join(files.values()))

    def test_as_odd_as_they_come_end_the_same(self):
        for seed in range(COUNT):
            with self.subTest(seed=seed):
                device = Device(self.scratch / f"device-{seed}")
                device.set_mobile(os.getuid(), os.getgid())
                RandomDevice(seed).fill(device)
                self.anonymised(device.root)
                shutil.rmtree(device.root)

    def test_keep_kinds_lengths_and_what_the_migration_looks_at(self):
        files = self.anonymised(self.image("device", [PERSON]))
        (found,) = plistlib.loads(files[SETTINGS])["Accounts"]
        for key in ("Type", "Class", "Port"):
            self.assertEqual(PERSON[key], found[key])
        self.assertEqual([type(value) for value in PERSON.values()], [type(value) for value in found.values()])
        for key in ("DisplayName", "Username", "Password", "Hostname"):
            self.assertEqual(len(PERSON[key]), len(found[key]))
            self.assertNotEqual(PERSON[key], found[key])
        self.assertTrue(found["Username"].endswith("@gmail.com"))
        self.assertTrue(found["AccountPath"].endswith(found["Username"] + "@imap.gmail.com"))
        picture, = (value for value in found.values() if isinstance(value, bytes))
        phone, = (value for value in found.values() if isinstance(value, int) and value != PERSON["Port"])
        self.assertEqual((len(PERSON["Picture"]), len(str(PERSON["Phone"]))), (len(picture), len(str(phone))))
        for word in (b"mithson", b"swordfish", b"Jane", b"portrait", b"15550123456"):
            self.assertNotIn(word, b"".join(files.values()))

    def test_that_cannot_be_read_stay_so(self):
        root = self.image("device")
        Device(root).write(LEGACY_MAIL, b"Jane Smithson is no property list")
        whole = plistlib.dumps({"DAAccountsKey": [{"DAAccountDescription": "Jane Smithson"}]}, fmt=plistlib.FMT_BINARY)
        Device(root).write(LEGACY_EXCHANGE, whole[:-20])
        self.assertNotIn(b"Smithson", b"".join(self.anonymised(root).values()))

    def test_with_a_name_left_in_them_are_not_made(self):
        replacer = Replacer(KEY)
        jane, other = replacer.text("Jane"), replacer.text("ann-jane@x.example")
        for text, is_left in ((jane, False), (other, False), ("Jane", True), ("of Jane, too", True), ("J%61ne", True)):
            pieces = [anonymise.Piece(SETTINGS, 0o644, plistlib.dumps({"Accounts": [{"DisplayName": text}]}))]
            with self.assertRaises(anonymise.CannotAnonymise) if is_left else contextlib.nullcontext():
                anonymise.check_words(pieces, replacer)

    def test_of_which_the_host_tells_nothing_are_not_made(self):
        root = self.image("device", [PERSON])
        with self.assertRaisesRegex(anonymise.CannotAnonymise, "no explanation"):
            anonymise.anonymise(str(root), KEY, str(self.scratch / "out"), host.Host(str(HOST), "/bin/true"))
        self.assertFalse((self.scratch / "out").exists())

    def test_have_no_other_user_than_the_settings_owner(self):
        root = self.image("device")
        with open(root / "etc/passwd", "a", encoding="utf-8") as file:
            file.write("jane:x:7:7:Jane Smithson:/home/jane:/bin/sh\n")
        files = self.anonymised(root)
        self.assertEqual(f"mobile:*:{os.getuid()}:{os.getgid()}::/var/mobile:/bin/sh\n".encode(), files["etc/passwd"])


class Program(RehearseTest):
    def make(self, image, *options, status=0):
        return self.command("anonymise", image, "--output", self.scratch / "out.tar.gz", "--key", self.scratch / "key",
                            *options, status=status)

    def test_makes_a_key_that_only_its_owner_reads_and_the_same_archive_again(self):
        root = self.image("device", [PERSON])
        self.assertIn("words replaced; the migration does the same with it", self.make(root))
        self.assertEqual(0o600, (self.scratch / "key").stat().st_mode & 0o777)
        with tarfile.open(self.scratch / "out.tar.gz") as archive:
            first = archive.extractfile(SETTINGS).read()
        self.make(self.scratch / "out.tar.gz")
        self.make(root)
        with tarfile.open(self.scratch / "out.tar.gz") as archive:
            self.assertEqual(first, archive.extractfile(SETTINGS).read())

    def test_makes_nothing_of_what_is_no_device(self):
        (self.scratch / "key").write_bytes(b"x" * 32)
        for image, message in (("/nowhere", "/nowhere"), ("/dev/null", "/dev/null"), (self.scratch / "key", "damaged")):
            self.assertIn(message, self.make(image, status=3))
        self.assertFalse((self.scratch / "out.tar.gz").exists())
        (self.scratch / "key").write_bytes(b"short")
        self.assertIn("no key", self.make(self.image("device"), status=3))


class Words(unittest.TestCase):
    def replaced(self, *texts, key=KEY):
        replacer = Replacer(key)
        return [replacer.text(text) for text in texts]

    def test_are_replaced_the_same_wherever_they_stand(self):
        address, name, path = self.replaced("jané@example.org", "jané", "/calendar/dav/jan%C3%A9%40example.org/user")
        self.assertEqual(name, address.partition("@")[0])
        escaped = "".join(character if ord(character) < 128 else "".join(f"%{byte:02X}" for byte in character.encode())
                          for character in address.replace("@", "%40"))
        self.assertEqual(f"/calendar/dav/{escaped}/user", path)

    def test_of_secrets_are_replaced_whole_and_no_secret_stays_none(self):
        replacer = Replacer(KEY)
        secret, again, empty = (replacer.text(text, "Password") for text in ("sword-fish 7", "sword-fish 7", ""))
        self.assertEqual((secret, "", 12), (again, empty, len(secret)))
        self.assertNotIn("sword", secret)
        printable = [chr(code) for code in range(0x20, 0x7F)]
        replaced = [replacer.text(each, "Password") for each in printable]  # of any kind by any
        self.assertEqual((printable, []), (sorted(replaced), [each for each in zip(printable, replaced) if len(set(each)) < 2]))

    def test_are_others_under_another_key(self):
        self.assertNotEqual(self.replaced("Jane Smithson"), self.replaced("Jane Smithson", key=b"another key of a campaign"))

    def test_keep_script_case_and_length_in_every_encoding(self):
        for text in ("Höhe", "Пётр", "日本語", "مرحبا", "👍 Jane-9", "ไทย"):
            (made,) = self.replaced(text)
            self.assertEqual([len(text.encode(code)) for code in ("utf-8", "utf-16-be")],
                             [len(made.encode(code)) for code in ("utf-8", "utf-16-be")])
            self.assertEqual([(character.isupper(), character.isalpha()) for character in text],
                             [(character.isupper(), character.isalpha()) for character in made])

    def test_that_differ_stay_different_and_become_the_same_in_any_order(self):
        letters = [first + second for first in "abcdefghijklmnopqrstuvwxyz" for second in "abcdefghijklmnopqrstuvwxyz"]
        for words in (letters, [str(number) for number in range(10, 100)], list("ÀÁÂÃÄÅ"), ["x" * 200, "x" * 199 + "y"]):
            replaced = self.replaced(*words)
            self.assertEqual(len(words), len(set(replaced)))
            self.assertEqual(replaced, list(reversed(self.replaced(*reversed(words)))))
            self.assertFalse([word for word, other in zip(words, replaced) if word == other])

    def test_that_few_are_like_are_replaced_too(self):
        for text in ("ـ" * 5, "\ufa19" * 2, "\ufa19" * 5, "ªº", "ǅǈ", "𞥋a", "Ⅻ٢²"):
            made, = self.replaced(text)
            self.assertNotEqual(text, made)
            self.assertEqual([len(text.encode(code)) for code in ("utf-8", "utf-16-be")],
                             [len(made.encode(code)) for code in ("utf-8", "utf-16-be")])

    def test_that_nothing_can_stand_for_are_refused(self):
        with self.assertRaises(anonymise.CannotAnonymise):
            self.replaced("𞥋")

    def test_of_the_migration_stay_and_nothing_else_becomes_one(self):
        replacer = Replacer(KEY)
        reserved = sorted(word for word in TEXTS | KEYS if len(word) == 4 and word.isalpha())
        self.assertEqual([f"{word} Jr" for word in reserved], [replacer.text(f"{word} Jr")[:4] + " Jr" for word in reserved])
        letters = [alphabets.of_character(letter) for letter in "Port"]
        for number in range(2000):
            self.assertNotIn(replacer.text("P" + "".join(letters[1].characters[number // 13 ** place % 13]
                                                         for place in range(3))), reserved)

    def test_that_are_read_as_numbers_say_the_same(self):
        replacer = Replacer(KEY)
        for text in ("2", " +12", "yes", "TRUE", "-1"):
            self.assertEqual(text, replacer.text(text, "hostedServiceStatus"))
        self.assertRegex(replacer.text("2 of Jane", "Version"), "^2 ")
        self.assertNotIn("Jane", replacer.text("2 of Jane", "Version"))

    def test_of_digits_fit_where_the_number_did(self):
        replacer = Replacer(KEY)
        for number in (123456, 1 << 62, (1 << 63) - 1, 1 << 63, (1 << 64) - 1, -123456, -(1 << 63)):
            made = replacer.integer(number)
            self.assertEqual((number >= 1 << 63, number < 0), (made >= 1 << 63, made < 0))
            self.assertEqual(len(str(number)), len(str(made)))
            self.assertNotEqual(number, made)
            for form in (plistlib.FMT_XML, plistlib.FMT_BINARY):
                self.assertEqual(made, plistlib.loads(plistlib.dumps(made, fmt=form)))

    def test_of_the_migration_are_all_known(self):
        types = plistlib.loads((RESOURCES / "AccountTypesProperties.plist").read_bytes())
        self.assertEqual(set(types), set(TYPES))
        self.assertEqual({name for each in types.values() for name in each["Supported Dataclasses"]}, set(DATACLASSES))
        header = (EXAMPLES.parent.parent / "accountsettings/vocabulary.h").read_text()
        self.assertIn('"ChildAccounts"', header)
        self.assertTrue({"ChildAccounts", "Enabled Dataclasses", "Type String"} <= KEYS)
        self.assertIn("KQAccount", CLASSES)


if __name__ == "__main__":
    unittest.main()
