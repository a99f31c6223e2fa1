"""What becomes of the accounts in the legacy files."""

import itertools
import unittest

from device import CURRENT_VERSION, LEGACY_EXCHANGE, LEGACY_MAIL, SETTINGS, SETTINGS_COPY
from legacy_case import (
    CALENDARS,
    CONTACTS,
    CONTACTS_SEARCH,
    HOST,
    MAIL,
    MIGRATING,
    STANDING,
    LegacyCase,
    conversion_failure,
    decision,
    delivery,
    delivery_record,
    exchange,
    exchange_file,
    exchange_record,
    incoming,
    mail_file,
    mail_record,
    save_of,
)

REPLACING = "Replacing accounts"
MISSING_CLASS = "Missing account class."

CLASSES = [
    ("GmailAccount", "Gmail", "Gmail"),
    ("WexmoAccount", "Nimbra", "Nimbra"),
    ("KeldorIMAPAccount", "KeldorIMAP", "Cirrant"),
    ("YahooAccount", "Yahoo", "Yahoo!\u200e"),
    ("DAMailAccount", "Exchange", "Exchange ActiveSync"),
    ("NimbraAccount", "Nimbra", "Nimbra"),
    ("DeliveryAccount", "SMTP", "Account"),
    ("SMTPAccount", "SMTP", "Account"),
    ("IMAPAccount", "Mail", "Account"),
]

SWITCHES = [
    ("DAAccountEnabledForCalendar", CALENDARS),
    ("DAAccountEnabledForContacts", CONTACTS),
    ("DAAccountEnabledForEmail", MAIL),
    ("DAAccountEnabledForContactsSearch", CONTACTS_SEARCH),
]


class LegacyAccountsTest(LegacyCase):
    def test_mail_accounts_alone(self):
        device = self.device(mail=mail_file([incoming("M1", Username="ada")], [delivery("D1")]))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, delivery_record("D1"), mail_record("M1", Username="ada")],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "SMTP", "Mail")],
        )

    def test_exchange_accounts_alone(self):
        device = self.device(exchange_=exchange_file(exchange("E1", DAAccountHost="mail.example.com")))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, exchange_record("E1", DAAccountHost="mail.example.com")],
            log=[decision(0, 1, 0), REPLACING, *save_of("LDAP", "Exchange")],
        )

    def test_mail_and_exchange_accounts(self):
        device = self.device(mail=mail_file([incoming("M1")]), exchange_=exchange_file(exchange("E1")))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, exchange_record("E1"), mail_record("M1")],
            log=[decision(1, 1, 0), *[REPLACING] * 3, *save_of("LDAP", "Exchange", "Mail")],
        )

    def test_both_beside_settings_that_are_out_of_date(self):
        device = self.device(
            mail=mail_file([incoming("M1")]), exchange_=exchange_file(exchange("E1")), version=CURRENT_VERSION - 1
        )
        save = save_of("LDAP", "Exchange", "Mail")
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, exchange_record("E1"), mail_record("M1")],
            log=[decision(1, 1, 0), *[REPLACING] * 3, *save, *save],
        )

    def test_accounts_of_the_same_types_make_room_and_those_of_the_same_name_keep_their_place(self):
        old = [
            {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "M0"},
            {"Type": "Mail", "Class": "IMAPAccount", "Identifier": "M1"},
            STANDING,
            {"Type": "Exchange", "Class": "ASAccount", "Identifier": "E0"},
        ]
        device = self.device(
            mail=mail_file([incoming("M2"), incoming("M1")]), exchange_=exchange_file(exchange("E1")), accounts=old
        )
        self.assertEqual(0, device.migrate(HOST).status)
        found = [account["Identifier"] for account in device.read_plist(SETTINGS)["Accounts"]]
        self.assertEqual(["M1", "L1", "E1", "M2"], found)

    def test_every_class_of_mail_account(self):
        accounts = [incoming(f"M{number}", name) for number, (name, _, _) in enumerate(CLASSES)]
        device = self.device(mail=mail_file(accounts))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[
                STANDING,
                *(mail_record(f"M{number}", *row) for number, row in enumerate(CLASSES)),
            ],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", *(row[1] for row in CLASSES))],
        )

    def test_mail_account_of_the_generic_class_whose_place_tells_the_class(self):
        path = "/var/mobile/Library/Mail/IMAP-ada@imap.example.com"
        device = self.device(mail=mail_file([incoming("M1", "MailAccount", AccountPath=path)]))
        run = device.migrate(HOST)
        self.assertEqual([mail_record("M1", AccountPath=path)], device.read_plist(SETTINGS)["Accounts"][1:])
        self.assertEqual(2, len(run.told("preferences-changed")), "one for the repair, one for the run")

    def test_name_of_gmail_follows_the_region(self):
        for info, called in (
            ({"RegionalBehaviorGoogleMail": True}, "Google Mail"),
            ({"RegionalBehaviorGoogleMail": False}, "Gmail"),
            ({}, "Gmail"),
            (None, "Gmail"),
        ):
            with self.subTest(info=info):
                device = self.device(mail=mail_file([incoming("M1", "GmailAccount")]), info=info)
                self.assert_migrated(
                    device,
                    device.migrate(HOST),
                    accounts=[STANDING, mail_record("M1", "GmailAccount", "Gmail", called)],
                    log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "Gmail")],
                )

    def test_user_name_of_the_hosted_service_is_cut(self):
        device = self.device(
            mail=mail_file(
                [
                    incoming("M1", "WexmoAccount", Username="ada@wexmo.com"),
                    incoming("M2", "NimbraAccount", Username="ada"),
                    incoming("M3", Username="ada@example.com"),
                ]
            )
        )
        self.assertEqual(0, device.migrate(HOST).status)
        names = [account.get("Username") for account in device.read_plist(SETTINGS)["Accounts"][1:]]
        self.assertEqual(["ada", "ada", "ada@example.com"], names)

    def test_every_combination_of_the_exchange_switches(self):
        given, expected = [], []
        for number, states in enumerate(itertools.product((None, False, True), repeat=4)):
            pairs = list(zip(SWITCHES, states, strict=True))
            given.append(exchange(f"E{number}", **{key: on for (key, _), on in pairs if on is not None}))
            enabled = [dataclass for (_, dataclass), on in pairs if on is not False]
            expected.append(exchange_record(f"E{number}", enabled))
        device = self.device(exchange_=exchange_file(*given))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, *expected],
            log=[decision(0, 1, 0), REPLACING, *save_of("LDAP", *["Exchange"] * 81)],
        )

    def test_identifiers_are_made_where_there_are_none(self):
        nameless = incoming("M1")
        del nameless["uniqueId"]
        unknown = exchange("E1")
        del unknown["DAAccountConfigurationAccountID"]
        device = self.device(mail=mail_file([nameless]), exchange_=exchange_file(unknown))
        self.assertEqual(0, device.migrate(HOST).status)
        work, home = device.read_plist(SETTINGS)["Accounts"][1:]
        for made in (work["Identifier"], home["Identifier"], home["Sync Identifier"]):
            self.assertRegex(made, "^[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}$")
        self.assertEqual(work["Identifier"], work["Sync Identifier"])
        self.assertNotEqual(home["Identifier"], home["Sync Identifier"])

    def assert_no_mail_is_converted(self, device, kind, description):
        failure = conversion_failure("_migrateMailAccounts", kind, description)
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING],
            console=[MIGRATING, failure],
            log=[decision(1, 0, 0), MISSING_CLASS, *save_of("LDAP")],
            files=[SETTINGS, SETTINGS_COPY, LEGACY_MAIL + ".unconverted-1"],
        )

    def test_one_bad_mail_account_in_the_middle_keeps_all_out(self):
        bad = {"uniqueId": "M2", "Password": "secret"}
        device = self.device(mail=mail_file([incoming("M1"), bad, incoming("M3")], [delivery("D1")]))
        self.assert_no_mail_is_converted(device, "incoming", '{uniqueId = "M2"; Password = <hidden>}')

    def test_one_bad_delivery_account_in_the_middle_keeps_all_out(self):
        bad = {"AccountType": "", "uniqueId": "D2"}
        device = self.device(mail=mail_file([incoming("M1")], [delivery("D1"), bad, delivery("D3")]))
        self.assert_no_mail_is_converted(device, "delivery", '{AccountType = ""; uniqueId = "D2"}')

    def test_one_bad_exchange_account_in_the_middle_keeps_the_others_of_its_file_out(self):
        device = self.device(
            mail=mail_file([incoming("M1")]),
            exchange_=exchange_file(exchange("E1"), {"DAAccountDescription": "Bad"}, exchange("E3")),
        )
        failure = conversion_failure("_migrateDAAccounts", "Exchange", '{DAAccountDescription = "Bad"}')
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, mail_record("M1")],
            console=[MIGRATING, failure],
            log=[decision(1, 1, 0), MISSING_CLASS, REPLACING, REPLACING, *save_of("LDAP", "Mail")],
            files=[SETTINGS, SETTINGS_COPY, LEGACY_EXCHANGE + ".unconverted-1"],
        )

    def test_elements_that_are_no_accounts(self):
        for element, description in (("text", "text"), (7, "7"), ([], "()")):
            with self.subTest(element=element):
                device = self.device(exchange_=exchange_file(exchange("E1"), element))
                failure = conversion_failure("_migrateDAAccounts", "Exchange", description)
                self.assert_migrated(
                    device,
                    device.migrate(HOST),
                    accounts=[STANDING],
                    console=[MIGRATING, failure],
                    log=[decision(0, 1, 0), MISSING_CLASS, *save_of("LDAP")],
                    files=[SETTINGS, SETTINGS_COPY, LEGACY_EXCHANGE + ".unconverted-1"],
                )

    def test_values_of_odd_kinds_are_kept(self):
        odd = {"Username": ["ada@wexmo.com"], "Port": 2**63, "Rate": 0.5, "Blob": b"\0\1", "Nested": {"a": [True]}}
        device = self.device(mail=mail_file([{**incoming("M1", "WexmoAccount"), **odd, "AccountName": 7}]))
        self.assert_migrated(
            device,
            device.migrate(HOST),
            accounts=[STANDING, {**mail_record("M1", "WexmoAccount", "Nimbra", "Nimbra", **odd), "DisplayName": 7}],
            log=[decision(1, 0, 0), REPLACING, REPLACING, *save_of("LDAP", "Nimbra")],
        )

    def test_converted_accounts_of_a_device_without_settings_pass_through_every_version_step(self):
        device = self.device(mail=mail_file([incoming("M1")]), exchange_=exchange_file(exchange("E1")), version=None)
        run = device.migrate(HOST)
        self.assertEqual(0, run.status)
        self.assertEqual(MIGRATING, run.console()[1])
        self.assertEqual(7, run.messages().count("Saving all accounts"))
        settings = device.read_plist(SETTINGS)
        self.assertEqual(CURRENT_VERSION, settings["Version"])
        types = [account["Type"] for account in settings["Accounts"]]
        self.assertEqual(["Exchange", "Mail", "OnMyDevice"], types)


if __name__ == "__main__":
    unittest.main()
