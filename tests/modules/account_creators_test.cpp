#include <gmock/gmock.h>

#include "tests/modules/module_device.h"

namespace tests {
namespace {

using accountsettings::AccountClassInfo;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

class AccountCreators : public ModuleDevice {
 protected:
  static std::shared_ptr<BasicAccount> account(const std::string& identifier = "A") {
    return BasicAccount::initWithProperties(
        {{"Type", "CalDAV"}, {"Class", "MobileCalDAVAccount"}, {"Identifier", identifier}});
  }
  void putFullCreator(const std::string& module, const std::string& className) {
    putCreators("CalDAV", Array{creator("FullAccount", module, className)});
  }
  void putSyncCreator(const std::string& module, const std::string& className) {
    putCreators("CalDAV", Array{creator("SyncAccount", module, className)});
  }
  static std::string fullAccountFailure() {
    return failureOf([] { account()->fullAccountUsingLoader(nullptr); });
  }
};

AccountClassInfo loaderThatAnswers(bool hasLoaded) {
  AccountClassInfo loader{"Loader"};
  loader.loadBundleForAccountWithProperties = [hasLoaded](const Dictionary& properties) {
    samples::journal().push_back("loader asked for " + properties.text("Identifier")->string());
    return hasLoaded;
  };
  return loader;
}

TEST_F(AccountCreators, MakeAnObjectOfTheClassForTheTypeWhereTheyNameOne) {
  putFullCreator("first_accounts", "CreatorByType");
  EXPECT_NE(account()->fullAccountUsingLoader(nullptr), nullptr);
  EXPECT_THAT(journal(), ElementsAre("opened first", "class for CalDAV", "init with A", "parent nothing"));
}

TEST_F(AccountCreators, MakeTheObjectThemselvesWhereTheyNameNoClass) {
  putFullCreator("first_accounts", "CreatorByRecord");
  EXPECT_NE(account()->fullAccountUsingLoader(nullptr), nullptr);
  EXPECT_THAT(journal(), ElementsAre("opened first", "account with A", "parent nothing"));
}

TEST_F(AccountCreators, GiveTheFullAccountItsRecordsParent) {
  putFullCreator("first_accounts", "CreatorByRecord");
  const auto child = account("C");
  child->setParentAccount(account("P"));
  child->fullAccountUsingLoader(nullptr);
  EXPECT_THAT(journal(), ElementsAre("opened first", "account with C", "parent P"));
}

TEST_F(AccountCreators, AreNotAskedAgainForAFullAccountThatIsThere) {
  putFullCreator("first_accounts", "CreatorByRecord");
  const auto record = account();
  const auto full = record->fullAccountUsingLoader(nullptr);
  journal();
  const auto loader = loaderThatAnswers(false);
  EXPECT_EQ(record->fullAccountUsingLoader(&loader), full);
  EXPECT_THAT(journal(), IsEmpty());
}

TEST_F(AccountCreators, OfTwoForOneTypeBothModulesAreOpenedAndTheSecondsClassIsUsed) {
  putCreators("CalDAV", Array{creator("FullAccount", "first_accounts", "CreatorByRecord"),
                              creator("FullAccount", "second_accounts", "OtherCreator")});
  account()->fullAccountUsingLoader(nullptr);
  EXPECT_THAT(journal(), ElementsAre("opened first", "opened second", "other account"));
}

TEST_F(AccountCreators, OfAnotherKindAreNotOpened) {
  putCreators("CalDAV", Array{creator("SyncAccount", "first_accounts", "SyncCreator"),
                              creator("FullAccount", "second_accounts", "OtherCreator")});
  account()->fullAccountUsingLoader(nullptr);
  EXPECT_THAT(journal(), ElementsAre("opened second", "other account"));
}

TEST_F(AccountCreators, OpenNoModuleThatALoaderHasOpened) {
  putFullCreator("first_accounts", "CreatorByRecord");
  const auto loader = loaderThatAnswers(true);
  EXPECT_EQ(failureOf([&] { account()->fullAccountUsingLoader(&loader); }),
            "The framework/bundle where CreatorByRecord is defined has not been loaded");
  EXPECT_THAT(journal(), ElementsAre("loader asked for A"));
}

TEST_F(AccountCreators, NeedNoPathForALoaderButAClass) {
  const auto details = without("Class", without("Framework", description("first_accounts", "")));
  putCreators("CalDAV", Array{Dictionary{{"Type", "FullAccount"}, {"Description", details}}});
  const auto loader = loaderThatAnswers(true);
  EXPECT_EQ(failureOf([&] { account()->fullAccountUsingLoader(&loader); }),
            "Malformed AccountCreators information. Could not find the name of the class that creates FullAccount with "
            "the type CalDAV");
}

TEST_F(AccountCreators, OpenTheModuleThatALoaderHasNotOpened) {
  putFullCreator("first_accounts", "CreatorByRecord");
  const auto loader = loaderThatAnswers(false);
  account()->fullAccountUsingLoader(&loader);
  EXPECT_THAT(journal(), ElementsAre("loader asked for A", "opened first", "account with A", "parent nothing"));
}

TEST_F(AccountCreators, AskNoLoaderForASyncAccount) {
  putSyncCreator("first_accounts", "SyncCreator");
  EXPECT_EQ(account()->syncAccountCreatorClassNameForAccountType("CalDAV"), "SyncCreator");
  EXPECT_THAT(journal(), ElementsAre("opened first"));
}

struct MalformedEntry {
  const char* name;
  Dictionary creators;
  const char* message;

  friend void PrintTo(const MalformedEntry& entry, std::ostream* stream) { *stream << entry.name; }
};

class MalformedCreators : public AccountCreators, public ::testing::WithParamInterface<MalformedEntry> {};

TEST_P(MalformedCreators, EndTheCallWithAnAssertionFailure) {
  device.put("/resources/AccountCreators.plist", GetParam().creators);
  EXPECT_EQ(fullAccountFailure(), std::string{"Malformed AccountCreators information. "} + GetParam().message);
}

INSTANTIATE_TEST_SUITE_P(
    Entries, MalformedCreators,
    ::testing::Values(
        MalformedEntry{"NoTypes", {}, "Could not find the information for the type CalDAV"},
        MalformedEntry{"OtherTypes",
                       {{"Mail", Array{creator("FullAccount", "first_accounts", "CreatorByRecord")}}},
                       "Could not find the information for the type CalDAV"},
        MalformedEntry{"NoDescription",
                       {{"CalDAV", Array{Dictionary{{"Type", "FullAccount"}}}}},
                       "Could not find the description for the FullAccount with type CalDAV"},
        MalformedEntry{
            "NoFramework",
            {{"CalDAV", Array{Dictionary{{"Type", "FullAccount"}, {"Description", Dictionary{{"Class", "X"}}}}}}},
            "Could not find the path to the framework for the FullAccount with type CalDAV"},
        MalformedEntry{"EmptyClass",
                       {{"CalDAV", Array{creator("FullAccount", "first_accounts", "")}}},
                       "Could not find the name of the class that creates FullAccount with the type CalDAV"},
        MalformedEntry{
            "NoClass",
            {{"CalDAV", Array{Dictionary{{"Type", "FullAccount"},
                                         {"Description", without("Class", description("first_accounts", ""))}}}}},
            "Could not find the name of the class that creates FullAccount with the type CalDAV"}),
    [](const auto& instance) { return std::string{instance.param.name}; });

TEST_F(AccountCreators, WithAnUnresolvedSymbolCannotBeOpened) {
  putFullCreator("unresolved_symbol", "UnresolvedCreator");
  const auto path = root() / "usr/lib/samples/unresolved_symbol.so";
  const auto message = fullAccountFailure();
  EXPECT_THAT(message, StartsWith("Could not load the account creator framework " + path.string() + ". Error "));
  EXPECT_THAT(message, HasSubstr("sample_symbol_that_nobody_defines"));
}

TEST_F(AccountCreators, ThatAreNotThereCannotBeOpened) {
  putFullCreator("missing", "CreatorByRecord");
  const auto path = root() / "usr/lib/samples/missing.so";
  EXPECT_THAT(fullAccountFailure(),
              StartsWith("Could not load the account creator framework " + path.string() + ". Error "));
}

struct UnfitClass {
  const char* module;
  const char* className;
  std::string message;

  friend void PrintTo(const UnfitClass& entry, std::ostream* stream) { *stream << entry.className; }
};

class UnfitCreators : public AccountCreators, public ::testing::WithParamInterface<UnfitClass> {};

TEST_P(UnfitCreators, MakeNoFullAccount) {
  putFullCreator(GetParam().module, GetParam().className);
  EXPECT_EQ(fullAccountFailure(), GetParam().message);
}

INSTANTIATE_TEST_SUITE_P(
    Classes, UnfitCreators,
    ::testing::Values(UnfitClass{"without_class", "AnyCreator",
                                 "The framework/bundle where AnyCreator is defined has not been loaded"},
                      UnfitClass{"first_accounts", "OtherCreator",
                                 "The framework/bundle where OtherCreator is defined has not been loaded"},
                      UnfitClass{"first_accounts", "CreatorWithoutOperations",
                                 "Could not create the account with class CreatorWithoutOperations and id A"},
                      UnfitClass{"first_accounts", "CreatorOfNothing",
                                 "Could not create the account with class CreatorOfNothing and id A"},
                      UnfitClass{"first_accounts", "CreatorOfNoClass",
                                 "Could not create the account with class CreatorOfNoClass and id A"}),
    [](const auto& instance) { return std::string{instance.param.module} + "_" + instance.param.className; });

TEST_F(AccountCreators, MakeTheSyncAccountOnce) {
  putSyncCreator("first_accounts", "SyncCreator");
  const auto record = account();
  const auto sync = record->_cachedSyncAccount();
  EXPECT_NE(sync, nullptr);
  EXPECT_EQ(record->_cachedSyncAccount(), sync);
  EXPECT_THAT(journal(), ElementsAre("opened first", "sync account for A"));
}

TEST_F(AccountCreators, PassRefreshesOnToTheSyncAccount) {
  putSyncCreator("first_accounts", "SyncCreator");
  const auto record = account();
  record->_cachedSyncAccount();
  journal();
  EXPECT_TRUE(record->refreshContainerWithIdentifier_forDataclass_isUserRequested("work", "Mail", true));
  EXPECT_TRUE(record->refreshContainerListForDataclass_isUserRequested("Mail", true));
  EXPECT_TRUE(record->refreshContainersForDataclass_isUserRequested("Mail", true));
  EXPECT_TRUE(record->refreshContainerWithIdentifier_forDataclass("work", "Mail"));
  EXPECT_TRUE(record->refreshContainerListForDataclass("Mail"));
  EXPECT_TRUE(record->refreshContainersForDataclass("Mail"));
  EXPECT_THAT(journal(), ElementsAre("refresh container work of Mail for a user", "refresh list of Mail for a user",
                                     "refresh containers of Mail for a user", "refresh container work of Mail",
                                     "refresh list of Mail", "refresh containers of Mail"));
}

TEST_F(AccountCreators, OfATypeWithoutSyncAccountsRefreshNothingAndLogNothing) {
  putFullCreator("first_accounts", "CreatorByRecord");
  EXPECT_FALSE(account()->refreshContainersForDataclass("Mail"));
  EXPECT_THAT(device.logMessages(), IsEmpty());
}

TEST_F(AccountCreators, WithoutTheClassOfSyncAccountsAreLogged) {
  putSyncCreator("without_class", "SyncCreator");
  EXPECT_FALSE(account()->refreshContainersForDataclass("Mail"));
  EXPECT_THAT(
      device.logMessages(),
      ElementsAre("ERROR: The framework/bundle where SyncCreator is defined has not been loaded, so there is no "
                  "syncable account for basic account with properties {Type = \"CalDAV\"; Class = "
                  "\"MobileCalDAVAccount\"; Identifier = \"A\"}"));
}

TEST_F(AccountCreators, ThatMakeNoSyncAccountAreLoggedAndAskedAgain) {
  putSyncCreator("first_accounts", "CreatorOfNothing");
  const auto record = account();
  EXPECT_EQ(record->_cachedSyncAccount(), nullptr);
  EXPECT_EQ(record->_cachedSyncAccount(), nullptr);
  const std::string line = "ERROR: Could not create the account with class CreatorOfNothing and id A";
  EXPECT_THAT(device.logMessages(), ElementsAre(line, line));
}

TEST_F(AccountCreators, WithoutTheOperationOfSyncAccountsAreLogged) {
  putSyncCreator("first_accounts", "CreatorWithoutOperations");
  EXPECT_EQ(account()->_cachedSyncAccount(), nullptr);
  EXPECT_THAT(device.logMessages(),
              ElementsAre("ERROR: Could not create the account with class CreatorWithoutOperations and id A"));
}

TEST_F(AccountCreators, AreAskedByTheStoreForFullAccountsOfATypeAndItsChildren) {
  putFullCreator("first_accounts", "CreatorByRecord");
  const Dictionary child{{"Type", "CalDAV"}, {"Class", "C"}, {"Identifier", "child"}};
  const auto store = AccountsManager::initWithAccounsInfoArray(
      {Dictionary{{"Type", "CalDAV"}, {"Class", "C"}, {"Identifier", "top"}, {"ChildAccounts", Array{child}}}});
  EXPECT_EQ(store->accountsWithTypes({"CalDAV"}).size(), 2U);
  EXPECT_THAT(journal(),
              ElementsAre("opened first", "account with top", "parent nothing", "account with child", "parent top"));
}

TEST_F(AccountCreators, AreNotNeededToRenewCredentials) {
  std::vector<int> answers;
  account()->renewAccountCredentialsWithHandler([&](int answer) { answers.push_back(answer); });
  EXPECT_THAT(answers, ElementsAre(3));
}

}  // namespace
}  // namespace tests
