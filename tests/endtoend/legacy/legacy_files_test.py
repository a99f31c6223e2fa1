"""What becomes of the legacy files themselves, and what a run leaves behind beside the settings."""

import os
import plistlib
import stat
import unittest
from datetime import datetime

from device import HOME, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from legacy_case import (
    AUTO_FETCH,
    HOST,
    MIGRATING,
    RECORDS_SWITCH,
    REPORTS,
    SENTINEL,
    STANDING,
    LegacyCase,
    decision,
    exchange,
    exchange_file,
    exchange_record,
    incoming,
    mail_file,
    mail_record,
    save_of,
)

REPLACING = "Replacing accounts"
SAVING_REPORT = "Saving collated migration information"
EARLY_RETURN = "Detected that a removal old accounts info was in progress. Early return!."

XML_HEAD = b'<?xml version="1.0" encoding="UTF-8"?>\n<plist version="1.0">'
UNREADABLE = {
    "empty": b"",
    "no property list": b"\0\1\2\3",
    "half a binary one": plistlib.dumps(mail_file([incoming("M1")]), fmt=plistlib.FMT_BINARY)[:-40],
    "half an XML one": plistlib.dumps(mail_file([incoming("M1")]))[:-60],
    "an array": plistlib.dumps([mail_file([incoming("M1")])]),
    "nested a hundred thousand deep": XML_HEAD + b"<array>" * 100_000,
}


class LegacyFilesTest(LegacyCase):
    def test_unreadable_mail_file_is_converted_to_nothing_and_deleted(self):
        for name, content in UNREADABLE.items():
            with self.subTest(name):
                device = self.device(mail=content)
                self.assert_migrated(
                    device,
                    device.migrate(HOST),
                    accounts=[STANDING],
                    log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP")],
                    files=[SETTINGS, SETTINGS_COPY, LEGACY_MAIL + ".unreadable-1"],
                )

    def test_unreadable_exchange_file_is_converted_to_nothing_and_deleted(self):
        for name, content in UNREADABLE.items():
            with self.subTest(name):
                device = self.device(exchange_=content, mail=mail_file([incoming("M1")]))
                self.assert_migrated(
                    device,
                    device.migrate(HOST),
                    accounts=[STANDING, mail_record("M1")],
                    log=[decision(1, 1, 0), *[REPLACING] * 3, *save_of("LDAP", "Mail")],
                    files=[SETTINGS, SETTINGS_COPY, LEGACY_EXCHANGE + ".unreadable-1"],
                )

    def test_directory_in_a_files_place_is_converted_to_nothing_and_deleted_with_what_is_in_it(self):
        device = self.device(exchange_=exchange_file(exchange("E1")))
        device.write(LEGACY_MAIL + "/inside/file", "lost")
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, exchange_record("E1")],
            log=[decision(1, 1, 0), *[REPLACING] * 3, *save_of("LDAP", "Exchange")],
        )
        self.assertFalse(device.path(LEGACY_MAIL).exists())

    def test_link_in_a_files_place_is_followed_to_read_and_not_to_delete(self):
        device = self.device()
        target = HOME + "/elsewhere.plist"
        device.write(target, plistlib.dumps(mail_file([incoming("M1")])))
        device.path(LEGACY_MAIL).symlink_to("/" + target)
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, mail_record("M1")],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "Mail")],
            files=(SETTINGS, SETTINGS_COPY, target),
        )
        self.assertTrue(device.path(target).exists())

    def test_file_in_readable_form_is_as_good_as_a_binary_one(self):
        device = self.device(mail=plistlib.dumps(mail_file([incoming("M1")]), fmt=plistlib.FMT_XML))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, mail_record("M1")],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "Mail")],
        )

    def test_companions_go_with_their_files(self):
        device = self.device(mail=mail_file([{}]), exchange_=exchange_file(exchange("E1")))
        for path in (LEGACY_MAIL, LEGACY_EXCHANGE):
            device.write(path + ".original", "old")
        device.write(AUTO_FETCH, "")
        self.assertEqual(0, device.migrate(HOST).status)
        self.assert_files(device, [SETTINGS, SETTINGS_COPY, LEGACY_MAIL + ".unconverted-1"])

    def test_companion_without_its_file_stays(self):
        device = self.device(mail=mail_file([]))
        device.write(LEGACY_EXCHANGE + ".original", "old")
        self.assertEqual(0, device.migrate(HOST).status)
        self.assert_files(device, [SETTINGS, SETTINGS_COPY, LEGACY_EXCHANGE + ".original"])

    def test_files_are_deleted_although_the_settings_could_not_be_saved(self):
        device = self.device(mail=mail_file([incoming("M1")]))
        device.write("etc/passwd", "root:*:0:0::/var/root:/bin/sh\n")
        before = device.read(SETTINGS)
        run = device.migrate(HOST)
        self.assertEqual(6, run.status)
        self.assertEqual([MIGRATING], run.console())
        self.assertEqual("Failed to save accounts to filesystem.", run.messages()[-1])
        self.assertEqual(before, device.read(SETTINGS))
        self.assert_files(device, [SETTINGS, SETTINGS_COPY, LEGACY_MAIL + ".unsaved-1"])

    def test_interrupted_deletion_is_finished_and_nothing_else_is_done(self):
        device = self.device(
            mail=mail_file([incoming("M1")]), exchange_=exchange_file(exchange("E1")), version=3, records=True
        )
        device.write(SENTINEL, "")
        device.write(AUTO_FETCH, "")
        before = device.read(SETTINGS)
        run = device.migrate(HOST)
        self.assertEqual(0, run.status)
        self.assertEqual([EARLY_RETURN], run.console())
        self.assertEqual(["start", "console", "result"], [event["event"] for event in run.events])
        kept = [LEGACY_MAIL + ".unsaved-1", LEGACY_EXCHANGE + ".unsaved-1"]  # that run had not saved their accounts
        self.assert_files(device, [SETTINGS, SETTINGS_COPY, AUTO_FETCH, RECORDS_SWITCH, *kept])
        self.assertEqual([before, before], [device.read(SETTINGS), device.read(SETTINGS_COPY)])

    def test_settings_are_copied_aside_as_they_were(self):
        device = self.device(mail=mail_file([incoming("M1")]))
        before = device.read(SETTINGS)
        device.write(SETTINGS_COPY, "an earlier copy")
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertEqual(before, device.read(SETTINGS_COPY))


class RecordsTest(LegacyCase):
    def report(self, device):
        (report,) = device.path(REPORTS).iterdir()
        return report

    def test_records_hold_every_input_and_the_result(self):
        mail, work = mail_file([incoming("M1")]), exchange_file(exchange("E1"))
        device = self.device(mail=mail, exchange_=work, records=True)
        old = device.read_plist(SETTINGS)
        run = device.migrate(HOST)
        report = self.report(device)
        self.assert_migrated(
            device,
            run,
            accounts=[STANDING, exchange_record("E1"), mail_record("M1")],
            console=[MIGRATING, SAVING_REPORT],
            log=[decision(1, 1, 0), *[REPLACING] * 3, *save_of("LDAP", "Exchange", "Mail")],
            files=[SETTINGS, SETTINGS_COPY, RECORDS_SWITCH, str(report.relative_to(device.root))],
        )
        self.assertEqual(b"bplist00", report.read_bytes()[:8])
        expected = {
            "OldExchangeAccount": work,
            "OldMailAccounts": mail,
            "OldAccountSettings": old,
            "NewAccounSettings": device.read_plist(SETTINGS),
        }
        self.assertEqual(list(expected.items()), list(plistlib.loads(report.read_bytes()).items()))

    def test_records_of_a_failed_conversion_hold_the_file_that_was_deleted(self):
        device = self.device(mail=mail_file([incoming("M1"), {}]), records=True)
        self.assertEqual(0, device.migrate(HOST).status)
        self.assertFalse(device.path(LEGACY_MAIL).exists())
        kept = plistlib.loads(self.report(device).read_bytes())
        self.assertEqual(mail_file([incoming("M1"), {}]), kept["OldMailAccounts"])
        self.assertEqual([STANDING], kept["NewAccounSettings"]["Accounts"])

    def test_report_is_named_after_the_local_time(self):
        device = self.device(mail=mail_file([]), records=True)
        before = datetime.now()
        self.assertEqual(0, device.migrate(HOST).status)
        moments = {
            f"AccountMigrationInformation-{time.isocalendar().year}-{time.month}-{time.day}-{time.hour}-{time.month}-"
            for time in (before, datetime.now())
        }
        name = self.report(device).name
        self.assertTrue(any(name.startswith(moment) for moment in moments), name)
        self.assertRegex(name, r"-\d\.txt$")

    def test_directory_of_reports_is_open_to_everybody_whatever_the_umask(self):
        device = self.device(mail=mail_file([]), records=True)
        self.assertEqual(0, device.migrate(HOST, prepare=lambda: os.umask(0o077)).status)
        self.assertEqual(0o777, stat.S_IMODE(device.path(REPORTS).stat().st_mode))
        self.assertEqual(0o600, stat.S_IMODE(self.report(device).stat().st_mode))

    def test_run_that_migrated_nothing_makes_the_directory_and_no_report(self):
        device = self.device(records=True)
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING],
            console=[SAVING_REPORT],
            log=save_of("LDAP"),
            files=[SETTINGS, SETTINGS_COPY, RECORDS_SWITCH],
        )
        self.assertTrue(device.path(REPORTS).is_dir())

    def test_file_in_the_place_of_the_directory_is_left_alone(self):
        device = self.device(mail=mail_file([]), records=True)
        device.write(REPORTS, "a file")
        run = device.migrate(HOST)
        path = device.path(REPORTS)
        self.assertEqual(
            [MIGRATING, SAVING_REPORT, f"AccountMigrator warning: {path} already exists and is not a directory"],
            run.console(),
        )
        self.assertEqual(b"a file", device.read(REPORTS))

    def test_directory_that_cannot_be_made_is_reported(self):
        device = self.device(mail=mail_file([]), records=True)
        logs = HOME + "/Library/Logs"
        device.path(logs + "/CrashReporter").rmdir()
        device.write(logs + "/CrashReporter", "in the way")
        run = device.migrate(HOST)
        self.assertEqual(0, run.status)
        self.assertEqual(4, len(run.console()), "the copy, the migration, the report, its directory")
        self.assertTrue(
            run.console()[3].startswith(
                "AccountMigration warning: Could not create the directory to store migration information at "
                f"{device.path(REPORTS)} [Error = "
            )
        )

    def test_no_trace_of_reports_while_they_are_off(self):
        device = self.device(mail=mail_file([incoming("M1")]))
        device.write_plist(RECORDS_SWITCH, {"ASSaveMigrationInformation": False})
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, mail_record("M1")],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "Mail")],
            files=[SETTINGS, SETTINGS_COPY, RECORDS_SWITCH],
        )
        self.assertFalse(device.path(REPORTS).exists())


if __name__ == "__main__":
    unittest.main()
