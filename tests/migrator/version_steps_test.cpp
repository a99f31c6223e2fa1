#include <cstdint>
#include <limits>

#include "platform/run_observer.h"
#include "tests/support/step_test.h"

namespace migrator {
namespace {

using accountsettings::kCurrentVersion;
using tests::account;

// The releases of the three generations, of which it is known when each step saves; every later step saves once.
const std::vector<std::string> kReleases{"7A149", "7A150", "7A153", "7A241", "7A242", "8A293",
                                         "8B117", "8C136", "8F191", "9A182", "9A334", "9B176"};
const auto kLaterSaves = static_cast<std::ptrdiff_t>(kCurrentVersion - kReleases.size());

class Stages final : public platform::RunObserver {
 public:
  explicit Stages(std::shared_ptr<AccountsManager>& store) : _store{store} {}
  std::vector<std::string> steps;
  std::vector<std::string> words;       // of each step
  std::vector<std::uint64_t> versions;  // of the store, after each step

  void stageBegan(std::string_view stage, std::string_view itsWords) override {
    if (isSave(stage)) return;
    steps.emplace_back(stage);
    words.emplace_back(itsWords);
  }
  void stageEnded(std::string_view stage) override {
    if (!isSave(stage)) versions.push_back(_store->dataVersion());
  }

 private:
  static bool isSave(std::string_view stage) { return stage == "save"; }

  std::shared_ptr<AccountsManager>& _store;
};

class Dispatch : public tests::StepTest {
 protected:
  Dispatch() { device.setObserver(stages); }

  void expectStepsFrom(std::size_t first) const {
    std::vector<std::string> expected;
    for (const auto& step : AccountsDataMigrator::versionSteps().subspan(first)) expected.emplace_back(step.name);
    EXPECT_EQ(stages->steps, expected);
  }

  std::shared_ptr<Stages> stages = std::make_shared<Stages>(store);
};

TEST(VersionSteps, BeginWithThoseOfTheThreeGenerations) {
  for (std::size_t step = 0; step < kReleases.size(); ++step) {
    EXPECT_EQ(AccountsDataMigrator::versionSteps()[step].name, "_migrateAccountsFrom" + kReleases[step] + ":");
  }
}

struct Entry {
  PropertyValue version;
  std::size_t firstStep;
  std::ptrdiff_t saves;
};

void PrintTo(const Entry& entry, std::ostream* stream) { PrintTo(entry.version, stream); }

class DispatchOfAStoredVersion : public Dispatch, public testing::WithParamInterface<Entry> {};

TEST_P(DispatchOfAStoredVersion, EntersTheChainAtTheStepOfThatVersion) {
  load({account("LDAP", "LDAPAccount", "L")}, GetParam().version);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  expectStepsFrom(GetParam().firstStep);
  EXPECT_EQ(saves(), GetParam().saves + kLaterSaves);
  EXPECT_EQ(store->dataVersion(), kCurrentVersion);
}

INSTANTIATE_TEST_SUITE_P(EveryVersion, DispatchOfAStoredVersion,
                         testing::Values(Entry{0, 0, 6}, Entry{1, 1, 6}, Entry{2, 2, 6}, Entry{3, 3, 6}, Entry{4, 4, 6},
                                         Entry{5, 5, 6}, Entry{6, 6, 6}, Entry{7, 7, 5}, Entry{8, 8, 4}, Entry{9, 9, 3},
                                         Entry{10, 10, 2}, Entry{11, 11, 1}));

INSTANTIATE_TEST_SUITE_P(OddVersions, DispatchOfAStoredVersion,
                         testing::Values(Entry{"7", 7, 5}, Entry{"11 and more", 11, 1}, Entry{"twelve", 0, 6},
                                         Entry{"", 0, 6}, Entry{9.99, 9, 3}, Entry{-0.5, 0, 6}, Entry{true, 0, 6},
                                         Entry{Array{7}, 0, 6}, Entry{Dictionary{{"Version", 7}}, 0, 6},
                                         Entry{platform::Date{7}, 0, 6}));

TEST_P(DispatchOfAStoredVersion, ReadsTheVersionAsTheStoreDoes) {
  load({}, GetParam().version);
  EXPECT_EQ(store->dataVersion(), GetParam().firstStep);
}

class DispatchOfAVersionWithoutSteps : public Dispatch, public testing::WithParamInterface<PropertyValue> {};

TEST_P(DispatchOfAVersionWithoutSteps, LeavesTheFileAndItsVersionAlone) {
  load({account("LDAP", "LDAPAccount", "L")}, GetParam());
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  expectStepsFrom(kCurrentVersion);
  EXPECT_EQ(saves(), 0);
  EXPECT_GE(store->dataVersion(), kCurrentVersion);
}

INSTANTIATE_TEST_SUITE_P(CurrentOrNewer, DispatchOfAVersionWithoutSteps,
                         testing::Values(kCurrentVersion, kCurrentVersion + 1, -1,
                                         std::numeric_limits<std::int64_t>::min(),
                                         std::numeric_limits<std::int64_t>::max(),
                                         std::numeric_limits<std::uint64_t>::max(), "-3"));

TEST_F(Dispatch, TellsPeopleBetweenWhichVersionsEachStepLies) {
  load({account("LDAP", "LDAPAccount", "L")}, 9);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  ASSERT_GE(stages->words.size(), 2U);
  const auto steps = AccountsDataMigrator::versionSteps();
  EXPECT_EQ(stages->words[0], "version 9 to 10: " + std::string{steps[9].words});
  EXPECT_EQ(stages->words[1], "version 10 to 11: " + std::string{steps[10].words});
}

TEST_F(Dispatch, RunsAllStepsForAFileWithoutAVersion) {
  putSettings({{"Accounts", Array{account("LDAP", "LDAPAccount", "L")}}});
  store = AccountsManager::initInsideOfMigration();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  expectStepsFrom(0);
  EXPECT_EQ(store->dataVersion(), kCurrentVersion);
}

TEST_F(Dispatch, RunsAllStepsWhereThereIsNoFile) {
  store = AccountsManager::initInsideOfMigration();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  expectStepsFrom(0);
}

TEST_F(Dispatch, GoesByTheFileAndNotByTheStore) {
  load({}, 11);
  store->setDataVersion(3);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  expectStepsFrom(11);
}

TEST_F(Dispatch, LeavesTheStampAtSixUntilTheLastStepOfTheSecondGeneration) {
  load({}, 6);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  stages->versions.resize(6);
  EXPECT_EQ(stages->versions, (std::vector<std::uint64_t>{6, 6, 9, 10, 11, 12}));
}

// What each message says before the account that it describes.
std::vector<std::string> headsOf(std::vector<std::string> messages) {
  for (std::string& message : messages) message.resize(std::min(message.size(), message.find(" {")));
  return messages;
}

TEST_F(Dispatch, SaysInTheLogWhatTheStepsDoInTheirOrder) {
  const Dictionary principal{{"Login_Key", "jane"}, {"CalDAV_Server_Key", "www.google.com"}};
  const Dictionary path{{"CalDAV_PrincipalPath_Key", "/calendar/dav/jane/user"}};
  load({account("Mail", "GmailAccount", "G", {{"Username", "jane"}}),
        account("CalDAV", "MobileCalDAVAccount", "C",
                {{"CalDAVPrincipalConfiguration", principal}, {"CalDAVAccountConfiguration", path}})});
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  std::vector<std::string> expected{"Replacing accounts", "Replacing accounts",  // identifiers
                                    "Replacing accounts",                        // the on-device account
                                    "Replacing accounts", "Deleting account:"};  // hosted notes; the folded partner
  for (std::ptrdiff_t save = 0; save < 6 + kLaterSaves; ++save) {
    expected.emplace_back("Saving all accounts");
    for (const std::string type : {"Gmail", "OnMyDevice"}) {
      expected.insert(expected.end(),
                      {"Merging inmem", "Merged to", "Calculated Properties - Type: " + type + ", Properties:"});
    }
  }
  EXPECT_EQ(headsOf(device.logMessages()), expected);
}

TEST_F(Dispatch, LeavesStoreAndFileOfACurrentVersionAlone) {
  load({account("Mail", "IMAPAccount", "M", {{"uniqueId", "U"}})}, kCurrentVersion);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_EQ(value(0, "Identifier"), PropertyValue{"M"});
  EXPECT_TRUE(device.outputs.empty());
}

TEST_F(Dispatch, ReadsTheFileOnceForTheVersionAndOnceForTheReport) {
  load({}, kCurrentVersion);
  device.propertyLists->reads.clear();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  const tests::Path file = AccountsManager::fullPathToAccountSettingsPlist();
  EXPECT_EQ(device.propertyLists->reads, (std::vector<tests::Path>{file, file}));
}

class DispatchWithAReport : public Dispatch {
 protected:
  DispatchWithAReport() {
    device.preferences->switches[{"com.vorlix.accountsettings-logging", "ASSaveMigrationInformation"}] = true;
    migrator._collatedMigrationData.emplace();
  }
  [[nodiscard]] PropertyValue collected() const {
    const PropertyValue* const entry = migrator._collatedMigrationData->find("OldAccountSettings");
    return entry != nullptr ? *entry : tests::kAbsent;
  }
};

TEST_F(DispatchWithAReport, CollectsTheFileAsItWasBeforeAnyStep) {
  const Dictionary settings{{"Accounts", Array{account("Mail", "IMAPAccount", "M", {{"uniqueId", "U"}})}},
                            {"Version", 0},
                            {"Written By", "somebody"}};
  putSettings(settings);
  store = AccountsManager::initInsideOfMigration();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_EQ(collected(), PropertyValue{settings});
  EXPECT_NE(device.dictionaryAt(AccountsManager::fullPathToAccountSettingsPlist()), settings);
}

TEST_F(DispatchWithAReport, CollectsAnEmptyDictionaryForAFileThatCannotBeRead) {
  device.files->put(AccountsManager::fullPathToAccountSettingsPlist(), "no property list");
  store = AccountsManager::initInsideOfMigration();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_EQ(collected(), PropertyValue{Dictionary{}});
}

TEST_F(DispatchWithAReport, CollectsTheFileAlsoWhereNoStepRuns) {
  load({}, kCurrentVersion);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_EQ(collected(), (PropertyValue{Dictionary{{"Version", kCurrentVersion}, {"Accounts", Array{}}}}));
}

TEST_F(Dispatch, CollectsNothingWhereNoReportIsWanted) {
  load({}, 11);
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_FALSE(migrator._collatedMigrationData.has_value());
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator._migrateNewAccountsInfo(*store));
  EXPECT_TRUE(migrator._collatedMigrationData->empty());
}

TEST_F(Dispatch, FindsTheSettingsFileByItsPathAlone) {
  EXPECT_FALSE(AccountsDataMigrator::_newAccountsInformationPresent());
  device.files->put(AccountsManager::fullPathToAccountSettingsPlist(), "no property list");
  EXPECT_TRUE(AccountsDataMigrator::_newAccountsInformationPresent());
}

struct Stamp {
  std::string_view release;
  bool (AccountsDataMigrator::*step)(AccountsManager&);
  std::uint64_t version;
  std::ptrdiff_t saves;
};

void PrintTo(const Stamp& stamp, std::ostream* stream) { *stream << stamp.release; }

constexpr std::uint64_t kNoStamp = 99;

class EveryStep : public tests::StepTest, public testing::WithParamInterface<Stamp> {};

TEST_P(EveryStep, StampsItsVersionAndSavesAsItsReleaseDid) {
  load({account("LDAP", "LDAPAccount", "L")});
  store->setDataVersion(kNoStamp);
  EXPECT_TRUE((migrator.*GetParam().step)(*store));
  EXPECT_EQ(store->dataVersion(), GetParam().version);
  EXPECT_EQ(saves(), GetParam().saves);
}

TEST_P(EveryStep, ThatSavesDoesSoWithItsStamp) {
  load({account("LDAP", "LDAPAccount", "L")});
  store->setDataVersion(kNoStamp);
  std::vector<std::uint64_t> versionsAtSave;
  device.propertyLists->beforeRead = [&](const tests::Path& file) {
    if (file == AccountsManager::fullPathToAccountSettingsPlist()) versionsAtSave.push_back(store->dataVersion());
  };
  EXPECT_TRUE((migrator.*GetParam().step)(*store));
  const auto saves = static_cast<std::size_t>(GetParam().saves);
  EXPECT_EQ(versionsAtSave, std::vector<std::uint64_t>(saves, GetParam().version));
}

TEST_P(EveryStep, LeavesAnAccountAloneThatNoStepNames) {
  const Dictionary directory = account("LDAP", "LDAPAccount", "L", {{"uniqueId", "U"}, {"IsActive", true}, {"X", 1.5}});
  load({directory});
  EXPECT_TRUE((migrator.*GetParam().step)(*store));
  EXPECT_EQ(at(0).properties(), directory);
}

TEST_P(EveryStep, DoesNothingWithAnEmptyStoreButAddTheOnDeviceAccount) {
  load({});
  EXPECT_TRUE((migrator.*GetParam().step)(*store));
  EXPECT_EQ(store->count(), GetParam().version == 3 ? 1U : 0U);
}

INSTANTIATE_TEST_SUITE_P(ByRelease, EveryStep,
                         testing::Values(Stamp{"7A149", &AccountsDataMigrator::_migrateAccountsFrom7A149, 1, 0},
                                         Stamp{"7A150", &AccountsDataMigrator::_migrateAccountsFrom7A150, 2, 0},
                                         Stamp{"7A153", &AccountsDataMigrator::_migrateAccountsFrom7A153, 3, 0},
                                         Stamp{"7A241", &AccountsDataMigrator::_migrateAccountsFrom7A241, 4, 0},
                                         Stamp{"7A242", &AccountsDataMigrator::_migrateAccountsFrom7A242, 5, 0},
                                         Stamp{"8A293", &AccountsDataMigrator::_migrateAccountsFrom8A293, 6, 0},
                                         Stamp{"8B117", &AccountsDataMigrator::_migrateAccountsFrom8B117, kNoStamp, 1},
                                         Stamp{"8C136", &AccountsDataMigrator::_migrateAccountsFrom8C136, kNoStamp, 1},
                                         Stamp{"8F191", &AccountsDataMigrator::_migrateAccountsFrom8F191, 9, 1},
                                         Stamp{"9A182", &AccountsDataMigrator::_migrateAccountsFrom9A182, 10, 1},
                                         Stamp{"9A334", &AccountsDataMigrator::_migrateAccountsFrom9A334, 11, 1},
                                         Stamp{"9B176", &AccountsDataMigrator::_migrateAccountsFrom9B176, 12, 1}));

}  // namespace
}  // namespace migrator
