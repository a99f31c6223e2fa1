#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <cerrno>

#include <algorithm>
#include <atomic>
#include <thread>

#include "accountsettings/mail_functions.h"
#include "accountsettings/vocabulary.h"
#include "migrator/accounts_data_migrator.h"
#include "tests/support/migration_device.h"

using namespace tests;
using accountsettings::_UseGoogleMail;
using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using accountsettings::kMailAccountType;
using accountsettings::kSMTPAccountType;
using migrator::AccountsDataMigrator;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

const char* const kRegionalKey = "RegionalBehaviorGoogleMail";

Dictionary incoming(std::string_view identifier, std::string_view className = "IMAPAccount") {
  return {{"AccountType", className}, {"AccountName", "Home"}, {"uniqueId", identifier}};
}

std::shared_ptr<BasicAccount> convert(const Dictionary& description, std::string_view type = kMailAccountType) {
  return AccountsDataMigrator::_convertMailAccountDescription_type(description, type);
}

Dictionary converted(const Dictionary& description, std::string_view type = kMailAccountType) {
  const auto account = convert(description, type);
  return account ? account->properties() : Dictionary{};
}

class LegacyMail : public testing::Test {
 protected:
  MigrationDevice device;
  AccountsDataMigrator migrator;

  std::shared_ptr<AccountsManager> store(const Array& accounts = {}) {
    return AccountsManager::initWithAccounsInfoArray(accounts);
  }
  void putFile(const Array& delivery, const Array& mail) {
    device.put(kLegacyMailFile, Dictionary{{"DeliveryAccounts", delivery}, {"MailAccounts", mail}});
  }
};

std::vector<std::string> identifiersIn(const AccountsManager& store) {
  std::vector<std::string> identifiers;
  for (const auto& account : store.allBasicAccounts())
    identifiers.push_back(account->identifier().value_or(Text{}).string());
  return identifiers;
}

struct ClassRow {
  const char* name;
  const char* type;
  const char* typeString;
};

void PrintTo(const ClassRow& row, std::ostream* stream) { *stream << row.name; }

class LegacyMailClass : public testing::TestWithParam<ClassRow> {};

TEST_P(LegacyMailClass, DecidesTheTypeAndWhatItIsCalled) {
  const MigrationDevice device;
  for (const auto& initialType : {kMailAccountType, kSMTPAccountType}) {
    const Dictionary record = converted(incoming("M1", GetParam().name), initialType);
    EXPECT_EQ(textIn(record, "Class"), GetParam().name);
    EXPECT_EQ(textIn(record, "Type"), GetParam().type);
    EXPECT_EQ(textIn(record, "Type String"), GetParam().typeString);
    EXPECT_EQ(textIn(record, "Short Type String"), GetParam().typeString);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Table, LegacyMailClass,
    testing::Values(ClassRow{"GmailAccount", "Gmail", "Gmail"}, ClassRow{"WexmoAccount", "Nimbra", "Nimbra"},
                    ClassRow{"KeldorIMAPAccount", "KeldorIMAP", "Cirrant"},
                    ClassRow{"YahooAccount", "Yahoo", "Yahoo!\xE2\x80\x8E"},
                    ClassRow{"DAMailAccount", "Exchange", "Exchange ActiveSync"},
                    ClassRow{"NimbraAccount", "Nimbra", "Nimbra"}, ClassRow{"DeliveryAccount", "SMTP", "Account"},
                    ClassRow{"SMTPAccount", "SMTP", "Account"}, ClassRow{"MailAccount", "Mail", "Account"},
                    ClassRow{"IMAPAccount", "Mail", "Account"}, ClassRow{"gmailaccount", "Mail", "Account"},
                    ClassRow{"GmailAccount ", "Mail", "Account"}));

TEST(RegionalGmailName, IsUsedWhereTheDeviceSaysSo) {
  MigrationDevice device;
  device.deviceInfo->answers.emplace(kRegionalKey, true);
  const Dictionary record = converted(incoming("M1", "GmailAccount"));
  EXPECT_EQ(textIn(record, "Type"), "Gmail");
  EXPECT_EQ(textIn(record, "Type String"), "Google Mail");
  EXPECT_EQ(textIn(record, "Short Type String"), "Google Mail");
  EXPECT_EQ(textIn(converted(incoming("M2", "YahooAccount")), "Type String"), "Yahoo!\xE2\x80\x8E");
}

TEST(RegionalGmailName, IsNotUsedWhereTheDeviceSaysNo) {
  MigrationDevice device;
  device.deviceInfo->answers.emplace(kRegionalKey, false);
  EXPECT_EQ(textIn(converted(incoming("M1", "GmailAccount")), "Type String"), "Gmail");
}

TEST(RegionalGmailName, IsNotUsedWhereTheAnswerIsNoSwitch) {
  MigrationDevice device;
  device.deviceInfo->answers.emplace(kRegionalKey, Array{true});
  EXPECT_FALSE(_UseGoogleMail());
}

TEST(RegionalGmailName, IsAskedForOnceAndTheFirstAnswerKept) {
  MigrationDevice device;
  EXPECT_FALSE(_UseGoogleMail());
  device.deviceInfo->answers.emplace(kRegionalKey, true);
  EXPECT_FALSE(_UseGoogleMail());
  EXPECT_EQ(textIn(converted(incoming("M1", "GmailAccount")), "Type String"), "Gmail");
  EXPECT_EQ(std::ranges::count(device.deviceInfo->asked, kRegionalKey), 1);
}

TEST(RegionalGmailName, IsAskedForOnceByManyThreads) {
  MigrationDevice device;
  device.deviceInfo->answers.emplace(kRegionalKey, true);
  std::vector<std::thread> threads;
  threads.reserve(8);
  std::atomic<int> agreeing = 0;
  for (int index = 0; index < 8; ++index) threads.emplace_back([&] { agreeing += _UseGoogleMail() ? 1 : 0; });
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(agreeing, 8);
  EXPECT_EQ(device.deviceInfo->asked.size(), 1U);
}

TEST(RegionalGmailName, IsNotAskedForWithoutAGmailAccount) {
  MigrationDevice device;
  EXPECT_FALSE(converted(incoming("M1", "YahooAccount")).empty());
  EXPECT_EQ(std::ranges::count(device.deviceInfo->asked, kRegionalKey), 0);
}

TEST_F(LegacyMail, DescriptionGetsItsNewKeys) {
  const Dictionary expected{{"Class", "IMAPAccount"}, {"DisplayName", "Home"},    {"Identifier", "M1"},
                            {"Type", "Mail"},         {"Type String", "Account"}, {"Short Type String", "Account"},
                            {"Sync Identifier", "M1"}};
  EXPECT_EQ(converted(incoming("M1")), expected);
}

TEST_F(LegacyMail, EveryOtherValueIsCopiedUnchanged) {
  Dictionary description = incoming("M1");
  description.set("PortNumber", 993);
  description.set("Headers", Array{Dictionary{{"a", 1.5}}, true});
  const Dictionary record = converted(description);
  EXPECT_EQ(*record.find("PortNumber"), PropertyValue{993});
  EXPECT_EQ(*record.find("Headers"), (PropertyValue{Array{Dictionary{{"a", 1.5}}, true}}));
}

TEST_F(LegacyMail, RenamedValueTakesThePlaceOfOneUnderTheNewKey) {
  Dictionary description = incoming("M1");
  description.set("DisplayName", "Other");
  description.set("Class", "POPAccount");
  description.set("Identifier", "other");
  const Dictionary record = converted(description);
  EXPECT_EQ(textIn(record, "DisplayName"), "Home");
  EXPECT_EQ(textIn(record, "Class"), "IMAPAccount");
  EXPECT_EQ(textIn(record, "Identifier"), "M1");
}

TEST_F(LegacyMail, DeliveryAccountWithoutClassGetsTheGenericOne) {
  const Dictionary record = converted({{"Hostname", "smtp.example.com"}, {"uniqueId", "D1"}}, kSMTPAccountType);
  EXPECT_EQ(textIn(record, "Class"), "SMTPAccount");
  EXPECT_EQ(textIn(record, "Type"), "SMTP");
  EXPECT_EQ(textIn(record, "Type String"), "Account");
  EXPECT_EQ(textIn(record, "Short Type String"), "Account");
}

TEST_F(LegacyMail, DeliveryAccountWhoseClassIsNoTextGetsTheGenericOne) {
  EXPECT_EQ(textIn(converted({{"AccountType", 3}}, kSMTPAccountType), "Class"), "SMTPAccount");
}

TEST_F(LegacyMail, IncomingAccountWithoutClassYieldsNothing) {
  EXPECT_EQ(convert({{"uniqueId", "M1"}}), nullptr);
  EXPECT_EQ(convert({{"uniqueId", "M1"}, {"AccountType", 3}, {"Type", "Unknown"}}), nullptr);
  EXPECT_THAT(device.logMessages(), ElementsAre("Missing account class.", "Missing account class."))
      << "the type is the incoming one whatever the description says";
}

struct UsernameRow {
  const char* className;
  PropertyValue username;
  PropertyValue expected;
};

TEST_F(LegacyMail, UsernameOfTheHostedServiceIsCutAtTheFirstAt) {
  for (const UsernameRow& row :
       {UsernameRow{"WexmoAccount", "ada@wexmo.com", "ada"}, UsernameRow{"NimbraAccount", "ada@b@nimbra.com", "ada"},
        UsernameRow{"WexmoAccount", "ada", "ada"}, UsernameRow{"WexmoAccount", "@x", ""},
        UsernameRow{"WexmoAccount", 7, 7}, UsernameRow{"WexmoAccount", Array{"a@b"}, Array{"a@b"}},
        UsernameRow{"GmailAccount", "ada@gmail.com", "ada@gmail.com"},
        UsernameRow{"MailAccount", "ada@example.com", "ada@example.com"}}) {
    Dictionary description = incoming("M1", row.className);
    description.set("Username", row.username);
    EXPECT_EQ(*converted(description).find("Username"), row.expected) << row.className;
  }
}

TEST_F(LegacyMail, WexmoAccountBelongsToTheHostedService) {
  const Dictionary record = converted(incoming("M1", "WexmoAccount"));
  EXPECT_EQ(textIn(record, "Type"), "Nimbra");
  EXPECT_EQ(textIn(record, "Type String"), "Nimbra");
  EXPECT_FALSE(record.contains("Username"));
}

TEST_F(LegacyMail, IdentifierIsTheSyncIdentifierToo) {
  Dictionary description = incoming("M1");
  description.set("Sync Identifier", "other");
  EXPECT_EQ(textIn(converted(description), "Sync Identifier"), "M1");
}

TEST_F(LegacyMail, AccountWithoutIdentifierGetsAFreshSyncIdentifier) {
  Dictionary description = incoming("M1");
  description.remove("uniqueId");
  description.set("Sync Identifier", "other");
  const Dictionary record = converted(description);
  EXPECT_EQ(textIn(record, "Identifier"), "00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(textIn(record, "Sync Identifier"), "00000000-0000-4000-8000-000000000002");
}

// Makes one identifier and no more.
class LastIdentifier final : public platform::UniqueIdentifiers {
 public:
  platform::Result<std::string> makeUuid() override {
    if (std::exchange(_isLeft, false)) return "LAST";
    return platform::Status::failure(EIO, "make an identifier");
  }

 private:
  bool _isLeft = true;
};

TEST_F(LegacyMail, SyncIdentifierStaysAsTheRecordHasItWhereNoneCanBeMade) {
  device.changePlatform(
      [](platform::Platform& services) { services.identifiers = std::make_shared<LastIdentifier>(); });
  Dictionary description = incoming("M1");
  description.remove("uniqueId");
  description.set("Sync Identifier", "as it was");
  EXPECT_EQ(textIn(converted(description), "Sync Identifier"), "as it was");
}

TEST_F(LegacyMail, IdentifierThatIsNoTextIsTreatedAsNone) {
  Dictionary description = incoming("M1");
  description.set("uniqueId", 5);
  const Dictionary record = converted(description);
  ASSERT_NE(record.text("Sync Identifier"), nullptr);
  EXPECT_EQ(record.text("Sync Identifier")->size(), 36U);
}

TEST_F(LegacyMail, AccountOfTheGenericClassIsConvertedAndItsFinderToldNothingVisible) {
  EXPECT_EQ(textIn(converted(incoming("M1", "MailAccount")), "Class"), "MailAccount");
  EXPECT_THAT(device.outputs, IsEmpty());
}

TEST_F(LegacyMail, AccountsOfTheFileReplaceMailAndDeliveryAccountsOfTheStore) {
  putFile({Dictionary{{"uniqueId", "D1"}}}, {incoming("M1"), incoming("G1", "GmailAccount")});
  const auto accounts = store({Dictionary{{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Identifier", "mail"}},
                               Dictionary{{"Type", "Gmail"}, {"Class", "GmailAccount"}, {"Identifier", "gmail"}},
                               Dictionary{{"Type", "SMTP"}, {"Class", "SMTPAccount"}, {"Identifier", "smtp"}},
                               Dictionary{{"Type", "LDAP"}, {"Class", "LDAPAccount"}, {"Identifier", "ldap"}}});
  EXPECT_TRUE(migrator._migrateMailAccounts(*accounts));
  EXPECT_THAT(identifiersIn(*accounts), ElementsAre("gmail", "ldap", "D1", "M1", "G1"));
  EXPECT_EQ(accounts->accountWithIdentifier("G1")->type(), Text{"Gmail"});
  EXPECT_TRUE(migrator._foundOldMailAccountsToMigrate);
  EXPECT_FALSE(migrator._foundOldDAAccountsToMigrate);
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyMail, OneRefusedIncomingAccountFailsTheWholeConversionAndChangesNothing) {
  putFile({Dictionary{{"uniqueId", "D1"}}}, {incoming("M1"), Dictionary{{"AccountName", "No class"}}, Dictionary{}});
  const auto accounts = store({Dictionary{{"Type", "SMTP"}, {"Class", "SMTPAccount"}, {"Identifier", "stays"}}});
  EXPECT_FALSE(migrator._migrateMailAccounts(*accounts));
  EXPECT_THAT(identifiersIn(*accounts), ElementsAre("stays"));
  EXPECT_THAT(device.console->lines,
              ElementsAre("-[AccountsDataMigrator(Internal) _migrateMailAccounts:]. Could not convert the description "
                          "for the incoming account {AccountName = \"No class\"}"));
}

TEST_F(LegacyMail, OneRefusedDeliveryAccountFailsTheWholeConversionBeforeAnyIncomingOne) {
  putFile({Dictionary{{"AccountType", ""}}}, {Dictionary{{"AccountName", "No class"}}});
  EXPECT_FALSE(migrator._migrateMailAccounts(*store()));
  EXPECT_THAT(device.console->lines,
              ElementsAre("-[AccountsDataMigrator(Internal) _migrateMailAccounts:]. Could not convert the description "
                          "for the delivery account {AccountType = \"\"}"));
}

TEST_F(LegacyMail, ElementThatIsNoDictionaryIsAnEmptyOne) {
  putFile({17}, {});
  const auto accounts = store();
  EXPECT_TRUE(migrator._migrateMailAccounts(*accounts));
  EXPECT_EQ(accounts->count(), 1U) << "an empty delivery description is a generic delivery account";
  putFile({}, {17});
  EXPECT_FALSE(migrator._migrateMailAccounts(*accounts));
}

TEST_F(LegacyMail, UnreadableOrEmptyFileReplacesTheAccountsByNothing) {
  for (const bool isReadable : {false, true}) {
    if (isReadable) device.put(kLegacyMailFile, Dictionary{});
    const auto accounts = store({Dictionary{{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Identifier", "M"}},
                                 Dictionary{{"Type", "SMTP"}, {"Class", "SMTPAccount"}, {"Identifier", "S"}},
                                 Dictionary{{"Type", "Yahoo"}, {"Class", "YahooAccount"}, {"Identifier", "Y"}}});
    EXPECT_TRUE(migrator._migrateMailAccounts(*accounts));
    EXPECT_THAT(identifiersIn(*accounts), ElementsAre("Y"));
    EXPECT_FALSE(migrator._foundOldMailAccountsToMigrate);
  }
}

TEST_F(LegacyMail, ArraysThatAreNoArraysCountAsMissing) {
  device.put(kLegacyMailFile, Dictionary{{"DeliveryAccounts", "text"}, {"MailAccounts", Dictionary{}}});
  EXPECT_TRUE(migrator._migrateMailAccounts(*store()));
  EXPECT_TRUE(migrator._foundOldMailAccountsToMigrate);
}

TEST_F(LegacyMail, OriginalCompanionGoesEvenAfterAFailureAndTheFileItselfStays) {
  for (const Array& mail : {Array{incoming("M1")}, Array{Dictionary{}}}) {
    putFile({}, mail);
    device.files->put(kLegacyMailFile.string() + ".original", "old");
    migrator._migrateMailAccounts(*store());
    EXPECT_FALSE(device.files->exists(kLegacyMailFile.string() + ".original"));
    EXPECT_TRUE(device.files->exists(kLegacyMailFile));
  }
}

TEST_F(LegacyMail, RecordsGetTheWholeFile) {
  device.switchRecordsOn();
  migrator._collatedMigrationData.emplace();
  const Dictionary file{{"Other", 1}, {"MailAccounts", Array{incoming("M1")}}};
  device.put(kLegacyMailFile, file);
  EXPECT_TRUE(migrator._migrateMailAccounts(*store()));
  EXPECT_EQ(*migrator._collatedMigrationData, (Dictionary{{"OldMailAccounts", file}}));
}

TEST_F(LegacyMail, RecordsGetAnEmptyDictionaryForAnUnreadableFile) {
  device.switchRecordsOn();
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator._migrateMailAccounts(*store()));
  EXPECT_EQ(*migrator._collatedMigrationData, (Dictionary{{"OldMailAccounts", Dictionary{}}}));
}

TEST_F(LegacyMail, RecordsAreNotBegunByAConversion) {
  device.switchRecordsOn();
  putFile({}, {incoming("M1")});
  EXPECT_TRUE(migrator._migrateMailAccounts(*store()));
  EXPECT_FALSE(migrator._collatedMigrationData.has_value());
}

TEST_F(LegacyMail, RecordsGetNothingWhileTheyAreOff) {
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator._migrateMailAccounts(*store()));
  EXPECT_TRUE(migrator._collatedMigrationData->empty());
}

}  // namespace
