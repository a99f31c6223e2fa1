#include <gtest/gtest.h>

#include "tests/support/account_store.h"
#include "tests/support/assertion_failures.h"

namespace tests {
namespace {

using Lines = std::vector<std::string>;

class EditingAccounts : public AccountStore {
 protected:
  static Account withChildren(std::string_view identifier, Array children, std::string_view type = "CalDAV") {
    return account(identifier, {{"ChildAccounts", std::move(children)}}, type);
  }
  static Account childOf(const Account& parent, const Dictionary& child) {
    const Account made = accountsettings::BasicAccount::initWithProperties(child);
    made->setParentAccount(parent);
    return made;
  }
  static Store storeOf(const Accounts& accounts) {
    const Store store = AccountsManager::initWithAccounsInfoArray({});
    for (const Account& each : accounts) store->insertAccount(each);
    return store;
  }
  [[nodiscard]] static Lines orderOf(const Store& store) { return identifiersOf(store->allBasicAccounts()); }
  [[nodiscard]] static Lines allOf(const Store& store) { return identifiersOf(store->allBasicSyncableAccounts()); }
};

TEST_F(EditingAccounts, InsertsANewAccountAtTheEndWithItsChildren) {
  const Store store = storeOf({account("a")});
  store->insertAccount(withChildren("p", {properties("c")}));
  EXPECT_EQ(allOf(store), (Lines{"a", "p", "c"}));
  EXPECT_EQ(messagesOf("-[AccountsManager insertAccount:]").back(),
            "Inserting account: {Identifier = \"p\"; Type = \"CalDAV\"; Class = \"TestAccount\"; ChildAccounts = "
            "({Identifier = \"c\"; Type = \"CalDAV\"; Class = \"TestAccount\"})}");
}

TEST_F(EditingAccounts, InsertsNothingUnderAnIdentifierThatIsRegistered) {
  const Account registered = account("a");
  const Store store = storeOf({registered});
  store->insertAccount(account("a", {{"Port", 2}}));
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{registered}));
  EXPECT_EQ(store->accountWithIdentifier("a"), registered);
  EXPECT_EQ(device.logMessages().size(), 2U) << "each attempt is logged, and no refusal";
}

TEST_F(EditingAccounts, UpdatesEveryPlaceOfTheIdentifier) {
  const Store store = load({properties("a"), properties("b"), properties("a")});
  const Account updated = withChildren("a", {properties("c")});
  store->updateAccount(updated);
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{updated, store->accountWithIdentifier("b"), updated}));
  EXPECT_EQ(store->accountWithIdentifier("c"), updated);
  EXPECT_EQ(messagesOf("-[AccountsManager updateAccount:]").size(), 1U);
  EXPECT_TRUE(messagesOf("-[AccountsManager updateAccount:]")[0].starts_with("Updating account: {Identifier = \"a\""));
}

TEST_F(EditingAccounts, UpdatesNothingWhereTheAccountIsNotInTheStore) {
  const Store store = storeOf({account("a")});
  store->updateAccount(withChildren("b", {properties("c")}));
  EXPECT_EQ(allOf(store), (Lines{"a"}));
  EXPECT_EQ(store->accountWithIdentifier("b"), nullptr);
  EXPECT_EQ(messagesOf("-[AccountsManager updateAccount:]").size(), 1U);
}

TEST_F(EditingAccounts, UpdatesARecordByItself) {
  const Store store = storeOf({account("p"), account("q")});
  const Account& inPlace = store->allBasicAccounts()[0];
  inPlace->setAccountProperty_forKey(Array{properties("c")}, "ChildAccounts");
  store->updateAccount(inPlace);
  EXPECT_EQ(allOf(store), (Lines{"p", "q", "c"}));
}

TEST_F(EditingAccounts, DeletesAnAccountWithItsChildren) {
  const Store store = storeOf({withChildren("p", {properties("c")}), account("a")});
  store->deleteAccount(store->allBasicAccounts()[0]);
  EXPECT_EQ(allOf(store), (Lines{"a"}));
  EXPECT_EQ(store->accountWithIdentifier("p"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
  EXPECT_TRUE(messagesOf("-[AccountsManager deleteAccount:]")[0].starts_with("Deleting account: {Identifier = \"p\""));
}

TEST_F(EditingAccounts, DeletesTheLastOfSeveralRecordsWithOneIdentifierAtAllItsPlaces) {
  const Store store = load({properties("a", {{"Port", 1}}), properties("a", {{"Port", 2}})});
  const Accounts before = store->allBasicAccounts();
  store->deleteAccount(account("a"));  // another record of the same identifier
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{before[0]}));
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
  store->insertAccount(before[0]);
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{before[0], before[0]}));
  store->deleteAccount(before[0]);
  EXPECT_EQ(store->count(), 0U);
}

TEST_F(EditingAccounts, DeletesNothingFromTheOrderWhereNoneHasTheIdentifier) {
  const Store store = storeOf({account("a")});
  store->deleteAccount(account("b"));
  EXPECT_EQ(orderOf(store), (Lines{"a"}));
  EXPECT_EQ(messagesOf("-[AccountsManager deleteAccount:]").size(), 1U);
}

TEST_F(EditingAccounts, DeletesManyAsItDeletesEachInTurn) {
  const Array records{properties("a"), withChildren("b", {properties("c")})->properties(), properties("a"),
                      properties("d"), properties("a")};
  const auto afterwards = [&](const auto& deleteFrom) {
    const Store store = load(records);
    device.systemLog->lines.clear();
    const Accounts all = store->allBasicAccounts();
    // Of one identifier another record goes each time, whichever of them is named; "e" is none of the store's.
    deleteFrom(*store, Accounts{all[0], all[1], account("e"), all[0], all[1]});
    return std::tuple{orderOf(store), allOf(store), device.logMessages()};
  };
  const auto inTurn = afterwards([](AccountsManager& store, const Accounts& accounts) {
    for (const Account& each : accounts) store.deleteAccount(each);
  });
  EXPECT_EQ(std::get<0>(inTurn), (Lines{"a", "d"}));
  EXPECT_EQ(afterwards([](AccountsManager& store, const Accounts& all) { store.deleteAccounts(all); }), inTurn);
}

TEST_F(EditingAccounts, DeletesATopLevelAccountByItsIdentifier) {
  const Store store = storeOf({account("a"), account("b")});
  store->deleteAccountWithIdentifier("a");
  EXPECT_EQ(orderOf(store), (Lines{"b"}));
}

TEST_F(EditingAccounts, RequiresTheIdentifierOfATopLevelAccountToDelete) {
  const Store store = storeOf({withChildren("p", {properties("c")})});
  for (const std::string identifier : {"c", "nobody"}) {
    EXPECT_EQ(failureOf([&] { store->deleteAccountWithIdentifier(identifier); }).what(),
              "Assertion failure in -[AccountsManager deleteAccountWithIdentifier:], AccountsManager: There is no "
              "top-level account with identifier " +
                  identifier);
  }
  EXPECT_EQ(allOf(store), (Lines{"p", "c"}));
}

TEST_F(EditingAccounts, ReplacesOneAccountInItsPlaceAndFindsNeitherByIdentifier) {
  const Store store = storeOf({account("a"), withChildren("old", {properties("c")}), account("z")});
  const Account replacing = withChildren("new", {properties("d")});
  store->replaceAccount_withAccount(store->allBasicAccounts()[1], replacing);
  EXPECT_EQ(allOf(store), (Lines{"a", "new", "z", "d"}));
  EXPECT_EQ(store->allBasicAccounts()[1], replacing);
  EXPECT_EQ(store->count(), 3U);
  EXPECT_EQ(store->accountWithIdentifier("old"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("new"), nullptr);
}

TEST_F(EditingAccounts, ReplacesTheAccountAtAPlaceAsItReplacesOneThatIsNamed) {
  const Store store = storeOf({account("a"), withChildren("old", {properties("c")})});
  store->replaceAccountAt(1, withChildren("new", {properties("d")}));
  EXPECT_EQ(allOf(store), (Lines{"a", "new", "d"}));
  EXPECT_EQ(store->accountWithIdentifier("old"), nullptr);
}

TEST_F(EditingAccounts, SavesAReplacementAndFindsItInAStoreLoadedAfresh) {
  const Store store = load({properties("old")});
  store->replaceAccount_withAccount(store->allBasicAccounts()[0], account("new"));
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("new")}));
  EXPECT_NE(AccountsManager::init()->accountWithIdentifier("new"), nullptr);
}

TEST_F(EditingAccounts, RequiresTheReplacedAccountToBeInTheOrder) {
  const Store store = storeOf({account("a")});
  EXPECT_STREQ(failureOf([&] { store->replaceAccount_withAccount(account("a"), account("b")); }).what(),
               "Assertion failure in -[AccountsManager replaceAccount:withAccount:], AccountsManager: The account with "
               "identifier a is not in the store");
  EXPECT_EQ(orderOf(store), (Lines{"a"}));
  EXPECT_NE(store->accountWithIdentifier("a"), nullptr);
}

TEST_F(EditingAccounts, RemovesAllAccountsOfATypeForWhichNoneIsGiven) {
  const Store store =
      storeOf({account("a"), withChildren("m", {properties("c")}, "Mail"), account("b"), account("n", {}, "Mail")});
  store->replaceAccountsWithTypes_withAccounts({"Mail"}, {});
  EXPECT_EQ(allOf(store), (Lines{"a", "b"}));
  EXPECT_EQ(store->accountWithIdentifier("m"), nullptr);
  EXPECT_EQ(messagesOf("-[AccountsManager replaceAccountsWithTypes:withAccounts:]"), (Lines{"Replacing accounts"}));
}

TEST_F(EditingAccounts, PutsGivenAccountsInThePlaceOfTheirIdentifierAndAppendsTheRest) {
  const Store store = storeOf({account("m", {}, "Mail"), account("a"), account("n", {}, "Mail")});
  const Account replacing = withChildren("n", {properties("c")}, "Mail");
  const Account appended = withChildren("new", {properties("d")}, "Mail");
  store->replaceAccountsWithTypes_withAccounts({"Mail"}, {appended, replacing});
  EXPECT_EQ(allOf(store), (Lines{"a", "n", "new", "c", "d"}));
  EXPECT_EQ(store->accountWithIdentifier("n"), replacing);
  EXPECT_EQ(store->accountWithIdentifier("d"), appended);
}

TEST_F(EditingAccounts, ReplacesAnAccountOfTheSameIdentifierWhateverItsType) {
  const Store store = storeOf({account("a", {}, "LDAP"), account("b", {}, "Mail")});
  const Account replacing = account("a", {}, "Mail");
  store->replaceAccountsWithTypes_withAccounts({"Mail"}, {replacing});
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{replacing}));
}

TEST_F(EditingAccounts, PutsTheLaterOfTwoGivenRecordsInPlaceAndAppendsTheEarlier) {
  const Store store = load({properties("a"), properties("b"), properties("a")});
  const Account earlier = account("a", {{"Port", 1}});
  const Account later = account("a", {{"Port", 2}});
  const Account other = store->allBasicAccounts()[1];
  store->replaceAccountsWithTypes_withAccounts({}, {earlier, later});
  EXPECT_EQ(store->allBasicAccounts(), (Accounts{later, other, later, earlier}));
  EXPECT_EQ(store->accountWithIdentifier("a"), earlier);
}

TEST_F(EditingAccounts, FindsTheEarlierOfTwoKeptRecordsAfterAReplacement) {
  const Store store = load({properties("a", {{"Port", 1}}), properties("a", {{"Port", 2}})});
  store->replaceAccountsWithTypes_withAccounts({"Mail"}, {});
  EXPECT_EQ(store->accountWithIdentifier("a"), store->allBasicAccounts()[0]);
}

TEST_F(EditingAccounts, ReplacesAccountsByThemselves) {
  const Store store = storeOf({account("a"), account("b")});
  const Accounts before = store->allBasicAccounts();
  store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, store->allBasicAccounts());
  EXPECT_EQ(store->allBasicAccounts(), before);
}

TEST_F(EditingAccounts, MovesAGivenChildUnderItsNewParent) {
  const Account oldParent = withChildren("old", {properties("c"), properties("d")});
  const Account newParent = account("new", {}, "LDAP");
  const Store store = storeOf({oldParent, newParent});
  store->replaceAccountsWithTypes_withAccounts({"LDAP"}, {newParent, childOf(newParent, properties("c"))});
  EXPECT_EQ(oldParent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("d")}}));
  EXPECT_EQ(newParent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c")}}));
  EXPECT_EQ(store->accountWithIdentifier("c"), newParent);
}

TEST_F(EditingAccounts, ReplacesAGivenChildUnderTheParentThatHasItAlready) {
  const Account parent = withChildren("p", {properties("c", {{"Port", 1}})});
  const Store store = storeOf({parent});
  store->replaceAccountsWithTypes_withAccounts({}, {childOf(parent, properties("c", {{"Port", 2}}))});
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c", {{"Port", 2}})}}));
  EXPECT_EQ(allOf(store), (Lines{"p", "c"}));
}

TEST_F(EditingAccounts, TakesAGivenChildFromItsParentWhereTheNewOneIsNotInTheStore) {
  const Account oldParent = withChildren("old", {properties("c")});
  const Store store = storeOf({oldParent});
  store->replaceAccountsWithTypes_withAccounts({}, {childOf(account("stranger"), properties("c"))});
  EXPECT_EQ(oldParent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{}}));
  EXPECT_EQ(allOf(store), (Lines{"old"}));
}

TEST_F(EditingAccounts, TakesAGivenChildFromNoParentThatItIsForgottenUnder) {
  const Account oldParent = withChildren("old", {properties("c")});
  const Account newParent = account("new", {}, "LDAP");
  const Store store = storeOf({oldParent, newParent});
  store->_removeChildrenForAccountWithIdentifier("old");
  store->replaceAccountsWithTypes_withAccounts({"LDAP"}, {newParent, childOf(newParent, properties("c"))});
  EXPECT_EQ(oldParent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c")}}));
  EXPECT_EQ(store->accountWithIdentifier("c"), newParent);
}

TEST_F(EditingAccounts, AddsAChildToAParentWithoutChildren) {
  const Account parent = account("p");
  const Store store = storeOf({parent});
  store->addChild_toAccount(account("c"), parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c")}}));
  EXPECT_EQ(allOf(store), (Lines{"p", "c"}));
}

TEST_F(EditingAccounts, AddsAChildTwiceAndRemovesBothByTheirIdentifier) {
  const Account parent = account("p");
  const Store store = storeOf({parent});
  store->addChild_toAccount(account("c"), parent);
  store->addChild_toAccount(account("c"), parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c"), properties("c")}}));
  store->removeChildWithIdentifier_fromAccount("c", parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), PropertyValue{Array{}});
  EXPECT_EQ(allOf(store), (Lines{"p"}));
}

TEST_F(EditingAccounts, RemovesEveryChildOfAnIdentifierHoweverTheyDiffer) {
  const Account parent =
      withChildren("p", {properties("c", {{"Port", 1}}), properties("d"), properties("c", {{"Port", 2}})});
  storeOf({parent})->removeChildWithIdentifier_fromAccount("c", parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("d")}}));
}

TEST_F(EditingAccounts, NeverRemovesAChildThatMakesNoAccount) {
  const Array children{Dictionary{{"Identifier", "c"}, {"Type", "CalDAV"}}, 5};
  const Account parent = withChildren("p", children);
  storeOf({parent})->removeChildWithIdentifier_fromAccount("c", parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), PropertyValue{children});
}

TEST_F(EditingAccounts, LeavesAParentWithoutChildrenWithoutThem) {
  const Account parent = account("p");
  storeOf({parent})->removeChildWithIdentifier_fromAccount("c", parent);
  EXPECT_EQ(parent->properties(), properties("p"));
}

TEST_F(EditingAccounts, LeavesChildrenThatAreNoArrayAsTheyAreWhenOneIsRemoved) {
  for (const PropertyValue& odd : {PropertyValue{"c"}, PropertyValue{5}, PropertyValue{properties("c")}}) {
    const Account parent = account("p", {{"ChildAccounts", odd}});
    storeOf({parent})->removeChildWithIdentifier_fromAccount("c", parent);
    EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), odd);
  }
}

TEST_F(EditingAccounts, LeavesChildrenOfAnOddKindAsTheyAreUntilOneIsAdded) {
  const Account parent = account("p", {{"ChildAccounts", "text"}});
  const Store store = storeOf({parent});
  store->removeChildWithIdentifier_fromAccount("c", parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), PropertyValue{"text"});
  store->addChild_toAccount(account("c"), parent);
  EXPECT_EQ(parent->accountPropertyForKey("ChildAccounts"), (PropertyValue{Array{properties("c")}}));
}

TEST_F(EditingAccounts, DoesNotReachTheFileUntilItIsSaved) {
  const Store store = load({properties("a")});
  store->deleteAccountWithIdentifier("a");
  store->insertAccount(account("b"));
  EXPECT_EQ(fileAccounts(), (Array{properties("a")}));
  store->saveAllAccounts();
  EXPECT_EQ(fileAccounts(), (Array{properties("b")}));
}

TEST_F(EditingAccounts, SurvivesAnAccountThatHasLostItsIdentifier) {
  const Store store = storeOf({withChildren("p", {properties("c")}), account("a")});
  const Account nameless = store->allBasicAccounts()[0];
  nameless->removeAccountPropertyForKey("Identifier");
  store->updateAccount(nameless);
  store->deleteAccount(nameless);
  store->insertAccount(nameless);
  store->replaceAccountsWithTypes_withAccounts({"Mail"}, {nameless});
  EXPECT_EQ(orderOf(store), (Lines{"(none)", "a", "(none)", "(none)"}));
  store->replaceAccountsWithTypes_withAccounts({"CalDAV"}, {});
  EXPECT_EQ(store->count(), 0U);
}

}  // namespace
}  // namespace tests
