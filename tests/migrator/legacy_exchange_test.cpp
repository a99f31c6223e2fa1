#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>

#include "migrator/accounts_data_migrator.h"
#include "tests/support/migration_device.h"

using namespace tests;
using accountsettings::AccountsManager;
using migrator::AccountsDataMigrator;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

constexpr std::array kSwitchKeys{"DAAccountEnabledForCalendar", "DAAccountEnabledForContacts",
                                 "DAAccountEnabledForEmail", "DAAccountEnabledForContactsSearch"};
constexpr std::array kDataclasses{"com.vorlix.Dataclass.Calendars", "com.vorlix.Dataclass.Contacts",
                                  "com.vorlix.Dataclass.Mail", "com.vorlix.Dataclass.ContactsSearch"};

Dictionary legacyAccount(std::string_view identifier) {
  return {{"DAAccountConfigurationClass", "ASAccount"},
          {"DAAccountDescription", "Work"},
          {"DAAccountConfigurationAccountID", identifier}};
}

Dictionary fileOf(Array accounts) { return {{"DAAccountsKey", std::move(accounts)}}; }

Dictionary converted(const Dictionary& description) {
  const auto account = AccountsDataMigrator::_convertExchangeAccountDescription(description);
  return account ? account->properties() : Dictionary{};
}

class LegacyExchange : public testing::Test {
 protected:
  MigrationDevice device;
  AccountsDataMigrator migrator;

  std::shared_ptr<AccountsManager> store(const Array& accounts = {}) {
    return AccountsManager::initWithAccounsInfoArray(accounts);
  }
};

std::vector<std::string> identifiersIn(const AccountsManager& store) {
  std::vector<std::string> identifiers;
  for (const auto& account : store.allBasicAccounts())
    identifiers.push_back(account->identifier().value_or(Text{}).string());
  return identifiers;
}

TEST_F(LegacyExchange, AccountGetsItsNewKeysAndTheFixedValues) {
  const Dictionary expected{
      {"Class", "ASAccount"},
      {"DisplayName", "Work"},
      {"Identifier", "E1"},
      {"Enabled Dataclasses", Array{kDataclasses[0], kDataclasses[1], kDataclasses[2], kDataclasses[3]}},
      {"Type", "Exchange"},
      {"Type String", "Exchange"},
      {"Short Type String", "Exchange"},
      {"Sync Identifier", "E1"}};
  EXPECT_EQ(converted(legacyAccount("E1")), expected);
}

TEST_F(LegacyExchange, KeysAreRenamedInOrderBehindThoseThatStay) {
  Dictionary description = legacyAccount("E1");
  description.set("DAAccountHost", "mail.example.com");
  std::vector<std::string> keys;
  for (const auto& entry : converted(description)) keys.push_back(entry.key.string());
  EXPECT_THAT(keys, ElementsAre("DAAccountHost", "Class", "DisplayName", "Identifier", "Enabled Dataclasses", "Type",
                                "Type String", "Short Type String", "Sync Identifier"));
}

TEST_F(LegacyExchange, EveryOtherValueIsCopiedUnchanged) {
  Dictionary description = legacyAccount("E1");
  const Dictionary nested{{"Folders", Array{1, 2.5, true}}};
  description.set("DAAccountPolicy", nested);
  description.set("DAAccountPort", 443);
  const Dictionary record = converted(description);
  EXPECT_EQ(*record.find("DAAccountPolicy"), PropertyValue{nested});
  EXPECT_EQ(*record.find("DAAccountPort"), PropertyValue{443});
}

TEST_F(LegacyExchange, RenamedValueTakesThePlaceOfOneUnderTheNewKey) {
  Dictionary description{{"Identifier", "old"}, {"Class", "OldClass"}, {"DisplayName", "Old"}};
  for (const auto& entry : legacyAccount("E1")) description.set(entry.key, entry.value);
  const Dictionary record = converted(description);
  EXPECT_EQ(textIn(record, "Identifier"), "E1");
  EXPECT_EQ(textIn(record, "Class"), "ASAccount");
  EXPECT_EQ(textIn(record, "DisplayName"), "Work");
  EXPECT_EQ(record.begin()->key.view(), "Identifier");
}

TEST_F(LegacyExchange, FixedValuesTakeThePlaceOfOthers) {
  Dictionary description = legacyAccount("E1");
  for (const char* key : {"Type", "Type String", "Short Type String", "Enabled Dataclasses", "Sync Identifier"}) {
    description.set(key, "other");
  }
  EXPECT_EQ(converted(description), converted(legacyAccount("E1")));
}

// Each switch absent, off or on: 0, 1 or 2 in the digits of `combination` to the base 3.
class ExchangeSwitches : public testing::TestWithParam<int> {};

TEST_P(ExchangeSwitches, EnableTheirDataClassesUnlessTheyAreOffAndGo) {
  const MigrationDevice device;
  Dictionary description = legacyAccount("E1");
  Array expected;
  int combination = GetParam();
  for (std::size_t index = 0; index < kSwitchKeys.size(); ++index, combination /= 3) {
    const int state = combination % 3;
    if (state != 0) description.set(kSwitchKeys[index], state == 2);
    if (state != 1) expected.emplace_back(kDataclasses[index]);
  }
  const Dictionary record = converted(description);
  EXPECT_EQ(*record.array("Enabled Dataclasses"), expected);
  for (const char* key : kSwitchKeys) EXPECT_FALSE(record.contains(key)) << key;
}

INSTANTIATE_TEST_SUITE_P(AllCombinations, ExchangeSwitches, testing::Range(0, 81));

TEST_F(LegacyExchange, SwitchMayBeANumberOrATextAndIsOnWhereItIsNeither) {
  Dictionary description = legacyAccount("E1");
  description.set(kSwitchKeys[0], 0);
  description.set(kSwitchKeys[1], "no");
  description.set(kSwitchKeys[2], "YES");
  description.set(kSwitchKeys[3], Array{false});
  EXPECT_EQ(*converted(description).array("Enabled Dataclasses"), (Array{kDataclasses[2], kDataclasses[3]}));
}

TEST_F(LegacyExchange, AccountWithoutIdentifierGetsNoSyncIdentifierOfItsOwn) {
  Dictionary description = legacyAccount("E1");
  description.remove("DAAccountConfigurationAccountID");
  description.set("Sync Identifier", "kept");
  EXPECT_EQ(textIn(converted(description), "Sync Identifier"), "kept");
  EXPECT_EQ(device.identifiers->made, 1) << "the record's own identifier only";
}

TEST_F(LegacyExchange, IdentifierThatIsNoTextIsTreatedAsNone) {
  Dictionary description = legacyAccount("E1");
  description.set("DAAccountConfigurationAccountID", 7);
  description.set("Sync Identifier", "kept");
  EXPECT_EQ(textIn(converted(description), "Sync Identifier"), "kept");
}

TEST_F(LegacyExchange, NameThatIsNoTextIsMovedAllTheSame) {
  Dictionary description = legacyAccount("E1");
  description.set("DAAccountDescription", 7);
  EXPECT_EQ(*converted(description).find("DisplayName"), PropertyValue{7});
}

TEST_F(LegacyExchange, AccountWithoutClassYieldsNothing) {
  Dictionary description = legacyAccount("E1");
  description.remove("DAAccountConfigurationClass");
  EXPECT_EQ(AccountsDataMigrator::_convertExchangeAccountDescription(description), nullptr);
  description.set("DAAccountConfigurationClass", 12);
  EXPECT_EQ(AccountsDataMigrator::_convertExchangeAccountDescription(description), nullptr);
}

TEST_F(LegacyExchange, AccountsOfTheFileReplaceTheExchangeAccountsOfTheStore) {
  device.put(kLegacyExchangeFile, fileOf({legacyAccount("E1"), legacyAccount("E2")}));
  const auto accounts = store({Dictionary{{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "gone"}},
                               Dictionary{{"Type", "LDAP"}, {"Class", "LDAPAccount"}, {"Identifier", "other"}},
                               Dictionary{{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "E2"}}});
  EXPECT_TRUE(migrator._migrateDAAccounts(*accounts));
  EXPECT_THAT(identifiersIn(*accounts), ElementsAre("other", "E2", "E1"));
  EXPECT_EQ(accounts->accountWithIdentifier("E2")->displayName(), Text{"Work"});
  EXPECT_TRUE(migrator._foundOldDAAccountsToMigrate);
  EXPECT_FALSE(migrator._foundOldMailAccountsToMigrate);
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyExchange, OneRefusedAccountFailsTheWholeConversionAndChangesNothing) {
  Dictionary classless = legacyAccount("bad");
  classless.remove("DAAccountConfigurationClass");
  device.put(kLegacyExchangeFile, fileOf({legacyAccount("E1"), classless, Dictionary{}, legacyAccount("E2")}));
  const auto accounts = store({Dictionary{{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "stays"}}});
  EXPECT_FALSE(migrator._migrateDAAccounts(*accounts));
  EXPECT_THAT(identifiersIn(*accounts), ElementsAre("stays"));
  EXPECT_THAT(
      device.console->lines,
      ElementsAre("-[AccountsDataMigrator(Internal) _migrateDAAccounts:]. Could not convert the description for "
                  "the Exchange account {DAAccountDescription = \"Work\"; DAAccountConfigurationAccountID = "
                  "\"bad\"}"));
}

TEST_F(LegacyExchange, ElementThatIsNoDictionaryIsAnEmptyOneAndSoRefused) {
  device.put(kLegacyExchangeFile, fileOf({"no account"}));
  EXPECT_FALSE(migrator._migrateDAAccounts(*store()));
  EXPECT_EQ(device.console->lines.size(), 1U);
}

TEST_F(LegacyExchange, UnreadableFileReplacesTheExchangeAccountsByNothing) {
  device.files->put(kLegacyExchangeFile, "no property list");
  const auto accounts = store({Dictionary{{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "gone"}}});
  EXPECT_TRUE(migrator._migrateDAAccounts(*accounts));
  EXPECT_EQ(accounts->count(), 0U);
  EXPECT_FALSE(migrator._foundOldDAAccountsToMigrate);
}

TEST_F(LegacyExchange, FileWithoutAnArrayOfAccountsReplacesThemByNothing) {
  for (const Dictionary& file : {Dictionary{{"Other", 1}}, Dictionary{{"DAAccountsKey", "text"}}, fileOf({})}) {
    device.put(kLegacyExchangeFile, file);
    const auto accounts = store({Dictionary{{"Type", "Exchange"}, {"Class", "ASAccount"}, {"Identifier", "gone"}}});
    EXPECT_TRUE(migrator._migrateDAAccounts(*accounts));
    EXPECT_EQ(accounts->count(), 0U);
    EXPECT_TRUE(migrator._foundOldDAAccountsToMigrate);
  }
}

TEST_F(LegacyExchange, EmptyDictionaryIsNoFind) {
  device.put(kLegacyExchangeFile, Dictionary{});
  EXPECT_TRUE(migrator._migrateDAAccounts(*store()));
  EXPECT_FALSE(migrator._foundOldDAAccountsToMigrate);
}

TEST_F(LegacyExchange, OriginalCompanionGoesEvenAfterAFailureAndTheFileItselfStays) {
  for (const Array& accounts : {Array{legacyAccount("E1")}, Array{Dictionary{}}}) {
    device.put(kLegacyExchangeFile, fileOf(accounts));
    device.files->put(kLegacyExchangeFile.string() + ".original", "old");
    migrator._migrateDAAccounts(*store());
    EXPECT_FALSE(device.files->exists(kLegacyExchangeFile.string() + ".original"));
    EXPECT_TRUE(device.files->exists(kLegacyExchangeFile));
  }
}

TEST_F(LegacyExchange, CompanionThatCannotBeDeletedIsIgnored) {
  device.files->put(kLegacyExchangeFile.string() + ".original", "old");
  device.files->failing.insert("remove");
  EXPECT_TRUE(migrator._migrateDAAccounts(*store()));
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyExchange, RecordsGetTheWholeFile) {
  device.switchRecordsOn();
  migrator._collatedMigrationData.emplace();
  const Dictionary file{{"Other", 1}, {"DAAccountsKey", Array{legacyAccount("E1")}}};
  device.put(kLegacyExchangeFile, file);
  EXPECT_TRUE(migrator._migrateDAAccounts(*store()));
  EXPECT_EQ(*migrator._collatedMigrationData, (Dictionary{{"OldExchangeAccount", file}}));
}

TEST_F(LegacyExchange, RecordsGetAnEmptyDictionaryForAnUnreadableFile) {
  device.switchRecordsOn();
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator._migrateDAAccounts(*store()));
  EXPECT_EQ(*migrator._collatedMigrationData, (Dictionary{{"OldExchangeAccount", Dictionary{}}}));
}

TEST_F(LegacyExchange, RecordsGetTheFileAlsoWhereTheConversionFails) {
  device.switchRecordsOn();
  migrator._collatedMigrationData.emplace();
  device.put(kLegacyExchangeFile, fileOf({Dictionary{}}));
  EXPECT_FALSE(migrator._migrateDAAccounts(*store()));
  EXPECT_TRUE(migrator._collatedMigrationData->contains("OldExchangeAccount"));
}

TEST_F(LegacyExchange, RecordsGetNothingWhileTheyAreOff) {
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator._migrateDAAccounts(*store()));
  EXPECT_TRUE(migrator._collatedMigrationData->empty());
}

}  // namespace
