#include "tests/support/change_notifications.h"

namespace tests {
namespace {

using accountsettings::ChangeType;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

TEST_F(ChangeNotifications, TellOfAnAddedAccountToTheNotifiersOfItsDataClasses) {
  const Store store = load({});
  store->insertAccount(made(exchange("a", {kMail, kCalendars})));
  save(store);
  EXPECT_THAT(whoHeard(), UnorderedElementsAre("MailNotifier", "CalendarsNotifier", "BothNotifier"));
  for (const auto& [name, changes] : heard) EXPECT_THAT(changes, ElementsAre(entry(0, "a", {})));
}

TEST_F(ChangeNotifications, TellOfADataClassSwitchedOffToItsNotifiersOnly) {
  const Store store = load({exchange("a", {kMail, kNotes})});
  store->allBasicAccounts()[0]->setEnabled_forDataclass(false, kNotes);
  save(store);
  EXPECT_THAT(whoHeard(), ElementsAre("NotesNotifier"));
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(1, "a", {kMail, kNotes})));
}

TEST_F(ChangeNotifications, TellOfADataClassSwitchedOnToItsNotifiersOnly) {
  EXPECT_THAT(whoHearsOf(exchange("a", {kMail}), [](auto& account) { account.setEnabled_forDataclass(true, kNotes); }),
              ElementsAre("NotesNotifier"));
}

TEST_F(ChangeNotifications, TellOfAnyOtherSettingToTheNotifiersOfAllEnabledDataClasses) {
  EXPECT_THAT(whoHearsOf(exchange("a", {kCalendars, kNotes}), [](auto& account) { account.setDisplayName("Home"); }),
              UnorderedElementsAre("CalendarsNotifier", "BothNotifier", "NotesNotifier"));
}

TEST_F(ChangeNotifications, TellEachNotifierOnceHoweverManyDataClassesConcernIt) {
  const Store store = load({exchange("a", {kMail, kCalendars})});
  store->allBasicAccounts()[0]->setDisplayName("Home");
  save(store);
  EXPECT_EQ(heard["BothNotifier"].size(), 1U);
}

TEST_F(ChangeNotifications, SayNothingOfChildrenAndOfTheSwitchOfTheMailApplication) {
  EXPECT_THAT(whoHearsOf(exchange("a", {kMail}, {{"IsActive", true}}),
                         [](auto& account) {
                           account.setAccountProperty_forKey(false, "IsActive");
                           account.setAccountProperty_forKey(Array{properties("c")}, "ChildAccounts");
                         }),
              IsEmpty());
}

TEST_F(ChangeNotifications, SayNothingOfAnUnchangedAccount) {
  EXPECT_THAT(whoHearsOf(exchange("a", {kMail}), [](auto&) {}), IsEmpty());
}

TEST_F(ChangeNotifications, SayNothingOfOtherSettingsWhereNoDataClassIsEnabled) {
  EXPECT_THAT(whoHearsOf(exchange("a", {}), [](auto& account) { account.setDisplayName("Home"); }), IsEmpty());
}

TEST_F(ChangeNotifications, TellOfTheLastDataClassSwitchedOffToItsNotifiersOnly) {
  EXPECT_THAT(whoHearsOf(exchange("a", {kNotes}),
                         [](auto& account) {
                           account.removeAccountPropertyForKey("Enabled Dataclasses");
                           account.setDisplayName("Home");
                         }),
              ElementsAre("NotesNotifier"));
}

TEST_F(ChangeNotifications, TakeElementsThatAreNoTextForNoDataClasses) {
  EXPECT_THAT(whoHearsOf(exchange("a", {5, kNotes}), [](auto& account) { account.setDisplayName("Home"); }),
              ElementsAre("NotesNotifier"));
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(1, "a", {5, kNotes})));
}

TEST_F(ChangeNotifications, TellOfARemovedAccountByWhatItWas) {
  const Store store = load({exchange("a", {kMail}), exchange("b", {kNotes})});
  store->deleteAccountWithIdentifier("b");
  save(store);
  EXPECT_THAT(whoHeard(), ElementsAre("NotesNotifier"));
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(2, "b", {kNotes})));
}

TEST_F(ChangeNotifications, TellOfRemovalsFirstThenOfAdditionsThenOfTheRest) {
  const Store store = load({exchange("kept", {kNotes}), exchange("removed", {kNotes})});
  store->allBasicAccounts()[0]->setDisplayName("Home");
  store->deleteAccountWithIdentifier("removed");
  store->insertAccount(made(exchange("added", {kNotes})));
  save(store);
  EXPECT_THAT(heard["NotesNotifier"],
              ElementsAre(entry(2, "removed", {kNotes}), entry(0, "added", {}), entry(1, "kept", {kNotes})));
}

TEST_F(ChangeNotifications, TellOfAReplacedAccountsRemovalOnly) {
  const Store store = load({exchange("old", {kNotes})});
  store->replaceAccount_withAccount(store->allBasicAccounts()[0], made(exchange("new", {kNotes})));
  save(store);
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(2, "old", {kNotes})));
}

TEST_F(ChangeNotifications, DescribeOnlyWhatChangedSinceTheLastSave) {
  const Store store = load({exchange("a", {kNotes}), exchange("b", {kNotes})});
  store->allBasicAccounts()[0]->setDisplayName("Home");
  store->deleteAccountWithIdentifier("b");
  save(store);
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(2, "b", {kNotes}), entry(1, "a", {kNotes})));
  save(store);
  EXPECT_THAT(whoHeard(), IsEmpty());
}

TEST_F(ChangeNotifications, TellAfterTheyWereSwitchedOffOfEverythingSinceTheyLastWent) {
  const Store store = load({exchange("a", {kNotes})});
  AccountsManager::_setShouldSkipNotifications(true);
  store->deleteAccountWithIdentifier("a");
  save(store);
  EXPECT_THAT(whoHeard(), IsEmpty());
  AccountsManager::_setShouldSkipNotifications(false);
  save(store);
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(2, "a", {kNotes})));
}

TEST_F(ChangeNotifications, TellAfterAFailedSaveOfItsChangesWithTheNext) {
  const Store store = load({exchange("a", {kNotes})});
  store->allBasicAccounts()[0]->setDisplayName("Home");
  device.files->failing = {"rename"};
  save(store);
  EXPECT_THAT(whoHeard(), IsEmpty());
  device.files->failing.clear();
  save(store);
  EXPECT_THAT(heard["NotesNotifier"], ElementsAre(entry(1, "a", {kNotes})));
}

TEST_F(ChangeNotifications, YieldNothingForAnAccountWhoseTypeIsNoTextAndFailNoSave) {
  for (const std::optional<PropertyValue>& odd : {std::optional<PropertyValue>{5}, std::optional<PropertyValue>{}}) {
    const Store store = load({exchange("a", {kNotes})});
    const Account added = made(exchange("b", {kMail}));
    added->_forcedSetAccountProperty_forKey(odd, "Type");
    store->insertAccount(added);
    save(store);
    EXPECT_EQ(fileAccounts().size(), 2U);
    EXPECT_THAT(whoHeard(), IsEmpty());
  }
}

TEST_F(ChangeNotifications, YieldNothingForATypeWithoutNotifiers) {
  Dictionary creator = notifier("CalendarsNotifier", {kCalendars});
  creator.set("Type", "FullAccount");
  putNotifiers("CalDAV", {creator, "no dictionary"});
  const Store store = load({});
  store->insertAccount(account("a", {{"Enabled Dataclasses", Array{kCalendars}}}));
  save(store);
  EXPECT_THAT(whoHeard(), IsEmpty());
  EXPECT_TRUE(device.modules->opened.empty());
}

class ChangeEntries : public ChangeNotifications {
 protected:
  static AccountsManager::NotificationTable tableOf(ChangeType change, const Dictionary* original,
                                                    const Dictionary* current) {
    AccountsManager::NotificationTable table;
    AccountsManager::initWithAccounsInfoArray({})
        ->_addNotificationToDictionary_forChangeType_originalProperties_currentProperties(table, change, original,
                                                                                          current);
    return table;
  }
  static Names keysOf(const Dictionary& dictionary) {
    Names keys;
    for (const auto& each : dictionary) keys.push_back(each.key.string());
    return keys;
  }
};

TEST_F(ChangeEntries, NameTheChangeTheAccountItsTypeAndItsFormerDataClasses) {
  const Dictionary original = exchange("a", {kNotes});
  const Dictionary changed = exchange("a", {kNotes}, {{"Port", 1}});
  const auto table = tableOf(ChangeType::present, &original, &changed);
  ASSERT_NE(table.find("NotesNotifier"), nullptr);
  EXPECT_THAT(keysOf(table.find("NotesNotifier")->front()),
              ElementsAre("ChangeType", "AccountID", "AccountType", "OriginalDataclasses"));
}

TEST_F(ChangeEntries, TakeIdentifierAndTypeFromTheOriginalWhereTheAccountHasLostThem) {
  const Dictionary original = exchange("a", {kNotes});
  const Dictionary current{{"Enabled Dataclasses", Array{kNotes}}};
  const auto table = tableOf(ChangeType::present, &original, &current);
  EXPECT_THAT(*table.find("NotesNotifier"), ElementsAre(entry(1, "a", {kNotes})));
}

TEST_F(ChangeEntries, TakeTheTypeFromTheOriginalWhereTheAccountsIsNoText) {
  const Dictionary original = exchange("a", {kNotes});
  const Dictionary current{{"Identifier", "a"}, {"Type", 5}, {"Enabled Dataclasses", Array{kNotes}}};
  const auto table = tableOf(ChangeType::present, &original, &current);
  ASSERT_NE(table.find("NotesNotifier"), nullptr);
  EXPECT_THAT(*table.find("NotesNotifier"), ElementsAre(entry(1, "a", {kNotes})));
}

TEST_F(ChangeEntries, EndAtTheFirstValueThatIsMissing) {
  const Dictionary nameless{{"Type", "Exchange"}, {"Enabled Dataclasses", Array{kNotes}}};
  EXPECT_THAT(*tableOf(ChangeType::added, nullptr, &nameless).find("NotesNotifier"),
              ElementsAre(Dictionary{{"ChangeType", 0}}));
}

TEST_F(ChangeEntries, AreMadeForNobodyWhereTheAccountHasNoType) {
  putNotifiers("", {notifier("NotesNotifier", {kNotes})});  // for a type of that name, which is not none
  const Dictionary typeless{{"Identifier", "a"}, {"Enabled Dataclasses", Array{kNotes}}};
  EXPECT_EQ(tableOf(ChangeType::added, nullptr, &typeless).find("NotesNotifier"), nullptr);
}

TEST_F(ChangeEntries, AreAppendedToWhatTheTableHolds) {
  const Dictionary account = exchange("a", {kNotes});
  auto table = tableOf(ChangeType::added, nullptr, &account);
  AccountsManager::initWithAccounsInfoArray({})
      ->_addNotificationToDictionary_forChangeType_originalProperties_currentProperties(table, ChangeType::removed,
                                                                                        &account, nullptr);
  EXPECT_THAT(*table.find("NotesNotifier"), ElementsAre(entry(0, "a", {}), entry(2, "a", {kNotes})));
}

TEST_F(ChangeNotifications, FindNotifiersInTheOrderOfTheConfigurationAndOpenTheirModulesEachTime) {
  const auto find = [] { return AccountsManager::_notifierClassNamesForAccountType_dataclass("Exchange", kCalendars); };
  EXPECT_THAT(find(), ElementsAre("CalendarsNotifier", "BothNotifier"));
  EXPECT_THAT(find(), ElementsAre("CalendarsNotifier", "BothNotifier"));
  EXPECT_EQ(device.modules->opened, Names(4, "/Modules/Test"));
}

TEST_F(ChangeNotifications, TellOfASingleChangeBeforeAndAfterIt) {
  Names told;
  auto listener = std::make_shared<AccountClassInfo>("Listener");
  const auto telling = [&told](const char* when) {
    return [&told, when](std::string_view identifier, std::string_view dataclass) {
      told.push_back(when + std::string{identifier} + " " + std::string{dataclass});
    };
  };
  listener->accountWillChange_forDataclass = telling("will ");
  listener->accountDidChange_forDataclass = telling("did ");
  const platform::ClassRegistration registration{std::move(listener)};
  putNotifiers("Exchange", {notifier("Listener", {kMail})});
  const Account account = made(exchange("a", {kMail}));
  AccountsManager::accountWillChange_forDataclass(*account, kMail);
  AccountsManager::accountDidChange_forDataclass(*account, kMail);
  AccountsManager::accountWillChange_forDataclass(*account, kNotes);
  EXPECT_THAT(told, ElementsAre("will a com.vorlix.Dataclass.Mail", "did a com.vorlix.Dataclass.Mail"));
}

}  // namespace
}  // namespace tests
