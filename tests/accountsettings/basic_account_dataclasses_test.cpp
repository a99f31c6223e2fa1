#include <gtest/gtest.h>

#include <cmath>

#include "accountsettings/basic_account.h"
#include "tests/support/account_configuration.h"

namespace accountsettings {
namespace {

using Dataclasses = BasicAccount::Dataclasses;
using platform::ManagedFeature;
using platform::Restriction;

const Text kMail = kAccountDataclassMail;
const Text kContacts = kAccountDataclassContacts;
const Text kCalendars = kAccountDataclassCalendars;
const Text kReminders = kAccountDataclassReminders;
const Text kNotes = kAccountDataclassNotes;

class RecordDataclasses : public testing::Test {
 protected:
  RecordDataclasses() { tests::putAccountConfiguration(device); }

  std::shared_ptr<BasicAccount> make(std::string_view type, const Dictionary& further = {}) {
    Dictionary properties{{"Type", type}, {"Class", "X"}, {"Identifier", "A"}};
    for (const auto& [key, value] : further) properties.set(key, value);
    return BasicAccount::accountWithProperties(properties);
  }
  static Array storedIn(const BasicAccount& account) {
    const Array* const stored = account.properties().array("Enabled Dataclasses");
    return stored == nullptr ? Array{"nothing is stored"} : *stored;
  }

  tests::FakeDevice device;
};

TEST_F(RecordDataclasses, OrdersKnownOnesFirstOnceEachAndKeepsTheRestAsItCame) {
  EXPECT_EQ(BasicAccount::_orderedDataclasses({kNotes, "X", kMail, kNotes, "X"}),
            (Dataclasses{kMail, kNotes, "X", "X"}));
  EXPECT_EQ(BasicAccount::_orderedDataclasses({}), Dataclasses{});
}

TEST_F(RecordDataclasses, OrdersAllFourteenFromAnyOrder) {
  const Dataclasses& canonical = BasicAccount::allSupportedDataclasses();
  EXPECT_EQ(BasicAccount::_orderedDataclasses({canonical.rbegin(), canonical.rend()}), canonical);
}

TEST_F(RecordDataclasses, SupportedAreThoseOfTheTypeInCanonicalOrder) {
  Dictionary types = tests::accountTypesProperties();
  types.set("CalDAV", Dictionary{{"Supported Dataclasses", Array{kReminders, kCalendars}}});
  device.put("/resources/AccountTypesProperties.plist", types);
  EXPECT_EQ(make("CalDAV")->supportedDataclasses(), (Dataclasses{kCalendars, kReminders}));
}

TEST_F(RecordDataclasses, SupportedAreNoneForATypeThatIsUnknownOrGone) {
  const auto account = make("CalDAV");
  account->_forcedSetAccountProperty_forKey("caldav", "Type");
  EXPECT_EQ(account->supportedDataclasses(), Dataclasses{});
  account->removeAccountPropertyForKey("Type");
  EXPECT_EQ(account->supportedDataclasses(), Dataclasses{});
}

TEST_F(RecordDataclasses, SupportedAreNoneWithoutATypeEvenWhereThereIsATypeOfNoName) {
  Dictionary types = tests::accountTypesProperties();
  types.set("", Dictionary{{"Supported Dataclasses", Array{kMail}}});
  device.put("/resources/AccountTypesProperties.plist", types);
  const auto account = make("CalDAV");
  account->removeAccountPropertyForKey("Type");
  EXPECT_EQ(account->supportedDataclasses(), Dataclasses{});
}

TEST_F(RecordDataclasses, AllSupportedOnesAreProvisionedUnlessTheServiceSaysOtherwise) {
  EXPECT_EQ(make("CalDAV")->provisionedDataclasses(), (Dataclasses{kCalendars, kReminders}));
  EXPECT_EQ(make("CalDAV", {{"Provisioned Dataclasses", "odd"}})->provisionedDataclasses(),
            (Dataclasses{kCalendars, kReminders}));
}

TEST_F(RecordDataclasses, NoneIsProvisionedThatTheTypeDoesNotSupport) {
  const auto account = make("CalDAV", {{"Provisioned Dataclasses", Array{kReminders, kMail, 5, "X"}}});
  EXPECT_EQ(account->provisionedDataclasses(), Dataclasses{kReminders});
  EXPECT_EQ(make("CalDAV", {{"Provisioned Dataclasses", Array{}}})->provisionedDataclasses(), Dataclasses{});
}

TEST_F(RecordDataclasses, ProvisionedOnesAreInheritedFromTheParent) {
  const auto child = make("Mail");
  child->setParentAccount(make("VorlixAccount", {{"Provisioned Dataclasses", Array{kNotes, kContacts}}}));
  EXPECT_EQ(child->provisionedDataclasses(), Dataclasses{kNotes});
}

TEST_F(RecordDataclasses, ARestrictedOneIsNeitherProvisionedNorEnabledButStaysStored) {
  device.restrictions->profiles[ManagedFeature::cloudBackup] = Restriction::notAllowed;
  const Array stored{kAccountDataclassBackup, kMail};
  const auto account = make("VorlixAccount", {{"Enabled Dataclasses", stored}});
  EXPECT_EQ(account->enabledDataclasses(), Dataclasses{kMail});
  EXPECT_EQ(storedIn(*account), stored);
}

TEST_F(RecordDataclasses, NothingIsProvisionedWhereAllThatTheServiceGrantsIsRestricted) {
  device.restrictions->profiles[ManagedFeature::cloudBackup] = Restriction::notAllowed;
  const auto account = make("VorlixAccount", {{"Provisioned Dataclasses", Array{kAccountDataclassBackup}}});
  EXPECT_EQ(account->provisionedDataclasses(), Dataclasses{});
}

TEST_F(RecordDataclasses, EachForbiddenFeatureRestrictsItsOwn) {
  const std::vector<std::pair<ManagedFeature, std::unordered_set<std::string_view>>> table{
      {ManagedFeature::cloudDocumentSync, {kAccountDataclassQuorvel, kAccountDataclassKeyValue}},
      {ManagedFeature::mediaStream, {kAccountDataclassMediaStream}},
      {ManagedFeature::sharedStreams, {kAccountDataclassSharedStreams}},
      {ManagedFeature::cloudBackup, {kAccountDataclassBackup}},
      {ManagedFeature::cardsWhileLocked, {kAccountDataclassTickora}}};
  for (const auto& [feature, dataclasses] : table) {
    device.restrictions->profiles = {{feature, Restriction::notAllowed}};
    EXPECT_EQ(BasicAccount::_profileRestrictedDataclasses(), dataclasses);
  }
}

TEST_F(RecordDataclasses, OnlyAnExplicitProhibitionRestricts) {
  device.restrictions->profiles = {{ManagedFeature::mediaStream, Restriction::allowed},
                                   {ManagedFeature::cloudBackup, Restriction::notSet}};
  EXPECT_TRUE(BasicAccount::_profileRestrictedDataclasses().empty());
}

TEST_F(RecordDataclasses, RestrictionsAreAskedForAfreshFeatureByFeature) {
  for (int times = 0; times < 2; ++times) EXPECT_TRUE(BasicAccount::_profileRestrictedDataclasses().empty());
  const std::vector<ManagedFeature> once{ManagedFeature::cloudDocumentSync, ManagedFeature::mediaStream,
                                         ManagedFeature::sharedStreams, ManagedFeature::cloudBackup,
                                         ManagedFeature::cardsWhileLocked};
  std::vector<ManagedFeature> twice = once;
  twice.insert(twice.end(), once.begin(), once.end());
  EXPECT_EQ(device.restrictions->asked, twice);
}

TEST_F(RecordDataclasses, WithoutAStoredListNoneIsEnabledAndThereIsNoList) {
  const auto account = make("CalDAV");
  EXPECT_EQ(account->enabledDataclasses(), std::nullopt);
  for (const Text& dataclass : BasicAccount::allSupportedDataclasses()) {
    EXPECT_FALSE(account->isEnabledForDataclass(dataclass));
  }
}

TEST_F(RecordDataclasses, EnabledAreTheStoredOnesThatAreProvisionedInCanonicalOrder) {
  const auto account = make("Exchange", {{"Enabled Dataclasses", Array{kNotes, 1, kMail, kAccountDataclassBackup}}});
  EXPECT_EQ(account->enabledDataclasses(), (Dataclasses{kMail, kNotes}));
  EXPECT_TRUE(account->isEnabledForDataclass(kNotes));
  EXPECT_FALSE(account->isEnabledForDataclass(kAccountDataclassBackup));
}

TEST_F(RecordDataclasses, AStoredListOfTheWrongKindIsNoList) {
  const auto account = make("CalDAV", {{"Enabled Dataclasses", Dictionary{{"odd", true}}}});
  EXPECT_EQ(account->enabledDataclasses(), std::nullopt);
}

TEST_F(RecordDataclasses, AChildShowsExactlyItsParentsEnabledListWhateverItStores) {
  const auto child = make("KeldorIMAP", {{"Enabled Dataclasses", Array{kNotes}}});
  child->setParentAccount(make("VorlixAccount", {{"Enabled Dataclasses", Array{kContacts, kMail}}}));
  EXPECT_EQ(child->enabledDataclasses(), (Dataclasses{kMail, kContacts}));
  EXPECT_TRUE(child->isEnabledForDataclass(kContacts));
  EXPECT_FALSE(child->isEnabledForDataclass(kNotes));
}

TEST_F(RecordDataclasses, AChildShowsItsOwnListWhereTheParentHasNoneEnabled) {
  const auto child = make("KeldorIMAP", {{"Enabled Dataclasses", Array{kNotes}}});
  child->setParentAccount(make("VorlixAccount"));
  EXPECT_EQ(child->enabledDataclasses(), Dataclasses{kNotes});
  child->setParentAccount(make("VorlixAccount", {{"Enabled Dataclasses", Array{}}}));
  EXPECT_EQ(child->enabledDataclasses(), Dataclasses{kNotes});
}

TEST_F(RecordDataclasses, AChildInheritsAStoredListOfWhichTheParentItselfMayEnableNothing) {
  const auto child = make("Mail");
  child->setParentAccount(make("CalDAV", {{"Enabled Dataclasses", Array{kNotes}}}));
  EXPECT_EQ(child->parentAccount()->enabledDataclasses(), Dataclasses{});
  EXPECT_EQ(child->enabledDataclasses(), Dataclasses{kNotes});
}

TEST_F(RecordDataclasses, SwitchingOnAddsAtTheEndAndSwitchingOffTakesOut) {
  const auto account = make("Exchange", {{"Enabled Dataclasses", Array{kNotes, kMail}}});
  account->setEnabled_forDataclass(true, kContacts);
  EXPECT_EQ(storedIn(*account), (Array{kNotes, kMail, kContacts}));
  account->setEnabled_forDataclass(false, kNotes);
  EXPECT_EQ(storedIn(*account), (Array{kMail, kContacts}));
}

TEST_F(RecordDataclasses, SwitchingOnWhatIsOnKeepsTheOrder) {
  const auto account = make("Exchange", {{"Enabled Dataclasses", Array{kNotes, kMail}}});
  account->setEnabled_forDataclass(true, kNotes);
  EXPECT_EQ(storedIn(*account), (Array{kNotes, kMail}));
}

TEST_F(RecordDataclasses, SwitchingOneCollapsesRepeatedOthers) {
  const auto account = make("Exchange", {{"Enabled Dataclasses", Array{kNotes, kMail, kNotes, kMail}}});
  account->setEnabled_forDataclass(false, kMail);
  EXPECT_EQ(storedIn(*account), Array{kNotes});
}

TEST_F(RecordDataclasses, SwitchingOneKeepsWhatIsNoDataclass) {
  const Array odd{5, "X", Array{"nested"}};
  const auto account = make("Exchange", {{"Enabled Dataclasses", odd}});
  account->setEnabled_forDataclass(true, kMail);
  EXPECT_EQ(storedIn(*account), (Array{5, "X", Array{"nested"}, kMail}));
  account->setEnabled_forDataclass(false, kMail);
  EXPECT_EQ(storedIn(*account), odd);
}

TEST_F(RecordDataclasses, SwitchingOneCollapsesRepeatedOthersOfEveryKind) {
  const PropertyValue table[] = {5,
                                 5.5,
                                 std::nan(""),
                                 true,
                                 platform::Date{1},
                                 platform::Uid{1},
                                 platform::Bytes{1, 2},
                                 Array{"nested", 5},
                                 Dictionary{{"a", 1}, {"b", 2}}};
  for (const PropertyValue& each : table) {
    const auto account = make("Exchange", {{"Enabled Dataclasses", Array{each, kNotes, each}}});
    account->setEnabled_forDataclass(true, kMail);
    EXPECT_EQ(storedIn(*account), (Array{each, kNotes, kMail}));
  }
}

TEST_F(RecordDataclasses, SwitchingOneTellsEqualValuesFromThoseOfAnotherKind) {
  const Array alike{1, 1.0, true, "1", 0.0, -0.0, Dictionary{{"a", 1}, {"b", 2}}};
  Array repeated = alike;
  repeated.emplace_back(Dictionary{{"b", 2}, {"a", 1}});
  const auto account = make("Exchange", {{"Enabled Dataclasses", repeated}});
  account->setEnabled_forDataclass(false, kMail);
  EXPECT_EQ(storedIn(*account), alike);
}

TEST_F(RecordDataclasses, AnUnknownOneIsProvisionedAndEnabledOnceHoweverOftenItIsListed) {
  Dictionary types = tests::accountTypesProperties();
  types.set("Odd", Dictionary{{"Supported Dataclasses", Array{"X", "Y", "X"}}});  // kept, since none of it is known
  device.put("/resources/AccountTypesProperties.plist", types);
  EXPECT_EQ(make("Odd")->supportedDataclasses(), (Dataclasses{"X", "Y", "X"}));
  EXPECT_EQ(make("Odd")->provisionedDataclasses(), (Dataclasses{"X", "Y"}));
  const auto account =
      make("Odd", {{"Provisioned Dataclasses", Array{"Y", "X", "Y"}}, {"Enabled Dataclasses", Array{"X", "X", "Z"}}});
  EXPECT_EQ(account->provisionedDataclasses(), (Dataclasses{"Y", "X"}));
  EXPECT_EQ(account->enabledDataclasses(), Dataclasses{"X"});
}

TEST_F(RecordDataclasses, SwitchingOneOffWhereNothingIsStoredStoresAnEmptyList) {
  const auto account = make("Exchange");
  account->setEnabled_forDataclass(false, kMail);
  EXPECT_EQ(storedIn(*account), Array{});
  EXPECT_EQ(account->enabledDataclasses(), Dataclasses{});
}

TEST_F(RecordDataclasses, SwitchingAnUnsupportedOneDoesNothing) {
  const auto account = make("CalDAV", {{"Enabled Dataclasses", Array{kMail}}});
  account->setEnabled_forDataclass(true, kNotes);
  account->setEnabled_forDataclass(false, kMail);
  EXPECT_EQ(storedIn(*account), Array{kMail});
}

TEST_F(RecordDataclasses, SwitchingAnUnsupportedOneByForceStoresIt) {
  const auto account = make("CalDAV");
  account->_forcedSetEnabled_forDataclass(true, kNotes);
  EXPECT_EQ(storedIn(*account), Array{kNotes});
  EXPECT_FALSE(account->isEnabledForDataclass(kNotes));
}

TEST_F(RecordDataclasses, SwitchingNeverTakesOverTheParentsList) {
  const auto child = make("Mail");
  child->setParentAccount(make("VorlixAccount", {{"Enabled Dataclasses", Array{kMail, kContacts}}}));
  child->setEnabled_forDataclass(true, kNotes);
  EXPECT_EQ(storedIn(*child), Array{kNotes});
}

TEST_F(RecordDataclasses, ReplacingTheEnabledOnesKeepsTheSupportedMembers) {
  const auto account = make("CalDAV", {{"Enabled Dataclasses", Array{kCalendars, 5}}});
  account->setEnabledForDataclasses({kReminders, kMail, kReminders});
  EXPECT_EQ(storedIn(*account), Array{kReminders});
}

TEST_F(RecordDataclasses, ReplacingTheEnabledOnesByNoneThatIsSupportedRemovesTheList) {
  for (const Dataclasses& list : {Dataclasses{}, Dataclasses{kMail, kNotes}}) {
    const auto account = make("CalDAV", {{"Enabled Dataclasses", Array{kCalendars}}});
    account->setEnabledForDataclasses(list);
    EXPECT_FALSE(account->properties().contains("Enabled Dataclasses"));
    EXPECT_EQ(account->enabledDataclasses(), std::nullopt);
  }
}

}  // namespace
}  // namespace accountsettings
