#include "accountsettings/store_watch.h"

#include <stdexcept>

#include "tests/support/account_store.h"
#include "tests/support/fact_recorder.h"

namespace tests {
namespace {

using accountsettings::StoreWatch;
using platform::RunFact;
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
  EXPECT_EQ(recorder->facts[0], (RunFact{.kind = RunFact::Kind::loaded, .count = 2, .version = 3}));
}

TEST_F(WatchedStore, TellsByWhichRuleARecordIsLeftOut) {
  loadOutdated({"no dictionary", Dictionary{{"Identifier", "a"}, {"Class", "C"}},
                Dictionary{{"Identifier", "b"}, {"Type", "Odd"}}, Dictionary{{"Identifier", "c"}, {"Type", "Mail"}}});
  EXPECT_EQ(recorder->lines(), (Lines{"dropped (it is no account record)", "dropped a (it has no type)",
                                      "dropped b (its type is unknown: \"Odd\")", "dropped c (it has no class)"}));
}

TEST_F(WatchedStore, TellsOfRepairsWhileLoading) {
  loadOutdated({properties("a", {{"AccountPath", "Mail/IMAP-x"}}, "Mail"), properties("b", {}, "Mail")});
  EXPECT_EQ(recorder->lines(),
            (Lines{"changed a: Class \"TestAccount\" -> \"IMAPAccount\"",
                   "dropped b (the mail application does not know its class, and its AccountPath names none)"}));
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
  store->_tellChanges();
  store->_tellChanges();
  EXPECT_EQ(recorder->lines(), (Lines{"changed a: +Port 2", "added c", "dropped b (it was deleted)"}));
}

TEST_F(WatchedStore, TellsWhyAccountsOfAReplacedTypeWent) {
  const Store store = loadOutdated({properties("a", {}, "SMTP"), properties("b", {}, "SMTP")});
  store->replaceAccountsWithTypes_withAccounts({"SMTP"}, {account("b", {{"Port", 2}}, "SMTP")});
  store->_tellChanges();
  EXPECT_EQ(recorder->lines(),
            (Lines{"changed b: +Port 2",
                   "dropped a (the accounts of its type were replaced, and it is none of the new ones)"}));
}

TEST_F(WatchedStore, TellsIntoWhichAccountsOneWasFolded) {
  const Store store = loadOutdated({properties("a"), properties("b"), properties("c")});
  const Account folded = store->accountWithIdentifier("a");
  for (const std::string_view into : {"b", "c"}) {
    store->_runWatch()->willBeFolded(*folded, *store->accountWithIdentifier(into), "the same user");
  }
  store->deleteAccount(folded);
  store->_tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"folded a into b into c (the same user)"});
}

TEST_F(WatchedStore, TellsFromWhatAnAccountWasConverted) {
  const Store store = loadOutdated({});
  const Account made = account("a");
  store->_runWatch()->comesFrom(*made, {{"uniqueId", "a"}, {"Class", "TestAccount"}}, "MailAccounts[0]");
  store->insertAccount(made);
  store->_tellChanges();
  EXPECT_EQ(recorder->lines(), Lines{"converted a: uniqueId now Identifier \"a\", +Type \"CalDAV\" (MailAccounts[0])"});
}

TEST_F(WatchedStore, TellsOfASaveAndWhatStageItsChangesBelongTo) {
  const Store store = loadOutdated({properties("a", {{"AccountPath", "Mail/POP-x"}})});
  const Account late = account("b", {{"AccountPath", "Mail/POP-x"}}, "Mail");
  store->insertAccount(late);
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), (Lines{"added b", "changed b: Class \"TestAccount\" -> \"POPAccount\""}));
  EXPECT_EQ(recorder->stages, (Lines{"", "", "save", "save"}));
  EXPECT_EQ(
      recorder->facts.back(),
      (RunFact{.kind = RunFact::Kind::saved, .path = kSettingsFile.string(), .count = 2, .version = kCurrentVersion}));
}

TEST_F(WatchedStore, TellsWhyASaveFailed) {
  const Store store = loadOutdated({properties("a")});
  device.files->failing.insert("rename");
  store->saveAllAccounts();
  EXPECT_EQ(recorder->facts.back().kind, RunFact::Kind::saveFailed);
  EXPECT_TRUE(recorder->facts.back().reason.starts_with("Could not rename ")) << recorder->facts.back().reason;
}

TEST_F(WatchedStore, TellsOnceOfWhatEverySaveDoes) {
  const Store store = loadOutdated({});
  store->insertAccount(account("a", {}, "Mail"));
  store->saveAllAccounts();
  store->saveAllAccounts();
  EXPECT_EQ(
      recorder->lines(),
      (Lines{"added a", "kept a (the mail application does not know its class, and its AccountPath names none)"}));
}

TEST_F(WatchedStore, TellsWhatTheFileKeptOfAnAccountThatSomebodyElseChanged) {
  const Store store = loadOutdated({properties("a", {{"Port", 1}})});
  putFile({properties("a", {{"Port", 2}})});
  store->saveAllAccounts();
  EXPECT_EQ(recorder->lines(), Lines{"changed a: Port 1 -> 2"});
}

TEST_F(WatchedStore, IsWatchedByNobodyWhereNobodyWantsFacts) {
  const std::size_t before = StoreWatch::statesTaken();
  recorder->isWanted = false;
  for (const auto& observer : {std::shared_ptr<platform::RunObserver>{recorder}, {}}) {
    device.setObserver(observer);
    const Store store = loadOutdated({properties("a")});
    store->insertAccount(account("b"));
    store->saveAllAccounts();
    EXPECT_EQ(store->_runWatch(), nullptr);
  }
  EXPECT_EQ(StoreWatch::statesTaken(), before);
  EXPECT_TRUE(recorder->facts.empty());
}

class FailingObserver final : public platform::RunObserver {
 public:
  int calls = 0;
  void stageBegan(std::string_view) override {}
  void stageEnded(std::string_view) override {}
  [[nodiscard]] bool wantsFacts() const override { return true; }
  void told(const RunFact&) override {
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
}

}  // namespace
}  // namespace tests
