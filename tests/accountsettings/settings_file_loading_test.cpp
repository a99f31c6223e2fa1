#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>

#include "platform/run_observer.h"
#include "tests/support/account_store.h"

namespace tests {
namespace {

using Identifiers = std::vector<std::string>;

class LoadingTheSettingsFile : public AccountStore {};

TEST_F(LoadingTheSettingsFile, ReadsItUnderTheSystemRoot) {
  EXPECT_EQ(AccountsManager::fullPathToAccountSettingsPlist(), kSettingsFile);
  device.directories->root = "/images/device";
  EXPECT_EQ(AccountsManager::fullPathToAccountSettingsPlist(),
            "/images/device/var/mobile/Library/Preferences/com.vorlix.accountsettings.plist");
}

TEST_F(LoadingTheSettingsFile, KeepsTheOrderOfTheAccounts) {
  EXPECT_EQ(identifiersOf(load({properties("b"), properties("a"), properties("c")})->allBasicAccounts()),
            (Identifiers{"b", "a", "c"}));
}

TEST_F(LoadingTheSettingsFile, IsWhatThePlainConstructorDoes) {
  putFile({properties("a")}, 7);
  EXPECT_EQ(AccountsManager::init()->dataVersion(), 7U);
  EXPECT_EQ(AccountsManager::initInsideOfMigration()->dataVersion(), 7U);
}

TEST_F(LoadingTheSettingsFile, GivesAnEmptyStoreOfVersionZeroWithoutAWordWhereThereIsNoFile) {
  const Store store = AccountsManager::init();
  EXPECT_EQ(store->count(), 0U);
  EXPECT_EQ(store->dataVersion(), 0U);
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(LoadingTheSettingsFile, GivesAnEmptyStoreOfVersionZeroWithoutAWordWhereTheFileCannotBeRead) {
  device.files->put(kSettingsFile, "no property list");
  const Store store = AccountsManager::init();
  EXPECT_EQ(store->count(), 0U);
  EXPECT_EQ(store->dataVersion(), 0U);
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(LoadingTheSettingsFile, IsRememberedByTheStore) {
  putFile({properties("a")}, 7);
  const accountsettings::LoadOutcome outcome = AccountsManager::init()->loadOutcome();
  EXPECT_TRUE(outcome.isFromFile);
  EXPECT_TRUE(outcome.reading.isOk());
  EXPECT_EQ(outcome.storedVersion, 7);
  EXPECT_TRUE(outcome.leftOut.empty());
}

TEST_F(LoadingTheSettingsFile, IsToldApartFromFindingNoFileAndFromFindingOneThatCannotBeRead) {
  EXPECT_EQ(AccountsManager::init()->loadOutcome().reading.cause(), platform::Cause::missing);
  EXPECT_FALSE(AccountsManager::init()->loadOutcome().hasUnreadFile());
  device.files->put(kSettingsFile, "no property list");
  EXPECT_EQ(AccountsManager::init()->loadOutcome().reading.cause(), platform::Cause::malformed);
  device.files->failing = {"read"};
  EXPECT_EQ(AccountsManager::init()->loadOutcome().reading.errorNumber(), EIO);
  EXPECT_TRUE(AccountsManager::init()->loadOutcome().hasUnreadFile());
}

class ProgressObserver final : public platform::RunObserver {
 public:
  std::vector<std::pair<std::size_t, std::size_t>> told;
  void stageBegan(std::string_view, std::string_view) override {}
  void stageEnded(std::string_view) override {}
  void progressed(std::size_t done, std::size_t total) override { told.emplace_back(done, total); }
};

TEST_F(LoadingTheSettingsFile, AndSavingItTellHowFarTheyAre) {
  const auto observer = std::make_shared<ProgressObserver>();
  device.setObserver(observer);
  const Store store = load(Array(300, PropertyValue{properties("a")}));
  EXPECT_EQ(observer->told, (std::vector<std::pair<std::size_t, std::size_t>>{{256, 300}}));
  AccountsManager::_setShouldSkipNotifications(true);
  store->saveAllAccounts();
  EXPECT_EQ(observer->told.size(), 3U) << "by the load, by the save, and by the load of the file as it stands then";
}

TEST_F(LoadingTheSettingsFile, SaysNothingOfAccountsThatWereInMemory) {
  const Store store = AccountsManager::initWithAccounsInfoArray({properties("a")});
  EXPECT_FALSE(store->loadOutcome().isFromFile);
  EXPECT_FALSE(store->loadOutcome().hasUnreadFile());
}

TEST_F(LoadingTheSettingsFile, RemembersWhichRecordsItLeftOutAndWhy) {
  using accountsettings::WhyLeftOut;
  const Array records{"no dictionary",
                      Dictionary{{"Identifier", "a"}, {"Class", "C"}},
                      properties("kept"),
                      Dictionary{{"Identifier", "b"}, {"Type", "Odd"}},
                      Dictionary{{"Identifier", "c"}, {"Type", "Mail"}},
                      properties("d", {}, "Mail")};
  const Store store = load(records);
  const std::vector<std::pair<std::size_t, WhyLeftOut>> expected{{0, WhyLeftOut::noRecord},
                                                                 {1, WhyLeftOut::noType},
                                                                 {3, WhyLeftOut::unknownType},
                                                                 {4, WhyLeftOut::noClass},
                                                                 {5, WhyLeftOut::givenUp}};
  ASSERT_EQ(store->loadOutcome().leftOut.size(), expected.size());
  for (std::size_t index = 0; index < expected.size(); ++index) {
    const accountsettings::LeftOutRecord& record = store->loadOutcome().leftOut[index];
    EXPECT_EQ(std::pair(record.position, record.why), expected[index]) << index;
    EXPECT_EQ(record.element, records[record.position]);
  }
}

TEST_F(LoadingTheSettingsFile, GivesAnEmptyStoreWhereTheAccountsAreEmptyOrMissingOrNoArray) {
  const std::vector<Dictionary> roots{{{"Accounts", Array{}}, {"Version", 3}},
                                      {{"Version", 3}},
                                      {{"Accounts", "text"}, {"Version", 3}},
                                      {{"Accounts", properties("a")}, {"Version", 3}}};
  for (const Dictionary& root : roots) {
    device.put(kSettingsFile, root);
    const Store store = AccountsManager::init();
    EXPECT_EQ(store->count(), 0U);
    EXPECT_EQ(store->dataVersion(), 3U);
  }
}

TEST_F(LoadingTheSettingsFile, ReadsTheDataVersionOfWhateverKindItIs) {
  const std::vector<std::pair<PropertyValue, std::uint64_t>> cases{{3, 3},
                                                                   {12, 12},
                                                                   {std::uint64_t{1} << 63U, std::uint64_t{1} << 63U},
                                                                   {-1, UINT64_MAX},
                                                                   {4.9, 4},
                                                                   {"11 and more", 11},
                                                                   {"eleven", 0},
                                                                   {true, 0},
                                                                   {Array{5}, 0},
                                                                   {Dictionary{}, 0},
                                                                   {Bytes{1}, 0}};
  for (const auto& [stored, version] : cases) {
    putFile({}, stored);
    EXPECT_EQ(AccountsManager::init()->dataVersion(), version);
  }
}

TEST_F(LoadingTheSettingsFile, SkipsARecordThatMakesNoAccountAndSaysSo) {
  const Store store = load({properties("a"), Dictionary{{"Type", "Telepathy"}, {"Class", "X"}}, properties("b")});
  EXPECT_EQ(identifiersOf(store->allBasicAccounts()), (Identifiers{"a", "b"}));
  EXPECT_EQ(
      messagesOf("-[AccountsManager _initWithAccountsInfo:]"),
      (std::vector<std::string>{"ERROR: Failed to create a BasicAccount from {Type = \"Telepathy\"; Class = \"X\"}"}));
}

TEST_F(LoadingTheSettingsFile, TakesAnElementThatIsNoDictionaryForAnEmptyOne) {
  EXPECT_EQ(load({5, properties("a")})->count(), 1U);
  EXPECT_EQ(device.logMessages(), (std::vector<std::string>{"Invalid account type: (null)", "Missing account class.",
                                                            "ERROR: Failed to create a BasicAccount from 5"}));
}

TEST_F(LoadingTheSettingsFile, KeepsTwoRecordsOfOneIdentifierInOrderAndFindsTheLater) {
  const Store store = load({properties("a", {{"Port", 1}}), properties("b"), properties("a", {{"Port", 2}})});
  EXPECT_EQ(identifiersOf(store->allBasicAccounts()), (Identifiers{"a", "b", "a"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), store->allBasicAccounts()[2]);
}

TEST_F(LoadingTheSettingsFile, LeavesAChildThatMakesNoAccountWhereItStandsAndOutOfTheIndex) {
  const Dictionary parent = properties("p", {{"ChildAccounts", Array{Dictionary{{"Port", 1}}, properties("c")}}});
  const Store store = load({parent});
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Identifiers{"p", "c"}));
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{parent}));
}

TEST_F(LoadingTheSettingsFile, CanBeReplacedByAnArrayInMemory) {
  const Store store = AccountsManager::initWithAccounsInfoArray({properties("a")});
  EXPECT_EQ(store->count(), 1U);
  EXPECT_EQ(store->dataVersion(), 0U);
  EXPECT_EQ(AccountsManager::_initWithAccountsInfo(nullptr)->count(), 0U);
}

TEST_F(LoadingTheSettingsFile, LeavesOutAnAccountThatTheFixerDrops) {
  const Store store = load({properties("a", {}, "Mail"), properties("b")});
  EXPECT_EQ(identifiersOf(store->allBasicAccounts()), (Identifiers{"b"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
}

}  // namespace
}  // namespace tests
