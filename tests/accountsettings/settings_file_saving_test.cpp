#include <gtest/gtest.h>

#include <algorithm>

#include "tests/support/account_store.h"
#include "tests/support/mishap_file_system.h"

namespace tests {
namespace {

using Lines = std::vector<std::string>;
using Stage = accountsettings::SaveOutcome::Stage;

constexpr const char* kSave = "-[AccountsManager saveAllAccounts]";
constexpr const char* kCalendars = "com.vorlix.Dataclass.Calendars";

class SavingAccounts : public AccountStore {
 protected:
  // Saves what comes after by another process, between the load and the save.
  void letAnotherProcessWrite(const Array& accounts) { putFile(accounts); }

  [[nodiscard]] Lines fileCalls() const {
    Lines changing;
    std::ranges::copy_if(device.files->calls, std::back_inserter(changing),
                         [](const std::string& call) { return !call.starts_with("read "); });
    return changing;
  }
};

TEST_F(SavingAccounts, WritesAnEmptyStoreAsAnEmptyArrayAndTheCurrentVersion) {
  AccountsManager::init()->saveAllAccounts();
  const Dictionary root = file();
  ASSERT_EQ(root.size(), 2U);
  EXPECT_EQ(root.begin()[0].key, Text{"Accounts"});
  EXPECT_EQ(root, (Dictionary{{"Accounts", Array{}}, {"Version", kCurrentVersion}}));
}

TEST_F(SavingAccounts, StampsTheCurrentVersionAndChangesNothingElse) {
  const Array accounts{properties("a", {{"Port", 993}, {"Known to nobody", Array{Bytes{1}, platform::Uid{5}}}}),
                       properties("b", {{"Enabled Dataclasses", "of an odd kind"}})};
  putFile(accounts, 3);
  AccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(file(), (Dictionary{{"Accounts", accounts}, {"Version", kCurrentVersion}}));
}

TEST_F(SavingAccounts, WritesTheCurrentVersionWhateverTheStoreIsStampedWith) {
  const Store store = load({});
  store->setDataVersion(5);
  store->saveAllAccounts();
  EXPECT_EQ(*file().find("Version"), PropertyValue{kCurrentVersion});
  EXPECT_EQ(store->dataVersion(), 5U);
}

TEST_F(SavingAccounts, KeepsTheOrderOfKeys) {
  const Dictionary reversed{{"Port", 1}, {"Class", "X"}, {"Type", "CalDAV"}, {"Identifier", "a"}};
  load({reversed})->saveAllAccounts();
  const Dictionary saved = *fileAccounts()[0].asDictionary();
  EXPECT_TRUE(std::equal(saved.begin(), saved.end(), reversed.begin(), reversed.end(),
                         [](const auto& left, const auto& right) { return left.key == right.key; }));
}

TEST_F(SavingAccounts, WritesBackBothOfTwoRecordsWithOneIdentifier) {
  const Array accounts{properties("a"), properties("b"), properties("a")};
  load(accounts)->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), accounts);
}

TEST_F(SavingAccounts, MergesBothOfTwoRecordsWithOneIdentifierWithTheLaterOneInTheFile) {
  load({properties("a", {{"Port", 1}}), properties("a", {{"Port", 2}})})->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 2}}), properties("a", {{"Port", 2}})}));
}

TEST_F(SavingAccounts, DropsAnAccountOfTheFileThatTheStoreDoesNotHold) {
  putFile({properties("a"), properties("b")});
  AccountsManager::initWithAccounsInfoArray({properties("b")})->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("b")}));
}

TEST_F(SavingAccounts, DropsAnAccountThatAnotherProcessAddedSinceTheLoad) {
  const Store store = load({properties("a")});
  letAnotherProcessWrite({properties("a"), properties("new")});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a")}));
}

TEST_F(SavingAccounts, KeepsAnAccountThatAnotherProcessRemovedSinceTheLoad) {
  const Store store = load({properties("a"), properties("b")});
  letAnotherProcessWrite({properties("b")});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a"), properties("b")}));
}

TEST_F(SavingAccounts, KeepsWhatAnotherProcessWritesInTheVeryMomentBeforeTheMerge) {
  const Store store = load({properties("a", {{"Port", 1}, {"Host", "old"}})});
  store->allBasicAccounts()[0]->setAccountProperty_forKey("changed here", "Host");
  device.propertyLists->beforeRead = [this](const Path&) {
    letAnotherProcessWrite({properties("a", {{"Port", 2}, {"Host", "changed there"}, {"User", "added there"}})});
  };
  store->saveAllAccounts();
  device.propertyLists->beforeRead = nullptr;
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 2}, {"Host", "changed here"}, {"User", "added there"}})}));
}

TEST_F(SavingAccounts, TakesTheChildrenWholeFromWhoeverChangedThem) {
  const auto parent = [](const char* child) { return properties("p", {{"ChildAccounts", Array{properties(child)}}}); };
  const Store store = load({parent("c")});
  letAnotherProcessWrite({parent("theirs")});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{parent("theirs")}));
  store->allBasicAccounts()[0]->setAccountProperty_forKey(Array{properties("ours")}, "ChildAccounts");
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{parent("ours")}));
}

TEST_F(SavingAccounts, LetsTheFileWinForARecordMadeAnewUnderAnIdentifierThatTheFileHolds) {
  putFile({properties("a", {{"Port", 1}, {"User", "kept"}})});
  const Store store = AccountsManager::initWithAccounsInfoArray({properties("a", {{"Port", 2}})});
  store->allBasicAccounts()[0]->setAccountProperty_forKey("set afterwards", "Host");
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 1}, {"User", "kept"}, {"Host", "set afterwards"}})}));
}

TEST_F(SavingAccounts, ComparesARecordThatAFixerDropsFromTheFileWithNothing) {
  const Store store = load({properties("a", {{"Port", 1}})});
  letAnotherProcessWrite({properties("a", {{"Port", 2}}, "Mail")});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 1}})}));
}

TEST_F(SavingAccounts, MergesWithTheParentWhereTheFileHoldsTheIdentifierAsAChild) {
  const Store store = load({properties("a", {{"Port", 1}})});
  const Dictionary parent = properties("p", {{"ChildAccounts", Array{properties("a", {{"Port", 2}})}}});
  letAnotherProcessWrite({parent});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("p", {{"ChildAccounts", Array{properties("a", {{"Port", 2}})}}})}));
}

TEST_F(SavingAccounts, RemembersWhatItSavedAsTheStateBeforeTheNextChanges) {
  const Store store = load({properties("a")});
  const Account saved = store->allBasicAccounts()[0];
  saved->setAccountProperty_forKey(2, "Port");
  store->saveAllAccounts();
  EXPECT_EQ(saved->originalProperties(), saved->properties());
  letAnotherProcessWrite({properties("a", {{"Port", 3}})});
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 3}})}));
}

TEST_F(SavingAccounts, ReplacesTheFileInOneMoveByOneThatBelongsToMobile) {
  const Store store = load({});
  device.files->calls.clear();
  store->saveAllAccounts();
  EXPECT_EQ(fileCalls(), (Lines{"temporaryName", "create /var/mobile/tmp/file1", "setOwner /var/mobile/tmp/file1",
                                "rename /var/mobile/tmp/file1 " + kSettingsFile.string()}));
  EXPECT_EQ(device.files->nodes[kSettingsFile].owner, "mobile");
  EXPECT_EQ(device.files->nodes[kSettingsFile].group, "mobile");
  EXPECT_FALSE(device.files->exists("/var/mobile/tmp/file1"));
}

TEST_F(SavingAccounts, SaysWhatItSavesAndWhatItMergedIntoEachAccount) {
  const Store store = load({properties("a", {{"Enabled Dataclasses", Array{kCalendars}}}), properties("b")});
  store->saveAllAccounts();
  EXPECT_EQ(messagesOf(kSave),
            (Lines{"Saving all accounts",
                   "Calculated Properties - Type: CalDAV, Properties: {Identifier = \"a\"; Type = \"CalDAV\"; Class = "
                   "\"TestAccount\"; \"Enabled Dataclasses\" = (\"com.vorlix.Dataclass.Calendars\")}, Dataclasses: "
                   "(\"com.vorlix.Dataclass.Calendars\")",
                   "Calculated Properties - Type: CalDAV, Properties: {Identifier = \"b\"; Type = \"CalDAV\"; Class = "
                   "\"TestAccount\"}, Dataclasses: (null)"}));
}

TEST_F(SavingAccounts, SaysOfAnAccountWithoutIdentifierThatItsChangesAreNotFollowed) {
  const Store store = load({properties("a")});
  store->allBasicAccounts()[0]->removeAccountPropertyForKey("Identifier");
  store->_setOriginalAccountDictionaries();
  EXPECT_EQ(messagesOf("-[AccountsManager _setOriginalAccountDictionaries]"),
            (Lines{"{Type = \"CalDAV\"; Class = \"TestAccount\"} returned a nil identifier. Account properties may not "
                   "get saved"}));
}

TEST_F(SavingAccounts, KeepsAnAccountForWhichNoIdentifierCanBeMadeAndSaysSoAtTheLoad) {
  device.identifiers->canMake = false;
  const Array accounts{Dictionary{{"Type", "CalDAV"}, {"Class", "TestAccount"}}, properties("b")};
  const Store store = load(accounts);
  EXPECT_EQ(messagesOf("-[AccountsManager _setOriginalAccountDictionaries]"),
            (Lines{"{Type = \"CalDAV\"; Class = \"TestAccount\"} returned a nil identifier. Account properties may not "
                   "get saved"}));
  EXPECT_EQ(store->count(), 2U);
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), accounts);
}

TEST_F(SavingAccounts, WritesAnAccountWithoutIdentifierAsItStandsInMemory) {
  const Store store = load({properties("a", {{"Port", 1}})});
  letAnotherProcessWrite({properties("a", {{"Port", 2}}), properties("", {{"Port", 3}})});
  store->allBasicAccounts()[0]->removeAccountPropertyForKey("Identifier");
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{Dictionary{{"Type", "CalDAV"}, {"Class", "TestAccount"}, {"Port", 1}}}));
}

TEST_F(SavingAccounts, KeepsAnAccountThatTheFixerDropsInTheFileAndFindsItNoMore) {
  const Store store = load({properties("p"), properties("q")});
  const Account dropped = store->allBasicAccounts()[0];
  dropped->_forcedSetAccountProperty_forKey("Mail", "Type");
  store->addChild_toAccount(account("c"), dropped);
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{dropped->properties(), properties("q")}));
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"p", "q"}));
  EXPECT_EQ(store->accountWithIdentifier("p"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
}

TEST_F(SavingAccounts, TakesTheIdentifierOfADroppedAccountFromWhateverRecordHoldsIt) {
  const Store store = load({properties("a"), properties("a")});
  store->allBasicAccounts()[0]->_forcedSetAccountProperty_forKey("Mail", "Type");
  store->saveAllAccounts();
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
  EXPECT_EQ(store->count(), 2U);
}

TEST_F(SavingAccounts, OffersTheAccountsToTheFixersFromTheLastToTheFirst) {
  const Store store = load({properties("a"), properties("b")});
  for (const Account& each : store->allBasicAccounts()) each->_forcedSetAccountProperty_forKey("Mail", "Type");
  store->saveAllAccounts();
  const Lines messages = messagesOf("-[ASRuntimeFixMailAccount _cleanupAccountClass:]");
  ASSERT_EQ(messages.size(), 2U);
  EXPECT_NE(messages[0].find("Identifier = \"b\""), std::string::npos);
  EXPECT_NE(messages[1].find("Identifier = \"a\""), std::string::npos);
}

TEST_F(SavingAccounts, SaysThatItSavesThenWhatItFixesThenWhatIsWrongInTheFileThenWhatItMerges) {
  const Store store = load({properties("a"), Dictionary{{"Type", "CalDAV"}}});
  store->allBasicAccounts()[0]->_forcedSetAccountProperty_forKey("Mail", "Type");
  device.systemLog->lines.clear();
  store->saveAllAccounts();
  Lines beginnings;
  for (const std::string& message : device.logMessages()) beginnings.push_back(message.substr(0, message.find(" {")));
  EXPECT_EQ(beginnings, (Lines{"Saving all accounts", "Could not fix the class of the mail account:",
                               "Missing account class.", "ERROR: Failed to create a BasicAccount from", "Merging inmem",
                               "Merged to", "Calculated Properties - Type: Mail, Properties:"}));
}

struct Failure {
  const char* name;
  std::function<void(FakeDevice&)> arrange;
  Lines messages;
  Stage stage;
};

void PrintTo(const Failure& failure, std::ostream* stream) { *stream << failure.name; }

class FailingToSaveAccounts : public AccountStore, public testing::WithParamInterface<Failure> {};

TEST_P(FailingToSaveAccounts, SaysSoAndLeavesFileAndMemoryAsTheyWere) {
  const Dictionary loaded = properties("a", {{"Enabled Dataclasses", Array{kCalendars}}, {"Port", 1}});
  const Store store = load({loaded});
  const Account changed = store->allBasicAccounts()[0];
  changed->setAccountProperty_forKey(2, "Port");
  const std::string before = device.files->contents(kSettingsFile);
  GetParam().arrange(device);
  store->saveAllAccounts();  // looking for somebody to notify would throw: the configuration names no creators

  EXPECT_EQ(device.files->contents(kSettingsFile), before);
  EXPECT_FALSE(device.files->exists("/var/mobile/tmp/file1"));
  EXPECT_EQ(changed->accountPropertyForKey("Port"), PropertyValue{2});
  EXPECT_EQ(changed->originalProperties(), loaded);
  const Lines messages = messagesOf(kSave);
  ASSERT_GE(messages.size(), 2U);
  EXPECT_EQ(Lines(messages.begin() + 2, messages.end()), GetParam().messages);
  EXPECT_TRUE(store->lastSaveOutcome().hasFailed());
  EXPECT_EQ(store->lastSaveOutcome().stage, GetParam().stage);
  EXPECT_FALSE(store->lastSaveOutcome().status.isOk());
}

INSTANTIATE_TEST_SUITE_P(
    , FailingToSaveAccounts,
    testing::Values(
        Failure{"WithoutSerialisation",
                [](FakeDevice& device) {
                  device.propertyLists->serializes = false;
                  device.propertyLists->serializeError = "out of ink";
                },
                {"Failed to serialize account settings data: out of ink", "Failed to save accounts to filesystem."},
                Stage::serializing},
        Failure{"WithoutDataOrAReason",
                [](FakeDevice& device) { device.propertyLists->serializes = false; },
                {"Failed to serialize account settings data: (null)", "Failed to save accounts to filesystem."},
                Stage::serializing},
        Failure{"WithoutATemporaryName",
                [](FakeDevice& device) { device.files->hasTemporaryNames = false; },
                {"Failed to save accounts to filesystem."},
                Stage::naming},
        Failure{"WithoutSpace",
                [](FakeDevice& device) { device.files->failing = {"create"}; },
                {"Failed to save accounts to filesystem."},
                Stage::creating},
        Failure{"WithoutOwner",
                [](FakeDevice& device) { device.files->accounts.clear(); },
                {"Could not set attributes on the temporary account settings plist. Could not find the account mobile "
                 "for /var/mobile/tmp/file1: No such file or directory (errno 2)",
                 "Failed to save accounts to filesystem."},
                Stage::givingAway},
        Failure{"OntoAnotherVolume",
                [](FakeDevice& device) { device.files->failing = {"rename"}; },
                {"Failed to save accounts to filesystem."},
                Stage::replacing}),
    [](const auto& failure) { return failure.param.name; });

TEST_F(SavingAccounts, IsRememberedByTheStore) {
  const Store store = load({properties("a")});
  EXPECT_EQ(store->lastSaveOutcome().stage, Stage::none);
  AccountsManager::_setShouldSkipNotifications(true);
  store->saveAllAccounts();
  EXPECT_TRUE(store->lastSaveOutcome().isSaved());
  EXPECT_FALSE(store->lastSaveOutcome().hasFailed());
}

TEST_F(SavingAccounts, ThatEndsInAnExceptionHasFailedUnlessTheFileWasWritten) {
  const Store store = load({properties("a")});
  AccountsManager::_setShouldSkipNotifications(true);
  device.propertyLists->beforeRead = [](const Path&) { throw std::bad_alloc{}; };
  EXPECT_THROW(store->saveAllAccounts(), std::bad_alloc);
  EXPECT_TRUE(store->lastSaveOutcome().hasFailed());
  device.propertyLists->beforeRead = nullptr;
  store->saveAllAccounts();
  EXPECT_TRUE(store->lastSaveOutcome().isSaved());
}

// Reads as another one does, and has no memory to write.
struct PropertyListsWithoutMemory final : platform::PropertyListStore {
  explicit PropertyListsWithoutMemory(std::shared_ptr<platform::PropertyListStore> reading)
      : inner{std::move(reading)} {}
  platform::Result<Dictionary> readDictionary(const Path& path) override { return inner->readDictionary(path); }
  platform::SerializedPropertyList serialize(const Dictionary& /*dictionary*/) override { throw std::bad_alloc{}; }
  std::shared_ptr<platform::PropertyListStore> inner;
};

TEST_F(SavingAccounts, RemembersThatAnExceptionEndedItBeforeThereWereBytes) {
  const Store store = load({});
  device.changePlatform([&](platform::Platform& services) {
    services.propertyLists = std::make_shared<PropertyListsWithoutMemory>(device.propertyLists);
  });
  EXPECT_THROW(store->saveAllAccounts(), std::bad_alloc);
  EXPECT_EQ(store->lastSaveOutcome().stage, Stage::serializing);
}

TEST_F(SavingAccounts, RemembersThatNoDataCameWhereNobodySaidWhy) {
  const Store store = load({});
  device.propertyLists->serializes = false;
  store->saveAllAccounts();
  EXPECT_EQ(store->lastSaveOutcome().status.description(), "Could not serialize the accounts: No data came back");
}

TEST_F(SavingAccounts, LeavesNoTemporaryFileWhereAnythingThrows) {
  const Store store = load({properties("a")});
  for (const int operation : {1, 2, 3, 4}) {
    const Mishap throwing{.kind = Mishap::Kind::diesBefore, .operation = operation};
    device.changePlatform([&](platform::Platform& services) {
      services.files = std::make_shared<MishapFileSystem>(device.files, throwing, [] { throw std::bad_alloc{}; });
    });
    EXPECT_THROW(store->saveAllAccounts(), std::bad_alloc);
    EXPECT_TRUE(std::ranges::none_of(device.files->nodes, [](const auto& node) {
      return node.first.string().starts_with("/var/mobile/tmp/file");
    })) << operation;
  }
}

TEST_F(SavingAccounts, SavesDataThatCameWithAnErrorAndSaysTheError) {
  const Store store = load({properties("a")});
  store->allBasicAccounts()[0]->setAccountProperty_forKey(2, "Port");
  device.propertyLists->serializeError = "low on ink";
  AccountsManager::_setShouldSkipNotifications(true);
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a", {{"Port", 2}})}));
  EXPECT_EQ(messagesOf(kSave).back(), "Failed to serialize account settings data: low on ink");
  EXPECT_TRUE(store->lastSaveOutcome().isSaved());
}

TEST_F(SavingAccounts, SucceedsAfterAFailure) {
  const Store store = load({properties("a")});
  store->insertAccount(account("b"));
  device.files->failing = {"rename"};
  store->saveAllAccounts();
  device.files->failing.clear();
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("a"), properties("b")}));
}

TEST_F(SavingAccounts, LeavesAloneWhatSomebodyElseMadeAtTheProposedName) {
  const Store store = load({properties("a")});
  device.files->put("/var/mobile/tmp/file1", "somebody else's");
  store->saveAllAccounts();
  EXPECT_EQ(device.files->contents("/var/mobile/tmp/file1"), "somebody else's");
  EXPECT_EQ(messagesOf(kSave).back(), "Failed to save accounts to filesystem.");
}

}  // namespace
}  // namespace tests
