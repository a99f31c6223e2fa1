#include "accountsettings/basic_account.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "accountsettings/log_handle.h"
#include "tests/support/account_configuration.h"
#include "tests/support/assertion_failures.h"

namespace accountsettings {
namespace {

using Messages = std::vector<std::string>;
using Getter = std::optional<Text> (BasicAccount::*)() const;

struct TypedGetter {
  StringConstant key;
  Getter get;
};

const TypedGetter kTypedGetters[] = {
    {kAccountType, &BasicAccount::type},
    {kAccountIdentifier, &BasicAccount::identifier},
    {kAccountSyncIdentifier, &BasicAccount::syncStoreIdentifier},
    {kAccountClass, &BasicAccount::accountClass},
    {kAccountDisplayName, &BasicAccount::displayName},
    {kAccountTypeString, &BasicAccount::typeString},
    {kAccountShortTypeString, &BasicAccount::shortTypeString},
};

Dictionary minimal() { return {{"Type", "CalDAV"}, {"Class", "DACalendarAccount"}, {"Identifier", "A"}}; }

class Record : public testing::Test {
 protected:
  Record() { tests::putAccountConfiguration(device); }

  std::shared_ptr<BasicAccount> make(const Dictionary& properties = minimal()) {
    return BasicAccount::accountWithProperties(properties);
  }

  tests::FakeDevice device;
};

TEST_F(Record, OfATypeHasTypeClassAndOneNewIdentifierForTheAccountAndItsSyncStore) {
  const auto account = BasicAccount::accountWithType_class("CalDAV", "DACalendarAccount");
  const Dictionary expected{{"Type", "CalDAV"},
                            {"Identifier", "00000000-0000-4000-8000-000000000001"},
                            {"Sync Identifier", "00000000-0000-4000-8000-000000000001"},
                            {"Class", "DACalendarAccount"}};
  EXPECT_EQ(account->properties(), expected);
  EXPECT_EQ(account->originalProperties(), expected);
  EXPECT_EQ(account->parentAccount(), nullptr);
}

// A class derived from it, as a program may have one.
class ShoutingAccount : public BasicAccount {
 public:
  [[nodiscard]] std::optional<Text> displayName() const override { return Text{"SHOUT"}; }
};

TEST_F(Record, OfAClassDerivedFromItIsMadeByThatClass) {
  const std::shared_ptr<ShoutingAccount> account = ShoutingAccount::accountWithProperties<ShoutingAccount>(minimal());
  ASSERT_NE(account, nullptr);
  EXPECT_EQ(account->properties(), minimal());
  const std::shared_ptr<BasicAccount> record = account;
  EXPECT_EQ(record->displayName(), Text{"SHOUT"});
  EXPECT_EQ(ShoutingAccount::accountWithProperties<ShoutingAccount>({{"Type", "CalDAV"}}), nullptr);
}

TEST_F(Record, OfATypeNeedsAClass) {
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::accountWithType_class("CalDAV", ""); });
  EXPECT_EQ(failure.message(), "The account class is required.");
  EXPECT_EQ(failure.method(), "-[BasicAccount _initWithType:class:]");
  EXPECT_EQ(failure.file(), "BasicAccount");
}

TEST_F(Record, OfATypeNeedsAKnownType) {
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::_initWithType_class("caldav", "X"); });
  EXPECT_EQ(failure.message(), "The account type (caldav) is not supported");
  EXPECT_EQ(failure.method(), "-[BasicAccount _initWithType:class:]");
}

TEST_F(Record, ComplainsOfTheMissingClassFirst) {
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::accountWithType_class("caldav", ""); });
  EXPECT_EQ(failure.message(), "The account class is required.");
}

TEST_F(Record, IsNotMadeFromNothing) {
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::init(); });
  EXPECT_EQ(failure.message(), "Don't use this method");
  EXPECT_EQ(failure.method(), "-[BasicAccount init]");
  EXPECT_EQ(failure.file(), "BasicAccount");
}

TEST_F(Record, OfAnUnknownTypeIsRefusedWithALogLine) {
  EXPECT_EQ(make({{"Type", "caldav"}, {"Class", "X"}}), nullptr);
  EXPECT_EQ(device.logMessages(), Messages{"Invalid account type: caldav"});
}

TEST_F(Record, WithoutAClassIsRefusedWithALogLine) {
  EXPECT_EQ(make({{"Type", "CalDAV"}}), nullptr);
  EXPECT_EQ(make({{"Type", "CalDAV"}, {"Class", ""}}), nullptr);
  EXPECT_EQ(make({{"Type", "CalDAV"}, {"Class", 5}}), nullptr);
  EXPECT_EQ(device.logMessages(), Messages(3, "Missing account class."));
}

TEST_F(Record, WithNeitherTypeNorClassIsRefusedWithBothLines) {
  EXPECT_EQ(make({}), nullptr);
  EXPECT_EQ(device.logMessages(), (Messages{"Invalid account type: (null)", "Missing account class."}));
}

TEST_F(Record, OfATypeThatIsNoTextIsRefusedAndShown) {
  EXPECT_EQ(make({{"Type", 7}, {"Class", "X"}}), nullptr);
  EXPECT_EQ(device.logMessages(), Messages{"Invalid account type: 7"});
}

TEST_F(Record, LogsUnderTheMethodsNameWithTheLineInParenthesesAndTheMessageInQuotes) {
  make({{"Type", "CalDAV"}});
  const auto& line = device.systemLog->lines.at(0);
  EXPECT_EQ(line.subsystem, "com.vorlix.accountsettings");
  EXPECT_EQ(line.category, "log");
  EXPECT_EQ(line.text,
            "-[BasicAccount initWithProperties:] (" + std::to_string(line.line) + ") \"Missing account class.\"");
}

TEST_F(Record, WithoutIdentifierIsGivenOneForItselfAndItsSyncStore) {
  const auto account = make({{"Type", "CalDAV"}, {"Class", "X"}});
  EXPECT_EQ(account->identifier(), Text{"00000000-0000-4000-8000-000000000001"});
  EXPECT_EQ(account->syncStoreIdentifier(), account->identifier());
  EXPECT_FALSE(account->originalProperties().contains("Identifier"));
}

TEST_F(Record, WithoutIdentifierKeepsTheSyncIdentifierItHas) {
  const auto account = make({{"Type", "CalDAV"}, {"Class", "X"}, {"Sync Identifier", "S"}});
  EXPECT_EQ(account->syncStoreIdentifier(), Text{"S"});
  EXPECT_EQ(device.identifiers->made, 1);
}

TEST_F(Record, WithoutIdentifierKeepsASyncIdentifierThatIsNoText) {
  const auto account = make({{"Type", "CalDAV"}, {"Class", "X"}, {"Sync Identifier", 5}});
  EXPECT_EQ(account->identifier(), Text{"00000000-0000-4000-8000-000000000001"});
  EXPECT_EQ(account->accountPropertyForKey("Sync Identifier"), PropertyValue{5});
  EXPECT_EQ(account->syncStoreIdentifier(), std::nullopt);
}

TEST_F(Record, WithAnIdentifierButNoSyncIdentifierKeepsLackingOne) {
  const auto account = make();
  EXPECT_EQ(account->syncStoreIdentifier(), std::nullopt);
  EXPECT_EQ(account->properties(), minimal());
  EXPECT_EQ(device.identifiers->made, 0);
}

TEST_F(Record, WhoseIdentifierIsNoTextIsGivenANewOneInItsPlace) {
  const auto account = make({{"Identifier", 12}, {"Type", "CalDAV"}, {"Class", "X"}});
  EXPECT_EQ(account->identifier(), Text{"00000000-0000-4000-8000-000000000001"});
  EXPECT_EQ(account->properties().begin()->key, Text{"Identifier"});
}

TEST_F(Record, StaysWithoutTheIdentifierThatCannotBeMade) {
  device.identifiers->canMake = false;
  EXPECT_EQ(BasicAccount::createNewAccountUID(), std::nullopt);
  for (const Dictionary& given : {Dictionary{{"Type", "CalDAV"}, {"Class", "X"}},
                                  Dictionary{{"Type", "CalDAV"}, {"Class", "X"}, {"Identifier", 12}}}) {
    const auto account = make(given);
    ASSERT_NE(account, nullptr);
    EXPECT_EQ(account->properties(), given);
    EXPECT_EQ(account->identifier(), std::nullopt);
  }
}

TEST_F(Record, OfATypeStaysWithoutTheIdentifierThatCannotBeMade) {
  device.identifiers->canMake = false;
  const auto account = BasicAccount::accountWithType_class("CalDAV", "X");
  EXPECT_EQ(account->properties(), (Dictionary{{"Type", "CalDAV"}, {"Class", "X"}}));
}

TEST_F(Record, IdentifiersAreNewEachTime) {
  EXPECT_EQ(BasicAccount::createNewAccountUID(), "00000000-0000-4000-8000-000000000001");
  EXPECT_EQ(BasicAccount::createNewAccountUID(), "00000000-0000-4000-8000-000000000002");
}

TEST_F(Record, KeepsASnapshotThatNoEditReaches) {
  Dictionary given = minimal();
  given.set("Nested", Dictionary{{"Key", Array{1, 2}}});
  const auto account = make(given);
  account->setAccountProperty_forKey(Dictionary{{"Key", 3}}, "Nested");
  account->removeAccountPropertyForKey("Type");
  EXPECT_EQ(account->originalProperties(), given);
}

TEST_F(Record, TakesANewSnapshotWhenToldTo) {
  const auto account = make();
  account->setAccountProperty_forKey("N", "DisplayName");
  account->setOriginalProperties(account->properties());
  account->setAccountProperty_forKey("M", "DisplayName");
  EXPECT_EQ(*account->originalProperties().text("DisplayName"), Text{"N"});
}

TEST_F(Record, MayBeHandedTheSnapshotThatItHolds) {
  const auto account = make();
  account->setOriginalProperties(account->originalProperties());
  EXPECT_EQ(account->originalProperties(), minimal());
}

TEST_F(Record, IsSavedAsItsLiveProperties) {
  const auto account = make();
  account->properties().set("Host", "example.org");
  EXPECT_EQ(&account->propertiesToSave(), &account->properties());
  EXPECT_EQ(account->accountPropertyForKey("Host"), PropertyValue{"example.org"});
}

TEST_F(Record, StoresAValueAndRemovesTheKeyOfAnAbsentOne) {
  const auto account = make();
  account->setAccountProperty_forKey(993, "Port");
  EXPECT_EQ(account->accountPropertyForKey("Port"), PropertyValue{993});
  account->setAccountProperty_forKey(std::nullopt, "Port");
  EXPECT_EQ(account->accountPropertyForKey("Port"), std::nullopt);
  EXPECT_FALSE(account->properties().contains("Port"));
}

TEST_F(Record, KeepsTypeAndClassFromBeingSet) {
  const auto account = make();
  account->setAccountProperty_forKey("Mail", "Type");
  account->setAccountProperty_forKey(std::nullopt, "Class");
  EXPECT_EQ(account->properties(), minimal());
}

TEST_F(Record, LetsTypeAndClassBeForced) {
  const auto account = make();
  account->_forcedSetAccountProperty_forKey("Mail", "Type");
  account->_forcedSetAccountProperty_forKey(std::nullopt, "Class");
  EXPECT_EQ(account->type(), Text{"Mail"});
  EXPECT_FALSE(account->properties().contains("Class"));
}

TEST_F(Record, LetsTypeAndClassBeRemoved) {
  const auto account = make();
  account->removeAccountPropertyForKey("Type");
  account->removeAccountPropertyForKey("Class");
  EXPECT_EQ(account->properties(), (Dictionary{{"Identifier", "A"}}));
}

TEST_F(Record, KeepsAKeysPlaceWhenItIsOverwritten) {
  const auto account = make({{"DisplayName", "N"}, {"Type", "CalDAV"}, {"Class", "X"}, {"Identifier", "A"}});
  account->setDisplayName("M");
  EXPECT_EQ(account->properties().begin()->key, Text{"DisplayName"});
  EXPECT_EQ(account->displayName(), Text{"M"});
}

TEST_F(Record, TakesAnotherClassNameThroughItsSetter) {
  const auto account = make();
  account->setAccountClass("KQAccount");
  EXPECT_EQ(account->accountClass(), Text{"KQAccount"});
}

TEST_F(Record, DoesNotStoreTheClassThatItsParentGivesIt) {
  const auto child = make();
  child->setParentAccount(make());
  child->removeAccountPropertyForKey("Class");
  child->setAccountClass("DACalendarAccount");
  EXPECT_FALSE(child->properties().contains("Class"));
}

TEST_F(Record, StoresTheDisplayNameThatItsParentGivesIt) {
  const auto parent = make();
  const auto child = make();
  parent->setDisplayName("N");
  child->setParentAccount(parent);
  child->setDisplayName("N");
  EXPECT_EQ(*child->properties().text("DisplayName"), Text{"N"});
}

TEST_F(Record, LeavesAnEqualDisplayNameUntouched) {
  const auto account = make();
  account->setDisplayName("N");
  const Dictionary before = account->properties();
  account->setDisplayName("N");
  EXPECT_TRUE(account->properties().isIdenticalTo(before));
}

TEST_F(Record, RefusesAnEmptyDisplayName) {
  const auto account = make();
  const AssertionFailure failure = tests::failureOf([&] { account->setDisplayName(""); });
  EXPECT_EQ(failure.method(), "-[BasicAccount setDisplayName:]");
  EXPECT_EQ(failure.message(), "The display name must not be empty");
  EXPECT_EQ(account->properties(), minimal());
}

TEST_F(Record, AnswersEveryTypedGetterFromItsOwnKey) {
  const auto account = make();
  for (const auto& [key, get] : kTypedGetters) {
    account->_forcedSetAccountProperty_forKey("value of " + std::string{key.view()}, key);
    EXPECT_EQ((*account.*get)(), Text{"value of " + std::string{key.view()}});
  }
}

TEST_F(Record, AnswersEveryTypedGetterFromItsParentWhereItHasNoValue) {
  const auto grandparent = make();
  const auto parent = make();
  const auto child = make();
  child->setParentAccount(parent);
  parent->setParentAccount(grandparent);
  for (const auto& [key, get] : kTypedGetters) {
    grandparent->_forcedSetAccountProperty_forKey("theirs", key);
    parent->removeAccountPropertyForKey(key);
    child->removeAccountPropertyForKey(key);
    EXPECT_EQ((*child.*get)(), Text{"theirs"}) << key.view();
  }
}

TEST_F(Record, AnswersNothingWhereItsOwnValueHasTheWrongKindAndDoesNotClimb) {
  const auto parent = make();
  const auto child = make();
  child->setParentAccount(parent);
  for (const auto& [key, get] : kTypedGetters) {
    parent->_forcedSetAccountProperty_forKey("theirs", key);
    child->_forcedSetAccountProperty_forKey(Array{"mine"}, key);
    EXPECT_EQ((*child.*get)(), std::nullopt) << key.view();
  }
}

TEST_F(Record, ClimbsTheWholeChainForAnyKey) {
  const auto grandparent = make();
  const auto parent = make();
  const auto child = make();
  child->setParentAccount(parent);
  parent->setParentAccount(grandparent);
  grandparent->setAccountProperty_forKey(true, "Anything");
  EXPECT_EQ(child->accountPropertyForKey("Anything"), PropertyValue{true});
  EXPECT_EQ(child->accountPropertyForKey("Nothing"), std::nullopt);
}

TEST_F(Record, KnowsItsParentsIdentifier) {
  const auto child = make();
  EXPECT_EQ(child->parentAccountIdentifier(), std::nullopt);
  child->setParentAccount(make());
  EXPECT_EQ(child->parentAccountIdentifier(), Text{"A"});
  child->setParentAccount(nullptr);
  EXPECT_EQ(child->parentAccount(), nullptr);
}

TEST_F(Record, KeepsItsParentAlive) {
  const auto child = make();
  child->setParentAccount(make());
  child->setParentAccount(child->parentAccount());
  EXPECT_EQ(child->parentAccount()->identifier(), Text{"A"});
}

TEST_F(Record, LetsGoOfAFormerParent) {
  const auto child = make();
  child->setParentAccount(make());
  const std::weak_ptr<BasicAccount> former = child->parentAccount();
  child->setParentAccount(make());
  EXPECT_TRUE(former.expired());
}

}  // namespace
}  // namespace accountsettings
