#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <latch>
#include <thread>

#include "accountsettings/basic_account.h"
#include "tests/support/account_configuration.h"
#include "tests/support/assertion_failures.h"

namespace accountsettings {
namespace {

using Actions = BasicAccount::Actions;
using Dataclasses = BasicAccount::Dataclasses;

const char* const kTypesFile = "/resources/AccountTypesProperties.plist";
const char* const kDataclassesFile = "/resources/DataclassesProperties.plist";
const char* const kCreatorsFile = "/resources/AccountCreators.plist";

class Configuration : public testing::Test {
 protected:
  // Asks from many threads at the same moment.
  template <typename Question>
  static void askAtOnce(Question question) {
    constexpr int kThreads = 16;
    std::latch start{kThreads};
    std::vector<std::thread> threads;
    for (int count = 0; count < kThreads; ++count) {
      threads.emplace_back([&start, &question] {
        start.arrive_and_wait();
        question();
      });
    }
    for (std::thread& thread : threads) thread.join();
  }
  [[nodiscard]] std::ptrdiff_t readsOf(const char* path) const {
    return std::count(device.propertyLists->reads.begin(), device.propertyLists->reads.end(), platform::Path{path});
  }
  void putTypes(const Dictionary& types) { device.put(kTypesFile, types); }
  void putSupported(const Array& dataclasses) {
    putTypes({{"Mail", Dictionary{{"Supported Dataclasses", dataclasses}}}});
  }
  [[nodiscard]] static Dataclasses supported() {
    const Dataclasses* const list = BasicAccount::supportedDataclassesForAccountType("Mail");
    return list == nullptr ? Dataclasses{"no list"} : *list;
  }

  tests::FakeDevice device;
};

TEST_F(Configuration, WithoutTheTypesFileEndsTheFirstUse) {
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::initialize(); });
  EXPECT_EQ(failure.message(), "Could not find AccountTypesProperties.plist");
  EXPECT_EQ(failure.method(), "+[BasicAccount initialize]");
  EXPECT_EQ(failure.file(), "BasicAccount");
}

TEST_F(Configuration, WithAnUnreadableTypesFileEndsTheFirstUse) {
  device.files->put(kTypesFile, "no property list");
  const AssertionFailure failure = tests::failureOf([] { BasicAccount::initialize(); });
  EXPECT_STREQ(failure.what(),
               "Assertion failure in +[BasicAccount initialize], BasicAccount: Could not load the dataclasses "
               "configuration file");
}

TEST_F(Configuration, IsNeededByEveryQuestionAboutATypeAndByEveryRecord) {
  const std::vector<std::function<void()>> uses{
      [] { static_cast<void>(BasicAccount::_isValidAccountType("")); },
      [] { static_cast<void>(BasicAccount::supportedDataclassesForAccountType("Mail")); },
      [] { static_cast<void>(BasicAccount::userActionsToEnableDataclass_forAccountType("D", "Mail")); },
      [] { static_cast<void>(BasicAccount::userActionsToDisableDataclass_forAccountType("D", "Mail")); },
      [] { static_cast<void>(BasicAccount::deleteAccountActionsForAccountType("Mail")); },
      [] { static_cast<void>(BasicAccount::showRemindersSeparatelyForAccountType("Mail")); },
      [] {
        BasicAccount::initWithProperties({{"Type", "Mail"}, {"Class", "X"}});
      },
      [] { BasicAccount::accountWithType_class("Mail", "X"); }};
  for (const auto& use : uses) {
    EXPECT_EQ(tests::failureOf(use).message(), "Could not find AccountTypesProperties.plist");
  }
}

TEST_F(Configuration, IsLoadedByTheOperationsThatNeedItAndNotByTheFirstUseOfTheClass) {
  EXPECT_EQ(BasicAccount::allSupportedDataclasses().size(), 14U);
  EXPECT_TRUE(BasicAccount::createNewAccountUID());
  EXPECT_TRUE(BasicAccount::isMultitaskingEnabled());
  EXPECT_EQ(BasicAccount::_orderedDataclasses({}), Dataclasses{});
  EXPECT_EQ(BasicAccount::removeActionsIncompatibleWithSingleStoreDataclass({}), Actions{});
  EXPECT_EQ(tests::failureOf([] { BasicAccount::init(); }).message(), "Don't use this method");
  EXPECT_TRUE(device.propertyLists->reads.empty());
}

TEST_F(Configuration, IsTriedAgainAfterAFailure) {
  EXPECT_THROW(BasicAccount::initialize(), AssertionFailure);
  putSupported({kAccountDataclassMail});
  EXPECT_TRUE(BasicAccount::_isValidAccountType("Mail"));
}

TEST_F(Configuration, OfTypesIsReadOnceAndNeverAgain) {
  putSupported({kAccountDataclassMail});
  BasicAccount::initialize();
  putTypes({});
  BasicAccount::initialize();
  EXPECT_TRUE(BasicAccount::_isValidAccountType("Mail"));
  EXPECT_EQ(readsOf(kTypesFile), 1);
}

TEST_F(Configuration, OfTypesIsReadOnceThoughManyThreadsAsk) {
  putSupported({kAccountDataclassMail});
  askAtOnce([] { EXPECT_EQ(supported(), Dataclasses{kAccountDataclassMail}); });
  EXPECT_EQ(readsOf(kTypesFile), 1);
}

TEST_F(Configuration, OfDataclassesIsReadOnceThoughManyThreadsAsk) {
  device.put(kDataclassesFile, Dictionary{{"D", Dictionary{{"Supports Multiple Stores", true}}}});
  askAtOnce([] { EXPECT_TRUE(BasicAccount::multipleStoresSupportedByDataclass("D")); });
  EXPECT_EQ(readsOf(kDataclassesFile), 1);
}

TEST_F(Configuration, KeepsTheKnownDataclassesInTheFilesOrder) {
  putSupported({kAccountDataclassNotes, "com.vorlix.Dataclass.Unknown", kAccountDataclassMail, 5});
  EXPECT_EQ(supported(), (Dataclasses{kAccountDataclassNotes, kAccountDataclassMail}));
}

TEST_F(Configuration, KeepsAllFourteenDataclassesAsTheLibrarysOwnConstants) {
  Array all;
  for (const Text& dataclass : BasicAccount::allSupportedDataclasses()) all.emplace_back(dataclass.string());
  putSupported(all);
  EXPECT_EQ(supported(), BasicAccount::allSupportedDataclasses());
  EXPECT_EQ(supported().front().view().data(), BasicAccount::allSupportedDataclasses().front().view().data());
}

TEST_F(Configuration, KeepsAListOfWhichNothingIsKnownAsItStands) {
  putSupported({"X", 5, "Y", "X"});
  EXPECT_EQ(supported(), (Dataclasses{"X", "Y", "X"}));
}

TEST_F(Configuration, KeepsAnEmptyListAndHasNoneWhereThereIsNone) {
  putTypes({{"SMTP", Dictionary{{"Supported Dataclasses", Array{}}}},
            {"Mail", Dictionary{}},
            {"Gmail", Dictionary{{"Supported Dataclasses", "odd"}}}});
  EXPECT_EQ(*BasicAccount::supportedDataclassesForAccountType("SMTP"), Dataclasses{});
  EXPECT_EQ(BasicAccount::supportedDataclassesForAccountType("Mail"), nullptr);
  EXPECT_EQ(BasicAccount::supportedDataclassesForAccountType("Gmail"), nullptr);
  EXPECT_EQ(BasicAccount::supportedDataclassesForAccountType("Unknown"), nullptr);
}

TEST_F(Configuration, DropsNotesOnADeviceWithoutMultitasking) {
  device.deviceInfo->answers.emplace("CPUArchitecture", "armv6");
  putSupported({kAccountDataclassNotes, kAccountDataclassMail});
  EXPECT_EQ(supported(), Dataclasses{kAccountDataclassMail});
}

TEST_F(Configuration, KeepsNotesOnADeviceWithoutMultitaskingWhereATypeSupportsNothingElse) {
  device.deviceInfo->answers.emplace("CPUArchitecture", "armv6");
  putSupported({kAccountDataclassNotes});
  EXPECT_EQ(supported(), Dataclasses{kAccountDataclassNotes});
}

TEST_F(Configuration, KnowsMultitaskingToBeMissingOnOneArchitectureOnly) {
  EXPECT_TRUE(BasicAccount::isMultitaskingEnabled());
  for (const PropertyValue& other : {PropertyValue{"armv7"}, PropertyValue{"ARMV6"}, PropertyValue{6}}) {
    device.deviceInfo->answers.insert_or_assign("CPUArchitecture", other);
    EXPECT_TRUE(BasicAccount::isMultitaskingEnabled());
  }
  device.deviceInfo->answers.insert_or_assign("CPUArchitecture", "armv6");
  EXPECT_FALSE(BasicAccount::isMultitaskingEnabled());
}

TEST_F(Configuration, KnowsATypeExactlyByItsName) {
  putTypes({{"Exchange", Dictionary{}}, {"Odd", 5}, {"", Dictionary{}}});
  EXPECT_TRUE(BasicAccount::_isValidAccountType("Exchange"));
  EXPECT_TRUE(BasicAccount::_isValidAccountType("Odd"));
  EXPECT_FALSE(BasicAccount::_isValidAccountType("exchange"));
  EXPECT_FALSE(BasicAccount::_isValidAccountType(""));
}

TEST_F(Configuration, ListsEveryTypeOfTheFile) {
  putTypes({{"Exchange", Dictionary{}}, {"Odd", 5}});
  EXPECT_THAT(BasicAccount::accountTypes(), testing::UnorderedElementsAre(Text{"Exchange"}, Text{"Odd"}));
}

class ConfigurationOfActions : public Configuration {
 protected:
  ConfigurationOfActions() {
    putTypes({{"CalDAV", Dictionary{{"Enable Actions", Array{"Keep Local Data", "Merge Local Data", "Keep Local Data"}},
                                    {"Disable Actions", Array{"Keep Local Data", 5, "Delete Local Data"}},
                                    {"Delete Account Actions", Array{"Delete Data"}},
                                    {"Show Reminders Separately", true}}},
              {"Mail", Dictionary{{"Show Reminders Separately", false}}}});
  }
  void putDataclasses() {
    device.put(kDataclassesFile, Dictionary{{"Many", Dictionary{{"Supports Multiple Stores", true}}},
                                            {"One", Dictionary{{"Supports Multiple Stores", false}}},
                                            {"Odd", "no dictionary"}});
  }
};

TEST_F(ConfigurationOfActions, OffersAllActionsForADataclassWithSeveralStores) {
  putDataclasses();
  EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType("Many", "CalDAV"),
            (Actions{"Keep Local Data", "Merge Local Data", "Keep Local Data"}));
  EXPECT_EQ(BasicAccount::userActionsToDisableDataclass_forAccountType("Many", "CalDAV"),
            (Actions{"Keep Local Data", "Delete Local Data"}));
}

TEST_F(ConfigurationOfActions, WithdrawsTheLastKeepLocalDataForADataclassWithOneStore) {
  putDataclasses();
  for (const std::string_view dataclass : {"One", "Odd", "Absent"}) {
    EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType(dataclass, "CalDAV"),
              (Actions{"Keep Local Data", "Merge Local Data"}));
    EXPECT_EQ(BasicAccount::userActionsToDisableDataclass_forAccountType(dataclass, "CalDAV"),
              Actions{"Delete Local Data"});
  }
}

TEST_F(ConfigurationOfActions, TakesEveryDataclassToHaveOneStoreWithoutTheDataclassesFile) {
  EXPECT_EQ(BasicAccount::userActionsToDisableDataclass_forAccountType("Many", "CalDAV"), Actions{"Delete Local Data"});
  EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType("Many", "CalDAV"),
            (Actions{"Keep Local Data", "Merge Local Data"}));
}

TEST_F(ConfigurationOfActions, RemovesOneKeepLocalDataOnly) {
  using Row = std::pair<Actions, Actions>;
  for (const auto& [given, expected] : {
           Row{{"Keep Local Data", "None", "Keep Local Data", "None"}, {"Keep Local Data", "None", "None"}},
           Row{{"Keep Local Data"}, {}},
           Row{{"None", "keep local data"}, {"None", "keep local data"}},
           Row{{}, {}},
       }) {
    EXPECT_EQ(BasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(given), expected);
  }
}

TEST_F(ConfigurationOfActions, OffersTheTypesActionsWhenAnAccountIsDeleted) {
  EXPECT_EQ(BasicAccount::deleteAccountActionsForAccountType("CalDAV"), Actions{"Delete Data"});
}

TEST_F(ConfigurationOfActions, SaysWhetherRemindersAreShownSeparately) {
  EXPECT_TRUE(BasicAccount::showRemindersSeparatelyForAccountType("CalDAV"));
  EXPECT_FALSE(BasicAccount::showRemindersSeparatelyForAccountType("Mail"));
}

TEST_F(ConfigurationOfActions, AnswersNothingForAnUnknownTypeAndForOneWithoutActions) {
  for (const std::string_view type : {"Unknown", "Mail"}) {
    EXPECT_EQ(BasicAccount::userActionsToEnableDataclass_forAccountType("Many", type), std::nullopt);
    EXPECT_EQ(BasicAccount::userActionsToDisableDataclass_forAccountType("Many", type), std::nullopt);
    EXPECT_EQ(BasicAccount::deleteAccountActionsForAccountType(type), std::nullopt);
    EXPECT_FALSE(BasicAccount::showRemindersSeparatelyForAccountType(type));
  }
}

TEST_F(Configuration, AnswersEachQuestionAboutADataclassFromItsOwnKey) {
  device.put(kDataclassesFile, Dictionary{{"Stores", Dictionary{{"Supports Multiple Stores", true}}},
                                          {"Switch", Dictionary{{"Display Dataclass Switch", true}}},
                                          {"Confirm", Dictionary{{"Requires User Confirmation", "YES"}}}});
  for (const std::string_view dataclass : {"Stores", "Switch", "Confirm", "Absent"}) {
    EXPECT_EQ(BasicAccount::multipleStoresSupportedByDataclass(dataclass), dataclass == "Stores");
    EXPECT_EQ(BasicAccount::displayToggleForDataclass(dataclass), dataclass == "Switch");
    EXPECT_EQ(BasicAccount::userConfirmationIsRequiredByDataclass(dataclass), dataclass == "Confirm");
  }
}

TEST_F(Configuration, TakesAnAnswerThatIsNoTruthValueForNo) {
  device.put(kDataclassesFile, Dictionary{{"Stores", Dictionary{{"Supports Multiple Stores", Array{true}}}}});
  EXPECT_FALSE(BasicAccount::multipleStoresSupportedByDataclass("Stores"));
}

TEST_F(Configuration, WithoutTheDataclassesFileEveryAnswerIsFalseForTheWholeLifeOfTheProcess) {
  EXPECT_FALSE(BasicAccount::multipleStoresSupportedByDataclass(kAccountDataclassNotes));
  device.put(kDataclassesFile, Dictionary{{kAccountDataclassNotes, Dictionary{{"Supports Multiple Stores", true}}}});
  EXPECT_FALSE(BasicAccount::multipleStoresSupportedByDataclass(kAccountDataclassNotes));
  EXPECT_FALSE(BasicAccount::displayToggleForDataclass(kAccountDataclassNotes));
  EXPECT_FALSE(BasicAccount::userConfirmationIsRequiredByDataclass(kAccountDataclassNotes));
}

TEST_F(Configuration, HandsOutTheDataclassesAndCreatorsFilesAfresh) {
  EXPECT_EQ(BasicAccount::_dataclassesProperties(), std::nullopt);
  EXPECT_EQ(BasicAccount::_creatorsInfo(), std::nullopt);
  device.put(kDataclassesFile, Dictionary{{"D", true}});
  device.put(kCreatorsFile, Dictionary{{"C", true}});
  EXPECT_EQ(BasicAccount::_dataclassesProperties(), (Dictionary{{"D", true}}));
  EXPECT_EQ(BasicAccount::_creatorsInfo(), (Dictionary{{"C", true}}));
}

TEST_F(Configuration, OfCreatorsIsTriedAgainUntilItCanBeReadAndKeptThen) {
  EXPECT_EQ(BasicAccount::_accountCreationMap(), nullptr);
  device.put(kCreatorsFile, Dictionary{{"Mail", Array{}}});
  const Dictionary* const kept = BasicAccount::_accountCreationMap();
  device.put(kCreatorsFile, Dictionary{});
  EXPECT_EQ(BasicAccount::_accountCreationMap(), kept);
  EXPECT_TRUE(kept->contains("Mail"));
  EXPECT_EQ(readsOf(kCreatorsFile), 2);
}

}  // namespace
}  // namespace accountsettings
