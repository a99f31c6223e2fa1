#include <gtest/gtest.h>

#include "accountsettings/assertion_failure.h"
#include "accountsettings/device_local_account.h"
#include "tests/support/account_store.h"

namespace tests {
namespace {

using accountsettings::AccountClassInfo;
using accountsettings::AssertionFailure;
using accountsettings::BasicAccount;
using accountsettings::FullAccountObject;
using Lines = std::vector<std::string>;

class LookingUpAccounts : public AccountStore {
 protected:
  static Dictionary parent(std::string_view identifier, Array children) {
    return properties(identifier, {{"ChildAccounts", std::move(children)}});
  }
};

TEST_F(LookingUpAccounts, FindsTheParentForAChildsIdentifier) {
  const Store store = load({properties("a"), parent("p", {properties("c")})});
  const Account found = store->allBasicAccounts()[1];
  EXPECT_EQ(store->accountWithIdentifier("c"), found);
  EXPECT_EQ(store->accountWithIdentifier("p"), found);
  EXPECT_EQ(store->accountWithIdentifier("nobody"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier(""), nullptr);
}

TEST_F(LookingUpAccounts, FindsNobodyForAChildWhoseParentIsGone) {
  const Store store = load({parent("p", {properties("c")})});
  store->allBasicAccounts()[0]->setAccountProperty_forKey("renamed", "Identifier");
  store->insertAccount(account("q"));
  store->replaceAccountsWithTypes_withAccounts({}, {});  // registers the account under its new identifier only
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"renamed", "q", "c"}));
}

TEST_F(LookingUpAccounts, GivesEachChildItsParentAndIndexesOneLevelOnly) {
  const Store store = load({parent("p", {parent("c", {properties("grandchild")})})});
  const Accounts all = store->allBasicSyncableAccounts();
  EXPECT_EQ(identifiersOf(all), (Lines{"p", "c"}));
  EXPECT_EQ(all[1]->parentAccount(), all[0]);
}

TEST_F(LookingUpAccounts, KeepsTheLaterOfTwoChildrenWithOneIdentifierUnderItsLaterParent) {
  const Store store =
      load({parent("p", {properties("c", {{"Port", 1}})}), parent("q", {properties("c", {{"Port", 2}})})});
  const Accounts all = store->allBasicSyncableAccounts();
  EXPECT_EQ(identifiersOf(all), (Lines{"p", "q", "c"}));
  EXPECT_EQ(all[2]->accountPropertyForKey("Port"), PropertyValue{2});
  EXPECT_EQ(store->accountWithIdentifier("c"), all[1]);
  store->_removeChildrenForAccountWithIdentifier("p");
  EXPECT_EQ(store->accountWithIdentifier("c"), all[1]);
}

TEST_F(LookingUpAccounts, LetsCallersKeepAChildThatTheIndexDrops) {
  const Store store = load({parent("p", {properties("c")})});
  const Account child = store->allBasicSyncableAccounts()[1];
  store->_removeChildrenForAccountWithIdentifier("p");
  EXPECT_EQ(store->allBasicSyncableAccounts().size(), 1U);
  EXPECT_EQ(child->identifier(), Text{"c"});
}

TEST_F(LookingUpAccounts, ForgetsEveryChildOfAParent) {
  const Store store = load({parent("p", {properties("c"), properties("d")}), parent("q", {properties("e")})});
  store->_removeChildrenForAccountWithIdentifier("p");
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"p", "q", "e"}));
}

TEST_F(LookingUpAccounts, SaysWhichChildrenItIgnores) {
  const Store store = load({parent("p", {Dictionary{{"Identifier", "c"}, {"Type", "CalDAV"}}, "no dictionary"})});
  EXPECT_EQ(messagesOf("-[AccountsManager _loadChildrenFromAccount:]"),
            (Lines{"Ignoring unknown child account with properties {Identifier = \"c\"; Type = \"CalDAV\"}",
                   "Ignoring unknown child account with properties no dictionary"}));
}

TEST_F(LookingUpAccounts, IndexesAChildForWhichNoIdentifierCanBeMadeUnderTheOneItsParentGivesIt) {
  device.identifiers->canMake = false;
  const Store store = load({parent("p", {Dictionary{{"Type", "CalDAV"}, {"Class", "TestAccount"}}})});
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"p", "p"}));
  EXPECT_EQ(store->accountWithIdentifier("p"), store->allBasicAccounts()[0]);
  store->deleteAccountWithIdentifier("p");
  EXPECT_TRUE(store->allBasicSyncableAccounts().empty());
}

TEST_F(LookingUpAccounts, IndexesTheChildrenOfAnAccountThatHasLostItsIdentifier) {
  const Store store = load({parent("p", {})});
  const Account nameless = store->allBasicAccounts()[0];
  nameless->removeAccountPropertyForKey("Identifier");
  store->addChild_toAccount(account("c"), nameless);
  const Accounts all = store->allBasicSyncableAccounts();
  EXPECT_EQ(identifiersOf(all), (Lines{"(none)", "c"}));
  EXPECT_EQ(all[1]->parentAccount(), nameless);
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
}

TEST_F(LookingUpAccounts, SaysWhichChildrenItIgnoresOfAnAccountThatHasLostItsIdentifier) {
  const Store store = load({parent("p", {})});
  const Account nameless = store->allBasicAccounts()[0];
  nameless->removeAccountPropertyForKey("Identifier");
  nameless->setAccountProperty_forKey(Array{"no dictionary"}, "ChildAccounts");
  store->_loadChildrenFromAccount(nameless);
  EXPECT_EQ(messagesOf("-[AccountsManager _loadChildrenFromAccount:]"),
            Lines{"Ignoring unknown child account with properties no dictionary"});
}

TEST_F(LookingUpAccounts, TakesAChildFromTheParentThatItHadWhereTheLaterOneHasNoIdentifier) {
  const Store store = load({parent("p", {properties("c")}), parent("q", {})});
  const Account nameless = store->allBasicAccounts()[1];
  nameless->removeAccountPropertyForKey("Identifier");
  store->addChild_toAccount(account("c"), nameless);
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
  store->deleteAccountWithIdentifier("p");
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"(none)", "c"}));
}

TEST_F(LookingUpAccounts, TakesChildrenThatAreNoArrayForNone) {
  EXPECT_EQ(load({properties("p", {{"ChildAccounts", "text"}})})->allBasicSyncableAccounts().size(), 1U);
}

TEST_F(LookingUpAccounts, PrefersATopLevelAccountOfASyncStoreToAChild) {
  const auto syncing = [](const char* identifier, Array children) {
    return properties(identifier, {{"Sync Identifier", "s"}, {"ChildAccounts", std::move(children)}});
  };
  const Dictionary child = properties("c", {{"Sync Identifier", "s"}});
  const Store store = load({parent("p", {child}), syncing("q", {})});
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("s"), store->accountWithIdentifier("q"));
  store->deleteAccountWithIdentifier("q");
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("s"), store->allBasicSyncableAccounts()[1]);
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("t"), nullptr);
}

TEST_F(LookingUpAccounts, ShowsTheParentOfASyncStoresChild) {
  const Store store = load({parent("p", {properties("c", {{"Sync Identifier", "s"}})})});
  EXPECT_EQ(store->displayAccountWithSyncIdentifier("s"), store->accountWithIdentifier("p"));
  EXPECT_EQ(store->displayAccountWithSyncIdentifier("t"), nullptr);
}

TEST_F(LookingUpAccounts, FiltersTopLevelAccountsByTypeInOrder) {
  const Store store = load({properties("a", {}, "CalDAV"), properties("b", {}, "LDAP"),
                            properties("p", {{"ChildAccounts", Array{properties("c", {}, "CalDAV")}}}, "Exchange"),
                            properties("d", {}, "CalDAV")});
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({"CalDAV", "LDAP"})), (Lines{"a", "b", "d"}));
  EXPECT_EQ(store->countOfBasicAccountsWithTypes({"CalDAV"}), 2U);
  EXPECT_TRUE(store->basicAccountsWithTypes({"caldav"}).empty());
  EXPECT_EQ(store->countOfBasicAccountsWithTypes({}), 0U);
  EXPECT_EQ(store->count(), 4U);
}

TEST_F(LookingUpAccounts, TakesAnAccountThatHasLostItsTypeForOneOfNone) {
  const Store store = load({properties("a"), properties("b")});
  store->allBasicAccounts()[0]->_forcedSetAccountProperty_forKey(5, "Type");
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({"CalDAV"})), Lines{"b"});
  store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, {});
  EXPECT_EQ(identifiersOf(store->allBasicAccounts()), Lines{"a"});
}

TEST_F(LookingUpAccounts, HandsOutTheLiveOrder) {
  const Store store = load({});
  const Accounts& live = store->allBasicAccounts();
  store->insertAccount(account("a"));
  EXPECT_EQ(identifiersOf(live), (Lines{"a"}));
}

TEST_F(LookingUpAccounts, NamesTheGroupOfSubscribedCalendarsOnly) {
  device.strings->texts = {
      {{"AccountsManager", "SUBSCRIBED_CALENDAR_GROUP_TITLE"}, "Subscribed Calendars"},
      {{"AccountsManager", "SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE"}, "subscribed calendars"}};
  const auto name = AccountsManager::displayNameForGroupOfAccountType_forBeginningOfSentence;
  EXPECT_EQ(name("Subscribed Calendar", true), "Subscribed Calendars");
  EXPECT_EQ(name("Subscribed Calendar", false), "subscribed calendars");
  EXPECT_EQ(name("CalDAV", true), std::nullopt);
}

TEST_F(LookingUpAccounts, NamesTheGroupByTheEmptyTextWhereTheTableLacksIt) {
  EXPECT_EQ(AccountsManager::displayNameForGroupOfAccountType_forBeginningOfSentence("Subscribed Calendar", true), "");
}

// Full accounts that tell whose they are.
class LookingUpFullAccounts : public AccountStore {
 protected:
  LookingUpFullAccounts() {
    const Array creators{Dictionary{
        {"Type", "FullAccount"}, {"Description", Dictionary{{"Framework", "Modules/Test"}, {"Class", "TestCreator"}}}}};
    Dictionary table;
    for (const auto& [type, ignored] : accountTypesProperties()) table.set(type, creators);
    device.put("/resources/AccountCreators.plist", table);
  }

  static Array family() {
    return {
        properties("p", {{"ChildAccounts", Array{properties("c", {}, "CalDAV"), properties("m", {}, "KeldorIMAP")}}},
                   "VorlixAccount"),
        properties("a", {}, "CalDAV")};
  }
  [[nodiscard]] static Lines identifiersOfFull(const std::vector<std::shared_ptr<FullAccountObject>>& accounts) {
    Lines identifiers;
    for (const auto& each : accounts) {
      identifiers.push_back(dynamic_cast<const Full&>(*each).account.lock()->identifier()->string());
    }
    return identifiers;
  }

  struct Full final : FullAccountObject {
    explicit Full(const std::shared_ptr<BasicAccount>& of) : account{of} {}
    void setParentAccount(std::shared_ptr<BasicAccount> /*parent*/) override {}
    std::weak_ptr<BasicAccount> account;  // the record owns its full account
  };

  // A loader that says whether it was asked.
  AccountClassInfo loader{"TestLoader"};
  int askedLoader = 0;

 private:
  static std::shared_ptr<AccountClassInfo> creator() {
    auto info = std::make_shared<AccountClassInfo>("TestCreator");
    info->accountWithBasicAccount = [](const std::shared_ptr<BasicAccount>& account) {
      return std::make_shared<Full>(account);
    };
    return info;
  }
  platform::ClassRegistration _creator{creator()};
};

TEST_F(LookingUpFullAccounts, FindsTopLevelAccountsAndChildrenByIdentifier) {
  const Store store = load(family());
  const auto found = [&](std::string_view identifier) {
    return store->fullAccountWithIdentifier_loader(identifier, nullptr);
  };
  EXPECT_EQ(identifiersOfFull({found("a"), found("p"), found("c")}), (Lines{"a", "p", "c"}));
  EXPECT_EQ(found("nobody"), nullptr);
  EXPECT_EQ(found(""), nullptr);
}

TEST_F(LookingUpFullAccounts, HandsTheLoaderOn) {
  loader.loadBundleForAccountWithProperties = [this](const Dictionary&) { return ++askedLoader > 0; };
  const Store store = load(family());
  EXPECT_EQ(identifiersOfFull(store->accountsWithTypes_withLoader({"CalDAV"}, &loader)), (Lines{"c", "a"}));
  EXPECT_EQ(askedLoader, 2);
  EXPECT_TRUE(device.modules->opened.empty());
}

TEST_F(LookingUpFullAccounts, ListsMatchingChildrenRightAfterTheirParent) {
  const Store store = load(family());
  EXPECT_EQ(identifiersOfFull(store->accountsWithTypes({"CalDAV"})), (Lines{"c", "a"}));
  EXPECT_EQ(identifiersOfFull(store->accountsWithTypes({"VorlixAccount", "CalDAV"})), (Lines{"p", "c", "a"}));
  EXPECT_EQ(identifiersOfFull(store->accountsWithTypes({"KeldorIMAP"})), (Lines{"m"}));
  EXPECT_TRUE(store->accountsWithTypes({"LDAP"}).empty());
}

TEST_F(LookingUpFullAccounts, ListsChildrenByTheirParentRecordAndNotByItsIdentifier) {
  const Store store = load({family()[0], properties("p", {}, "LDAP")});  // the later one has no children
  EXPECT_TRUE(store->accountsWithTypes({"CalDAV"}).empty());
}

TEST_F(LookingUpFullAccounts, RequiresOneForEveryMatchingTopLevelAccount) {
  const Store store = load({properties("a")});
  store->replaceAccount_withAccount(store->allBasicAccounts()[0], account("b"));  // which no look-up finds
  try {
    (void)store->accountsWithTypes({"CalDAV"});
    FAIL();
  } catch (const AssertionFailure& failure) {
    EXPECT_EQ(failure.file(), "AccountsManager");
    EXPECT_EQ(failure.method(), "-[AccountsManager accountsWithTypes:withLoader:]");
    EXPECT_EQ(failure.message(), "There is no full account for the account with identifier b");
  }
}

TEST_F(LookingUpFullAccounts, ListsTheFourTypesOfMailAccounts) {
  const Store store = load({properties("y", {}, "Yahoo"), properties("g", {}, "Gmail"),
                            properties("n", {{"Class", "NimbraAccount"}}, "Nimbra"),
                            properties("m", {{"Class", "IMAPAccount"}}, "Mail"), properties("e", {}, "Exchange")});
  EXPECT_EQ(identifiersOfFull(store->allMailAccounts()), (Lines{"y", "g", "n", "m"}));
}

TEST_F(LookingUpFullAccounts, AnswerTheDeviceLocalAccountThatIsThere) {
  const Store store = load({properties("a"), properties("first", {}, "OnMyDevice"), properties("o", {}, "OnMyDevice")});
  EXPECT_EQ(identifiersOfFull({store->fullDeviceLocalAccount()}), (Lines{"first"}));
  EXPECT_TRUE(messagesOf("-[AccountsManager fullDeviceLocalAccount]").empty());
}

TEST_F(LookingUpFullAccounts, AddTheDeviceLocalAccountWhereItIsMissing) {
  const Store store = load({properties("a")});
  const auto made = store->fullDeviceLocalAccount();
  ASSERT_NE(made, nullptr);
  EXPECT_EQ(store->count(), 2U);
  EXPECT_EQ(store->allBasicAccounts()[1]->properties(), accountsettings::DeviceLocalAccount::basicAccountProperties());
  EXPECT_EQ(store->fullDeviceLocalAccount(), made);
  EXPECT_EQ(store->count(), 2U);
  EXPECT_EQ(messagesOf("-[AccountsManager fullDeviceLocalAccount]"),
            (Lines{"DeviceLocalAccount missing. Creating..."}));
  EXPECT_EQ(fileAccounts(), (Array{properties("a")}));
}

}  // namespace
}  // namespace tests
