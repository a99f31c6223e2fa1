#include "accountsettings/change_tracker.h"

#include <stdexcept>

#include "platform/run_observer.h"
#include "tests/support/account_store.h"
#include "tests/support/fact_recorder.h"

namespace tests {
namespace {

using accountsettings::ChangeTracker;
using Lines = std::vector<std::string>;

class WatchedStore : public AccountStore {
 protected:
  WatchedStore() { device.setObserver(recorder); }

  Store loadOutdated(const Array& accounts) {
    putFile(accounts, 3);
    return AccountsManager::initInsideOfMigration();
  }

  std::shared_ptr<FactRecorder> recorder = std::make_shared<FactRecorder>();
};

TEST_F(WatchedStore, TellsHowManyAccountsOfWhichVersionWereLoaded) {
  loadOutdated({properties("a"), properties("b")});
  ASSERT_EQ(recorder->facts.size(), 1U);
  EXPECT_EQ(recorder->facts[0], (records::Fact{records::Loaded{2, 3}}));
}

TEST_F(WatchedStore, TellsOfVersionZeroWhereTheFileSaysNone) {
  device.put(kSettingsFile, Dictionary{{"Accounts", Array{}}});
  AccountsManager::initInsideOfMigration();
  EXPECT_EQ(recorder->facts, std::vector<records::Fact>{(records::Loaded{0, 0})});
}

TEST_F(WatchedStore, TellsNothingElseOfAFileOfTheCurrentVersion) {
  load({properties("a")});
  EXPECT_EQ(recorder->facts, std::vector<records::Fact>{(records::Loaded{1, accountsettings::kCurrentVersion})});
}

TEST_F(WatchedStore, TellsOfAFileThatStandsThereAndCannotBeRead) {
  device.files->put(kSettingsFile, "no property list");
  AccountsManager::initInsideOfMigration();
  ASSERT_FALSE(recorder->facts.empty());
  const auto* const lost = std::get_if<records::Lost>(recorder->facts.data());
  ASSERT_NE(lost, nullptr);
  EXPECT_EQ(lost->code, records::LossCode::unreadableSettingsFile);
  EXPECT_EQ(lost->detail, "it is no property list");
}

TEST_F(WatchedStore, TellsNoSuchThingWhereThereIsNoFile) {
  AccountsManager::initInsideOfMigration();
  EXPECT_TRUE(recorder->lines().empty());
}

TEST_F(WatchedStore, TellsByWhichRuleARecordIsLeftOut) {
  loadOutdated({"no dictionary", Dictionary{{"Identifier", "a"}, {"Class", "C"}},
                Dictionary{{"Identifier", "b"}, {"Type", "Odd"}}, Dictionary{{"Identifier", "c"}, {"Type", "Mail"}}});
  EXPECT_EQ(recorder->lines(), (Lines{"lost (dropped-no-record)", "lost a (dropped-no-type)",
                                      "lost b (dropped-unknown-type: \"Odd\")", "lost c (dropped-no-class)"}));
}

TEST_F(WatchedStore, TellsOfRepairsWhileLoading) {
  loadOutdated({properties("a", {{"AccountPath", "Mail/IMAP-x"}}, "Mail"), properties("b", {}, "Mail")});
  EXPECT_EQ(recorder->lines(),
            (Lines{"changed a: Class \"TestAccount\" -> \"IMAPAccount\"", "lost b (dropped-unknown-class)"}));
}

TEST_F(WatchedStore, TellsOfAnIdentifierThatARecordIsGiven) {
  loadOutdated({Dictionary{{"Type", "CalDAV"}, {"Class", "C"}}});
  const std::string made = "00000000-0000-4000-8000-000000000001";
  EXPECT_EQ(recorder->lines(),
            Lines{"changed " + made + ": +Identifier \"" + made + "\", +Sync Identifier \"" + made + "\""});
}

TEST_F(WatchedStore, TellsWhatBecameOfTheAccountsWhenItIsLookedAt) {
  const Store store = loadOutdated({properties("a"), properties("b")});
  store->accountWithIdentifier("a")->setAccountProperty_forKey(2, "Port");
  store->deleteAccountWithIdentifier("b");
  store->insertAccount(account("c"));
  store->tellChanges();
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"changed a: +Port 2", "added c", "lost b (deleted)"}));
}

TEST_F(WatchedStore, TellsWhyAccountsOfAReplacedTypeWent) {
  const Store store = loadOutdated({properties("a", {}, "SMTP"), properties("b", {}, "SMTP")});
  store->replaceAccountsWithTypes_withAccounts({"SMTP"}, {account("b", {{"Port", 2}}, "SMTP")});
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"changed b: +Port 2", "lost a (replaced-with-type)"}));
}

TEST_F(WatchedStore, TellsOfAnAccountThatAnotherOneWasPutInThePlaceOf) {
  const Store store = loadOutdated({properties("a"), properties("b")});
  store->replaceAccount_withAccount(store->accountWithIdentifier("a"), account("c"));
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"added c", "lost a (replaced)"}));
}

TEST_F(WatchedStore, TellsAnewWhyAnAccountWentThatWentBeforeAndCameAgain) {
  const Store store = loadOutdated({properties("a", {}, "SMTP")});
  const Account comesAgain = store->accountWithIdentifier("a");
  store->replaceAccountsWithTypes_withAccounts({"SMTP"}, {});
  store->tellChanges();
  store->insertAccount(comesAgain);
  store->tellChanges();
  store->deleteAccountWithIdentifier("a");
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"lost a (replaced-with-type)", "added a", "lost a (deleted)"}));
}

TEST_F(WatchedStore, TellsIntoWhichAccountsOneWasFolded) {
  const Store store = loadOutdated({properties("a"), properties("b"), properties("c")});
  const Account folded = store->accountWithIdentifier("a");
  for (const std::string_view into : {"b", "c"}) {
    store->changeTracker()->willBeFolded(*folded, *store->accountWithIdentifier(into), "the same user");
  }
  store->deleteAccount(folded);
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"folded a into b into c (the same user)"});
}

TEST_F(WatchedStore, TellsFromWhatAnAccountWasConverted) {
  const Store store = loadOutdated({});
  const Account made = account("a");
  store->changeTracker()->comesFrom(*made, {{"uniqueId", "a"}, {"Class", "TestAccount"}}, "MailAccounts[0]", "/mail");
  store->insertAccount(made);
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"converted a: uniqueId now Identifier \"a\", +Type \"CalDAV\" (MailAccounts[0])"});
}

TEST_F(WatchedStore, TellsWhichAccountAConvertedOneReplaces) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}})});
  const Account made = account("a", {{"Port", 2}});
  store->changeTracker()->comesFrom(*made, {{"uniqueId", "a"}}, "MailAccounts[0]", "/mail");
  store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, {made});
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"converted a: Port 1 -> 2 (MailAccounts[0], replacing)"});
}

TEST_F(WatchedStore, TellsThatAConvertedAccountWasAChildBefore) {
  const Store store = loadOutdated({properties("p", {{"ChildAccounts", Array{properties("c")}}})});
  const Account made = account("c");
  store->changeTracker()->comesFrom(*made, {{"uniqueId", "c"}}, "MailAccounts[0]", "/mail");
  store->accountWithIdentifier("p")->removeAccountPropertyForKey("ChildAccounts");
  store->insertAccount(made);
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"moved c", "converted c (MailAccounts[0], replacing)"}));
}

TEST_F(WatchedStore, TellsOfAnAccountThatWasConvertedAndWentBeforeAnybodyLooked) {
  const Store store = loadOutdated({});
  const Account replaced = account("a");
  const Account neverStored = account("b");
  store->changeTracker()->comesFrom(*replaced, {}, "MailAccounts[0]", "/mail");
  store->changeTracker()->comesFrom(*neverStored, {}, "MailAccounts[1]", "/mail");
  store->insertAccount(replaced);
  store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, {});
  store->tellChanges();
  store->tellChanges();
  EXPECT_EQ(recorder->lines(),
            (Lines{"lost a (replaced-with-type: MailAccounts[0])", "lost b (removed: MailAccounts[1])"}));
}

TEST_F(WatchedStore, TellsOfASaveAndWhatStageItsChangesBelongTo) {
  const Store store = loadOutdated({properties("a", {{"AccountPath", "Mail/POP-x"}})});
  const Account late = account("b", {{"AccountPath", "Mail/POP-x"}}, "Mail");
  store->insertAccount(late);
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), (Lines{"added b", "changed b: Class \"TestAccount\" -> \"POPAccount\""}));
  EXPECT_EQ(recorder->stages, (Lines{"", "", "save", "save"}));
  EXPECT_EQ(recorder->facts.back(),
            (records::Fact{records::Saved{kSettingsFile.string(), 2, accountsettings::kCurrentVersion}}));
}

TEST_F(WatchedStore, TellsWhyASaveFailed) {
  const Store store = loadOutdated({properties("a")});
  device.files->failing.insert("rename");
  store->saveAllAccounts();
  const auto& failed = std::get<records::SaveFailed>(recorder->facts.back());
  EXPECT_TRUE(failed.cause.starts_with("Could not rename ")) << failed.cause;
}

TEST_F(WatchedStore, TellsOnceOfWhatEverySaveDoes) {
  const Store store = loadOutdated({});
  store->insertAccount(account("a", {}, "Mail"));
  store->saveAllAccounts();
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), (Lines{"added a", "kept a (its class is unknown and no directory tells a better one)"}));
}

TEST_F(WatchedStore, TellsWhatTheFileKeptOfAnAccountThatSomebodyElseChanged) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}})});
  putFile({properties("a", {{"Port", 2}})});
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), Lines{"changed a: Port 1 -> 2"});
}

TEST_F(WatchedStore, TellsAtEachSaveWhatThatOneDoesOtherwiseThanTheLast) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}})});
  for (const int port : {2, 3, 3}) {
    putFile({properties("a", {{"Port", port}})});
    store->saveAllAccounts();
  }
  EXPECT_EQ(recorder->lines(), (Lines{"changed a: Port 1 -> 2", "changed a: Port 1 -> 3"}));
}

TEST_F(WatchedStore, TellsWhatTheFileKeptOfEachOfSeveralAccounts) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}}), properties("b", {{"Port", 1}})});
  putFile({properties("a", {{"Port", 2}}), properties("b", {{"Port", 3}})});
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), (Lines{"changed a: Port 1 -> 2", "changed b: Port 1 -> 3"}));
}

TEST_F(WatchedStore, TellsOfAChildThatIsTakenFromItsParent) {
  const Store store = loadOutdated({properties("p", {{"ChildAccounts", Array{properties("c")}}})});
  store->removeChildWithIdentifier_fromAccount("c", store->allBasicAccounts()[0]);
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"lost c in p (removed-from-parent)"});
}

TEST_F(WatchedStore, TellsNothingOfAnAccountThatAnEqualOneIsPutInThePlaceOf) {
  const Store store = loadOutdated({properties("a")});
  store->replaceAccount_withAccount(store->allBasicAccounts()[0], account("a"));
  store->tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{});
}

TEST_F(WatchedStore, TellsNothingAgainOfAnAccountWhenOneBeforeItHasNothingToTell) {
  const auto records = [](int portOfA, int portOfB) {
    return Array{properties("a", {{"Port", portOfA}}), properties("b", {{"Port", portOfB}})};
  };
  const Store store = loadOutdated(records(1, 1));
  for (const int portOfA : {2, 1}) {
    putFile(records(portOfA, 2));
    store->saveAllAccounts();
  }
  EXPECT_EQ(recorder->lines(), (Lines{"changed a: Port 1 -> 2", "changed b: Port 1 -> 2"}));
}

TEST_F(WatchedStore, TellsOfARecordThatAnotherOneWithItsIdentifierReplaces) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}}), properties("a", {{"Port", 2}})});
  store->saveAllAccounts();
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), Lines{"lost a (replaced-duplicate)"});
}

TEST_F(WatchedStore, TellsOfAnAccountThatItsParentsRecordReplaces) {
  const Store store = loadOutdated({properties("p", {{"ChildAccounts", Array{properties("c")}}})});
  store->insertAccount(account("c"));
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines().back(), "lost c (replaced-duplicate)");
}

TEST_F(WatchedStore, TellsOfNoLossWhereTwoRecordsAreAlike) {
  loadOutdated({properties("a"), properties("a")})->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), Lines{});
}

TEST_F(WatchedStore, TellsThatAFileIsOfANewerVersion) {
  putFile({properties("a")}, static_cast<std::int64_t>(AccountsManager::currentVersion()) + 1);
  AccountsManager::initInsideOfMigration();
  const std::string newer = std::to_string(AccountsManager::currentVersion() + 1);
  EXPECT_EQ(recorder->lines(), Lines{"lost (newer-settings-file: version " + newer + ")"});
}

// Hears of stages and wants no facts.
class StageObserver final : public platform::RunObserver {
 public:
  void stageBegan(std::string_view, std::string_view) override {}
  void stageEnded(std::string_view) override {}
};

TEST_F(WatchedStore, IsWatchedByNobodyWhereNobodyWantsFacts) {
  const std::size_t before = ChangeTracker::statesTaken();
  for (const auto& observer : {std::shared_ptr<platform::RunObserver>{std::make_shared<StageObserver>()}, {}}) {
    device.setObserver(observer);
    const Store store = loadOutdated({properties("a")});
    store->insertAccount(account("b"));
    store->saveAllAccounts();
    EXPECT_EQ(store->changeTracker(), nullptr);
  }
  EXPECT_EQ(ChangeTracker::statesTaken(), before);
  device.setObserver(recorder);
  loadOutdated({});
  EXPECT_EQ(ChangeTracker::statesTaken(), before + 1);
}

class FailingObserver final : public records::FactObserver {
 public:
  int calls = 0;
  bool hasLostTrack = false;
  void stageBegan(std::string_view, std::string_view) override {}
  void stageEnded(std::string_view) override {}
  void lostTrack() noexcept override { hasLostTrack = true; }
  void told(const records::Fact&) override {
    ++calls;
    throw std::runtime_error{"observer"};
  }
};

TEST_F(WatchedStore, IsAsItWouldBeWithAnObserverThatFails) {
  const auto failing = std::make_shared<FailingObserver>();
  device.setObserver(failing);
  const Store store = loadOutdated({properties("a")});
  store->insertAccount(account("b"));
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts().size(), 2U);
  EXPECT_EQ(failing->calls, 1);
  EXPECT_TRUE(failing->hasLostTrack);
}

}  // namespace
}  // namespace tests
