#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "migrator/accounts_data_migrator.h"
#include "tests/support/fact_recorder.h"
#include "tests/support/migration_device.h"

using namespace tests;
using migrator::AccountsDataMigrator;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

namespace {

const std::string kSaving = "Saving collated migration information";

class MigrationRecords : public testing::Test {
 protected:
  MigrationDevice device;
  AccountsDataMigrator migrator;
};

TEST_F(MigrationRecords, TellWhereTheSettingsFileIsCopiedTo) {
  const auto recorder = std::make_shared<FactRecorder>();
  device.setObserver(recorder);
  device.files->put(kSettingsFile, "whatever it holds");
  migrator._copyAsideAccountsPlist();
  ASSERT_EQ(recorder->facts.size(), 1U);
  EXPECT_EQ(std::get<records::CopiedAside>(recorder->facts[0]).file, kSettingsCopy.string());
}

TEST_F(MigrationRecords, SettingsFileIsCopiedAsideByteForByte) {
  device.files->put(kSettingsFile, "whatever it holds");
  migrator._copyAsideAccountsPlist();
  EXPECT_EQ(device.files->contents(kSettingsCopy), "whatever it holds");
  EXPECT_EQ(device.files->contents(kSettingsFile), "whatever it holds");
  EXPECT_THAT(device.outputs, IsEmpty());
}

TEST_F(MigrationRecords, CopyTakesThePlaceOfAnEarlierOne) {
  device.files->put(kSettingsFile, "new");
  device.files->put(kSettingsCopy, "old");
  migrator._copyAsideAccountsPlist();
  EXPECT_EQ(device.files->contents(kSettingsCopy), "new");
  EXPECT_THAT(device.outputs, IsEmpty());
}

TEST_F(MigrationRecords, CopyLiesWithTheSharedResourcesAndTheReportInTheHomeDirectory) {
  device.directories->shared = "/shared";
  device.directories->homeDirectory = "/home";
  device.files->putDirectory("/shared/Library/Logs/CrashReporter");
  device.files->put(kSettingsFile, "settings");
  migrator._copyAsideAccountsPlist();
  EXPECT_TRUE(device.files->exists("/shared/Library/Logs/CrashReporter/com.vorlix.accountsettings.plist"));
  migrator._saveCollatedMigrationInformation();
  EXPECT_TRUE(device.files->exists("/home/Library/Logs/CrashReporter/AccountMigration"));
}

TEST_F(MigrationRecords, EarlierCopyThatCannotBeRemovedIsReportedAndThenInTheWay) {
  device.files->put(kSettingsFile, "new");
  device.files->put(kSettingsCopy, "old");
  device.files->failing.insert("remove " + kSettingsCopy.string());
  migrator._copyAsideAccountsPlist();
  EXPECT_EQ(device.files->contents(kSettingsCopy), "old");
  EXPECT_THAT(device.console->lines,
              ElementsAre("Couldn't remove existing accountsettings copy at " + kSettingsCopy.string(),
                          "Error trying to save an accountsettings plist copy: Could not copy to " +
                              kSettingsCopy.string() + ": File exists (errno 17)"));
}

TEST_F(MigrationRecords, MissingSettingsFileIsReported) {
  migrator._copyAsideAccountsPlist();
  EXPECT_THAT(device.console->lines, ElementsAre("Error trying to save an accountsettings plist copy: Could not copy " +
                                                 kSettingsFile.string() + ": No such file or directory (errno 2)"));
}

TEST_F(MigrationRecords, AreOffUnlessTheSwitchSaysOtherwise) {
  EXPECT_FALSE(AccountsDataMigrator::_saveMigrationInformation());
  EXPECT_THAT(device.preferences->synchronized, ElementsAre("com.vorlix.accountsettings-logging"));
}

TEST_F(MigrationRecords, AreOnWhereTheSwitchIs) {
  device.switchRecordsOn();
  EXPECT_TRUE(AccountsDataMigrator::_saveMigrationInformation());
}

TEST_F(MigrationRecords, SwitchIsReadOncePerProcess) {
  EXPECT_FALSE(AccountsDataMigrator::_saveMigrationInformation());
  device.switchRecordsOn();
  EXPECT_FALSE(AccountsDataMigrator::_saveMigrationInformation());
  EXPECT_EQ(device.preferences->reads, 1);
  EXPECT_EQ(device.preferences->synchronized.size(), 1U);
}

TEST_F(MigrationRecords, ReportHoldsWhatWasCollatedAndTheSavedSettings) {
  migrator._collatedMigrationData = Dictionary{{"OldMailAccounts", Dictionary{{"a", 1}}}};
  device.putSettings(accountsettings::kCurrentVersion, {});
  migrator._saveCollatedMigrationInformation();
  const Dictionary expected{{"OldMailAccounts", Dictionary{{"a", 1}}},
                            {"NewAccounSettings", device.dictionaryAt(kSettingsFile)}};
  EXPECT_EQ(device.dictionaryAt(kReportFile), expected);
  EXPECT_THAT(device.console->lines, ElementsAre(kSaving));
}

TEST_F(MigrationRecords, ReportHoldsAnEmptyDictionaryForSettingsThatCannotBeRead) {
  migrator._collatedMigrationData.emplace();
  migrator._saveCollatedMigrationInformation();
  EXPECT_EQ(device.dictionaryAt(kReportFile), (Dictionary{{"NewAccounSettings", Dictionary{}}}));
}

TEST_F(MigrationRecords, ReportIsNamedAfterTheLocalTimeAndReplacesOneOfTheSameName) {
  migrator._collatedMigrationData.emplace();
  device.files->put(kReportFile, "earlier");
  migrator._saveCollatedMigrationInformation();
  EXPECT_THAT(device.clock->patterns, ElementsAre("Y-M-d-H-M-S"));
  EXPECT_THAT(device.files->calls, Contains("replace " + kReportFile.string()));
  EXPECT_FALSE(device.dictionaryAt(kReportFile).empty());
}

TEST_F(MigrationRecords, ReportDirectoryIsMadeOpenToEverybody) {
  migrator._collatedMigrationData.emplace();
  migrator._saveCollatedMigrationInformation();
  EXPECT_EQ(device.files->nodes.at(kReportDirectory).permissions, 0777U);
}

TEST_F(MigrationRecords, ReportDirectoryThatIsThereStaysAsItIs) {
  migrator._collatedMigrationData.emplace();
  device.files->putDirectory(kReportDirectory);
  migrator._saveCollatedMigrationInformation();
  EXPECT_EQ(device.files->nodes.at(kReportDirectory).permissions, 0755U);
  EXPECT_TRUE(device.files->exists(kReportFile));
}

TEST_F(MigrationRecords, NothingCollatedMakesTheDirectoryButNoReport) {
  device.putSettings(accountsettings::kCurrentVersion, {});
  migrator._saveCollatedMigrationInformation();
  EXPECT_TRUE(device.files->exists(kReportDirectory));
  EXPECT_FALSE(device.files->exists(kReportFile));
  EXPECT_FALSE(migrator._collatedMigrationData.has_value());
  EXPECT_THAT(device.console->lines, ElementsAre(kSaving));
}

TEST_F(MigrationRecords, ReportDirectoryThatCannotBeMadeIsReported) {
  migrator._collatedMigrationData.emplace();
  device.files->failing.insert("createDirectories");
  migrator._saveCollatedMigrationInformation();
  EXPECT_THAT(device.console->lines,
              ElementsAre(kSaving,
                          "AccountMigration warning: Could not create the directory to store migration information "
                          "at " +
                              kReportDirectory.string() + " [Error = Could not createDirectories " +
                              kReportDirectory.string() + ": Input/output error (errno 5)]"));
  EXPECT_THAT(device.files->calls, Not(Contains("replace " + kReportFile.string())));
}

TEST_F(MigrationRecords, FileInTheDirectorysPlaceIsReported) {
  migrator._collatedMigrationData.emplace();
  device.files->put(kReportDirectory, "a file");
  migrator._saveCollatedMigrationInformation();
  EXPECT_THAT(device.console->lines, ElementsAre(kSaving, "AccountMigrator warning: " + kReportDirectory.string() +
                                                              " already exists and is not a directory"));
  EXPECT_EQ(device.files->contents(kReportDirectory), "a file");
  EXPECT_THAT(device.files->calls, Not(Contains("replace " + kReportFile.string())));
}

TEST_F(MigrationRecords, NobodyHearsOfAReportThatCannotBeSerialisedOrWritten) {
  migrator._collatedMigrationData.emplace();
  device.propertyLists->serializes = false;
  migrator._saveCollatedMigrationInformation();
  EXPECT_THAT(device.files->calls, Not(Contains("replace " + kReportFile.string())));
  device.propertyLists->serializes = true;
  device.files->failing.insert("replace");
  migrator._saveCollatedMigrationInformation();
  EXPECT_FALSE(device.files->exists(kReportFile));
  EXPECT_THAT(device.console->lines, ElementsAre(kSaving, kSaving));
}

}  // namespace
