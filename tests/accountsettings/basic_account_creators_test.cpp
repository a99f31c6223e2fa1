#include <gtest/gtest.h>

#include "accountsettings/basic_account.h"
#include "tests/support/account_configuration.h"
#include "tests/support/assertion_failures.h"

namespace accountsettings {
namespace {

using Strings = std::vector<std::string>;

class TestFullAccount final : public FullAccountObject {
 public:
  void setParentAccount(std::shared_ptr<BasicAccount> account) override { parent = std::move(account); }

  std::shared_ptr<BasicAccount> parent;
};

// Remembers each request, and answers with whether the user made it.
class TestSyncAccount final : public SyncAccountObject {
 public:
  bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                   std::string_view dataclass,
                                                                   bool isUserRequested) override {
    return note("container " + std::string{identifier} + " of " + std::string{dataclass}, isUserRequested);
  }
  bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override {
    return note("list of " + std::string{dataclass}, isUserRequested);
  }
  bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) override {
    return note("containers of " + std::string{dataclass}, isUserRequested);
  }

  Strings requests;

 private:
  bool note(const std::string& request, bool isUserRequested) {
    requests.push_back(request + (isUserRequested ? " by the user" : ""));
    return isUserRequested;
  }
};

Dictionary creator(std::string_view type, const Dictionary& description) {
  return {{"Type", type}, {"Description", description}};
}

Dictionary creator(std::string_view type, std::string_view framework, std::string_view className) {
  return creator(type, Dictionary{{"Framework", framework}, {"Class", className}});
}

class Creators : public testing::Test {
 protected:
  Creators() {
    tests::putAccountConfiguration(device);
    full->initWithProperties = [this](const Dictionary& properties) {
      madeFrom.push_back(properties);
      return std::make_shared<TestFullAccount>();
    };
    fullCreator->classForAccountType = [this](std::string_view type) {
      typesAsked.emplace_back(type);
      return full.get();
    };
    syncCreator->accountToRefreshForBasicAccount = [this](const std::shared_ptr<BasicAccount>& record) {
      accountsAsked.push_back(record.get());
      return syncAccount;
    };
    account = BasicAccount::accountWithProperties({{"Type", "Mail"}, {"Class", "X"}, {"Identifier", "A"}});
  }

  void put(const Array& entries) { device.put("/resources/AccountCreators.plist", Dictionary{{"Mail", entries}}); }

  AssertionFailure lookupFailure() {
    return tests::failureOf([this] {
      static_cast<void>(account->_creatorClassNameForAccountType_creatorType_loader("Mail", "FullAccount", nullptr));
    });
  }
  AssertionFailure fullAccountFailure() {
    return tests::failureOf([this] { account->fullAccountUsingLoader(nullptr); });
  }

  tests::FakeDevice device;
  std::shared_ptr<AccountClassInfo> full = std::make_shared<AccountClassInfo>("TestFull");
  std::shared_ptr<AccountClassInfo> fullCreator = std::make_shared<AccountClassInfo>("TestFullCreator");
  std::shared_ptr<AccountClassInfo> syncCreator = std::make_shared<AccountClassInfo>("TestSyncCreator");
  std::shared_ptr<TestSyncAccount> syncAccount = std::make_shared<TestSyncAccount>();
  platform::ClassRegistration fullRegistration{full};
  platform::ClassRegistration fullCreatorRegistration{fullCreator};
  platform::ClassRegistration syncCreatorRegistration{syncCreator};
  std::vector<Dictionary> madeFrom;
  Strings typesAsked;
  std::vector<BasicAccount*> accountsAsked;
  std::shared_ptr<BasicAccount> account;
};

// --- Finding a creator ---

TEST_F(Creators, AreLookedUpByCreatorTypeAndTheirModuleIsOpenedFromTheSystemRoot) {
  device.directories->root = "/image";
  put({creator("SyncAccount", "usr/lib/sync.so", "S"), creator("FullAccount", "usr/lib/full.so", "F")});
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountType_loader("Mail", nullptr), "F");
  EXPECT_EQ(account->syncAccountCreatorClassNameForAccountType("Mail"), "S");
  EXPECT_EQ(device.modules->opened, (Strings{"/image/usr/lib/full.so", "/image/usr/lib/sync.so"}));
}

TEST_F(Creators, OfWhichSeveralMatchAreAllOpenedAndTheLastOneCounts) {
  put({creator("FullAccount", "one.so", "F1"), creator("FullAccount", "two.so", "F2")});
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountType_loader("Mail", nullptr), "F2");
  EXPECT_EQ(device.modules->opened, (Strings{"/one.so", "/two.so"}));
}

TEST_F(Creators, OfWhichNoneMatchesHaveNoName) {
  put({creator("FullAccount", "one.so", "F1"), "odd", Dictionary{{"Type", 5}}, Dictionary{}});
  EXPECT_EQ(account->syncAccountCreatorClassNameForAccountType("Mail"), std::nullopt);
  EXPECT_TRUE(device.modules->opened.empty());
}

TEST_F(Creators, StayBelowTheSystemRootWithASlashAtTheFront) {
  device.directories->root = "/image";
  put({creator("FullAccount", "/usr/lib/full.so", "F")});
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountType_loader("Mail", nullptr), "F");
  EXPECT_EQ(device.modules->opened, Strings{"/image/usr/lib/full.so"});
}

TEST_F(Creators, FailWithoutEntriesForTheType) {
  EXPECT_EQ(lookupFailure().message(),
            "Malformed AccountCreators information. Could not find the information for the type Mail");
}

TEST_F(Creators, FailForAnAbsentTypeNamingItAsNothing) {
  put({creator("FullAccount", "one.so", "F1")});
  account->removeAccountPropertyForKey("Type");
  const std::string message =
      "Malformed AccountCreators information. Could not find the information for the type (null)";
  EXPECT_EQ(fullAccountFailure().message(), message);
  EXPECT_EQ(tests::failureOf([this] { account->_cachedSyncAccount(); }).message(), message);
}

TEST_F(Creators, FailWhereTheEntriesAreNoArray) {
  device.put("/resources/AccountCreators.plist", Dictionary{{"Mail", creator("FullAccount", "full.so", "F")}});
  EXPECT_EQ(lookupFailure().message(),
            "Malformed AccountCreators information. Could not find the information for the type Mail");
}

TEST_F(Creators, FailWithoutTheCreatorsFile) {
  device.files->nodes.erase("/resources/AccountCreators.plist");
  const AssertionFailure failure = lookupFailure();
  EXPECT_EQ(failure.message(),
            "Malformed AccountCreators information. Could not find the information for the type Mail");
  EXPECT_EQ(failure.method(), "-[BasicAccount _creatorClassNameForAccountType:creatorType:loader:]");
  EXPECT_EQ(failure.file(), "BasicAccount");
}

struct MalformedEntry {
  Dictionary entry;
  std::string_view missing;
};

class MalformedCreators : public Creators, public testing::WithParamInterface<MalformedEntry> {};

TEST_P(MalformedCreators, FailByWhatAMatchingEntryLacks) {
  put({GetParam().entry});
  EXPECT_EQ(lookupFailure().message(), "Malformed AccountCreators information. Could not find the " +
                                           std::string{GetParam().missing} + " type Mail");
}

constexpr std::string_view kDescription = "description for the FullAccount with";
constexpr std::string_view kFramework = "path to the framework for the FullAccount with";
constexpr std::string_view kClassName = "name of the class that creates FullAccount with the";

INSTANTIATE_TEST_SUITE_P(
    Entries, MalformedCreators,
    testing::Values(MalformedEntry{{{"Type", "FullAccount"}}, kDescription},
                    MalformedEntry{{{"Type", "FullAccount"}, {"Description", "odd"}}, kDescription},
                    MalformedEntry{creator("FullAccount", Dictionary{{"Class", "F"}}), kFramework},
                    MalformedEntry{creator("FullAccount", Dictionary{{"Class", "F"}, {"Framework", 5}}), kFramework},
                    MalformedEntry{creator("FullAccount", Dictionary{{"Framework", "full.so"}}), kClassName},
                    MalformedEntry{creator("FullAccount", Dictionary{{"Framework", "full.so"}, {"Class", 5}}),
                                   kClassName},
                    MalformedEntry{creator("FullAccount", "full.so", ""), kClassName}));

TEST_F(Creators, FailWithTheLoadersErrorWhereAModuleCannotBeOpened) {
  device.modules->errors["/full.so"] = "undefined symbol: nowhere";
  put({creator("FullAccount", "full.so", "F")});
  EXPECT_EQ(lookupFailure().message(),
            "Could not load the account creator framework /full.so. Error undefined symbol: nowhere");
}

TEST_F(Creators, FailWhereTheModulesPathHasNoASCIIForm) {
  put({creator("FullAccount", "caf\u00e9.so", "F")});
  EXPECT_EQ(lookupFailure().message(),
            "Could not load the account creator framework /caf\u00e9.so. Error the path is not ASCII");
  EXPECT_TRUE(device.modules->opened.empty());
}

// --- A loader of the caller's ---

class CreatorsWithLoader : public Creators {
 protected:
  CreatorsWithLoader() {
    loader.loadBundleForAccountWithProperties = [this](const Dictionary& properties) {
      offered.push_back(properties);
      return loads;
    };
  }

  AccountClassInfo loader{"TestLoader"};
  bool loads = true;
  std::vector<Dictionary> offered;
};

TEST_F(CreatorsWithLoader, OpenNoModuleWhereTheLoaderDoes) {
  put({creator("FullAccount", Dictionary{{"Class", "F"}})});
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountType_loader("Mail", &loader), "F");
  EXPECT_EQ(offered, std::vector<Dictionary>{account->properties()});
  EXPECT_TRUE(device.modules->opened.empty());
}

TEST_F(CreatorsWithLoader, NeedTheClassEvenSo) {
  put({creator("FullAccount", Dictionary{{"Framework", "full.so"}})});
  EXPECT_EQ(tests::failureOf([&] { account->fullAccountUsingLoader(&loader); }).message(),
            "Malformed AccountCreators information. Could not find the name of the class that creates FullAccount with "
            "the type Mail");
}

TEST_F(CreatorsWithLoader, OpenTheModuleWhereTheLoaderDoesNot) {
  loads = false;
  put({creator("FullAccount", "full.so", "F")});
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountType_loader("Mail", &loader), "F");
  EXPECT_EQ(device.modules->opened, Strings{"/full.so"});
}

TEST_F(CreatorsWithLoader, AskTheLoaderForFullAccountsOnly) {
  put({creator("SyncAccount", "sync.so", "S")});
  EXPECT_EQ(account->_creatorClassNameForAccountType_creatorType_loader("Mail", "SyncAccount", &loader), "S");
  EXPECT_TRUE(offered.empty());
  EXPECT_EQ(device.modules->opened, Strings{"/sync.so"});
}

TEST_F(CreatorsWithLoader, FailWhereTheLoadersClassLacksTheOperation) {
  put({creator("FullAccount", "full.so", "F")});
  const AccountClassInfo mute{"Mute"};
  EXPECT_EQ(tests::failureOf([&] { account->fullAccountUsingLoader(&mute); }).message(),
            "The loader Mute does not answer loadBundleForAccountWithProperties:");
}

TEST_F(CreatorsWithLoader, AreNotAskedAgainForAFullAccountThatIsThere) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  const auto made = account->fullAccountUsingLoader(&loader);
  device.propertyLists->reads.clear();
  EXPECT_EQ(account->fullAccountUsingLoader(&loader), made);
  EXPECT_EQ(offered.size(), 1U);
  EXPECT_TRUE(device.propertyLists->reads.empty());
}

// --- Full accounts ---

TEST_F(Creators, MakeTheFullAccountOfTheClassForItsType) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  const auto parent = BasicAccount::accountWithType_class("VorlixAccount", "X");
  account->setParentAccount(parent);
  const auto made = std::dynamic_pointer_cast<TestFullAccount>(account->fullAccountUsingLoader(nullptr));
  ASSERT_NE(made, nullptr);
  EXPECT_EQ(typesAsked, Strings{"Mail"});
  EXPECT_EQ(madeFrom, std::vector<Dictionary>{account->properties()});
  EXPECT_EQ(made->parent, parent);
}

TEST_F(Creators, MakeTheFullAccountFromTheRecordWhereTheClassHasNoClassForTheType) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  fullCreator->classForAccountType = nullptr;
  const auto made = std::make_shared<TestFullAccount>();
  fullCreator->accountWithBasicAccount = [&](const std::shared_ptr<BasicAccount>& record) {
    EXPECT_EQ(record, account);
    return made;
  };
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), made);
}

TEST_F(Creators, DoNotFallBackToTheRecordWhereTheClassForTheTypeIsNone) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  fullCreator->classForAccountType = [](std::string_view) { return nullptr; };
  fullCreator->accountWithBasicAccount = [](const auto&) { return std::make_shared<TestFullAccount>(); };
  EXPECT_EQ(fullAccountFailure().message(), "Could not create the account with class TestFullCreator and id A");
}

TEST_F(Creators, FailWhereTheFullAccountsClassIsNotDefined) {
  put({creator("FullAccount", "full.so", "Nowhere")});
  const AssertionFailure failure = fullAccountFailure();
  EXPECT_STREQ(failure.what(),
               "Assertion failure in -[BasicAccount fullAccountUsingLoader:], BasicAccount: The framework/bundle where "
               "Nowhere is defined has not been loaded");
}

TEST_F(Creators, FailWhereThereIsNoFullAccountEntry) {
  put({creator("SyncAccount", "sync.so", "S")});
  EXPECT_EQ(fullAccountFailure().message(), "The framework/bundle where (null) is defined has not been loaded");
}

TEST_F(Creators, FailWhereTheClassAnswersNeitherOperation) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  fullCreator->classForAccountType = nullptr;
  EXPECT_STREQ(
      fullAccountFailure().what(),
      "Assertion failure in -[BasicAccount fullAccountUsingLoader:], BasicAccount: Could not create the account "
      "with class TestFullCreator and id A");
}

TEST_F(Creators, FailWhereTheClassIsOfAnotherKindAltogether) {
  const platform::ClassRegistration other{std::make_shared<platform::ClassInfo>("Other")};
  put({creator("FullAccount", "full.so", "Other")});
  EXPECT_EQ(fullAccountFailure().message(), "Could not create the account with class Other and id A");
}

TEST_F(Creators, FailWhereTheClassMakesNoObject) {
  put({creator("FullAccount", "full.so", "TestFullCreator")});
  full->initWithProperties = [](const auto&) { return nullptr; };
  EXPECT_EQ(fullAccountFailure().message(), "Could not create the account with class TestFullCreator and id A");
  full->initWithProperties = nullptr;
  EXPECT_EQ(fullAccountFailure().message(), "Could not create the account with class TestFullCreator and id A");
}

TEST_F(Creators, LetTheFullAccountBeReplaced) {
  const auto first = std::make_shared<TestFullAccount>();
  const auto second = std::make_shared<TestFullAccount>();
  account->setFullAccount(first);
  account->setFullAccount(first);
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), first);
  account->setFullAccount(second);
  EXPECT_EQ(account->fullAccountUsingLoader(nullptr), second);
  EXPECT_EQ(first.use_count(), 1);
}

// --- Sync accounts ---

TEST_F(Creators, MakeTheSyncAccountOnceAndForwardEveryRefreshToIt) {
  put({creator("SyncAccount", "sync.so", "TestSyncCreator")});
  EXPECT_TRUE(account->refreshContainerWithIdentifier_forDataclass_isUserRequested("C", "D", true));
  EXPECT_FALSE(account->refreshContainerWithIdentifier_forDataclass("C", "D"));
  EXPECT_TRUE(account->refreshContainerListForDataclass_isUserRequested("D", true));
  EXPECT_FALSE(account->refreshContainerListForDataclass("D"));
  EXPECT_TRUE(account->refreshContainersForDataclass_isUserRequested("D", true));
  EXPECT_FALSE(account->refreshContainersForDataclass("D"));
  EXPECT_EQ(syncAccount->requests, (Strings{"container C of D by the user", "container C of D", "list of D by the user",
                                            "list of D", "containers of D by the user", "containers of D"}));
  EXPECT_EQ(accountsAsked, std::vector<BasicAccount*>{account.get()});
}

TEST_F(Creators, OfATypeWithoutSyncEntryRefreshNothingAndLogNothing) {
  put({creator("FullAccount", "full.so", "F")});
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_FALSE(account->refreshContainerWithIdentifier_forDataclass_isUserRequested("C", "D", true));
  EXPECT_FALSE(account->refreshContainerListForDataclass_isUserRequested("D", true));
  EXPECT_FALSE(account->refreshContainersForDataclass_isUserRequested("D", true));
  EXPECT_TRUE(device.outputs.empty());
}

TEST_F(Creators, LogASyncClassThatIsNotDefinedAndGoOn) {
  put({creator("SyncAccount", "sync.so", "Nowhere")});
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logMessages(),
            Strings{"ERROR: The framework/bundle where Nowhere is defined has not been loaded, so there is no syncable "
                    "account for basic account with properties {Type = \"Mail\"; Class = \"X\"; Identifier = \"A\"}"});
  EXPECT_EQ(device.systemLog->lines.at(0).method, "-[BasicAccount _cachedSyncAccount]");
}

TEST_F(Creators, LogASyncAccountThatIsNotMadeAndTryAgainAtTheNextCall) {
  put({creator("SyncAccount", "sync.so", "TestSyncCreator")});
  const auto later = std::exchange(syncAccount, nullptr);
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logMessages(), Strings{"ERROR: Could not create the account with class TestSyncCreator and id A"});
  syncAccount = later;
  EXPECT_EQ(account->_cachedSyncAccount(), later);
}

TEST_F(Creators, LogASyncClassThatLacksTheOperation) {
  put({creator("SyncAccount", "sync.so", "TestFull")});
  EXPECT_EQ(account->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(device.logMessages(), Strings{"ERROR: Could not create the account with class TestFull and id A"});
}

TEST_F(Creators, RaiseAMalformedSyncEntry) {
  put({creator("SyncAccount", Dictionary{{"Class", "S"}})});
  EXPECT_EQ(tests::failureOf([this] { account->refreshContainersForDataclass("D"); }).message(),
            "Malformed AccountCreators information. Could not find the path to the framework for the SyncAccount with "
            "type Mail");
}

TEST_F(Creators, AreNotNeededToSayThatCredentialsCannotBeRenewed) {
  std::vector<int> results;
  account->renewAccountCredentialsWithHandler([&results](int result) { results.push_back(result); });
  EXPECT_EQ(results, std::vector<int>{3});
}

}  // namespace
}  // namespace accountsettings
