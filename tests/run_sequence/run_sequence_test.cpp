#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "migrator/accounts_data_migrator.h"
#include "platform/run_observer.h"
#include "tests/run_sequence/scripted_version_steps.h"
#include "tests/support/fact_recorder.h"
#include "tests/support/migration_device.h"

using namespace tests;
using accountsettings::AccountsManager;
using accountsettings::kCurrentVersion;
using migrator::AccountsDataMigrator;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::IsSupersetOf;
using testing::Not;
using testing::Pair;

namespace {

const std::string kMailNotice = "preferences com.vorlix.mobilemail MailAccounts";
const std::string kEarlyReturn = "Detected that a removal old accounts info was in progress. Early return!.";

Dictionary account(std::string_view identifier) {
  return {{"Type", "LDAP"}, {"Class", "LDAPAccount"}, {"Identifier", identifier}};
}

Dictionary legacyExchange(std::string_view identifier) {
  return {{"DAAccountsKey", Array{Dictionary{{"DAAccountConfigurationClass", "ASAccount"},
                                             {"DAAccountConfigurationAccountID", identifier}}}}};
}

Dictionary legacyMail(std::string_view identifier) {
  return {{"MailAccounts", Array{Dictionary{{"AccountType", "IMAPAccount"}, {"uniqueId", identifier}}}}};
}

// Does something when one stage of a run begins.
class StageWatch final : public platform::RunObserver {
 public:
  StageWatch(std::string_view stage, std::function<void()> work) : _stage{stage}, _work{std::move(work)} {}
  void stageBegan(std::string_view stage, std::string_view) override {
    if (stage == _stage) _work();
  }
  void stageEnded(std::string_view) override {}

 private:
  std::string _stage;
  std::function<void()> _work;
};

class RunSequence : public testing::Test {
 protected:
  RunSequence() { device.observe(); }

  MigrationDevice device;
  AccountsDataMigrator migrator;

  [[nodiscard]] PropertyValue savedVersion() { return *device.dictionaryAt(kSettingsFile).find("Version"); }
  // Everything that happened, without the library's log.
  [[nodiscard]] std::vector<std::string> happenings() const {
    std::vector<std::string> without = device.outputs;
    std::erase_if(without, [](const std::string& output) { return output.starts_with("log "); });
    return without;
  }
};

TEST_F(RunSequence, IsOfTheDataClassAccounts) { EXPECT_EQ(migrator.dataClassName(), "accounts"); }

TEST_F(RunSequence, SaysWhichFilesItMayTouch) {
  using Part = platform::MigrationFile::Part;
  std::vector<std::pair<Part, Path>> files;
  for (const platform::MigrationFile& file : migrator.footprint().files) files.emplace_back(file.part, file.path);
  EXPECT_THAT(files, ElementsAre(Pair(Part::settings, kSettingsFile), Pair(Part::legacy, kLegacyExchangeFile),
                                 Pair(Part::legacy, kLegacyMailFile),
                                 Pair(Part::other, Path{kLegacyExchangeFile} += ".original"),
                                 Pair(Part::other, Path{kLegacyMailFile} += ".original"),
                                 Pair(Part::sentinel, kRemovalSentinel), Pair(Part::marker, kAutoFetchMarker)));
}

TEST_F(RunSequence, SaysWhatItLocksAndLeavesBehind) {
  const platform::MigrationFootprint footprint = migrator.footprint();
  EXPECT_EQ(footprint.lockName, "AccountMigrationInProgress");
  EXPECT_EQ(footprint.versionKey, "Version");
  EXPECT_EQ(footprint.currentVersion, kCurrentVersion);
  EXPECT_EQ(footprint.copyAside, kSettingsCopy);
}

TEST_F(RunSequence, NothingToMigrateStillSavesStampsAndTellsTheMailApplication) {
  device.putSettings(kCurrentVersion, {account("A")});
  device.files->put(kAutoFetchMarker, "");
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(happenings(), ElementsAre("began copy aside", "ended copy aside", "began decision", "ended decision",
                                        "began load", "ended load", "began save", "ended save", kMailNotice));
  EXPECT_EQ(versionSteps().runs, 0);
  EXPECT_EQ(savedVersion(), PropertyValue{kCurrentVersion});
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("A"));
  EXPECT_FALSE(device.files->exists(kAutoFetchMarker));
  EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
}

TEST_F(RunSequence, EmptyDeviceGetsAnEmptySettingsFile) {
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(savedVersion(), PropertyValue{kCurrentVersion});
  EXPECT_THAT(device.savedAccounts(), IsEmpty());
  EXPECT_THAT(device.console->lines, ElementsAre("Error trying to save an accountsettings plist copy: Could not copy " +
                                                 kSettingsFile.string() + ": No such file or directory (errno 2)"));
}

TEST_F(RunSequence, OutOfDateSettingsPassThroughTheVersionStepsOnly) {
  device.putSettings(3, {account("A")});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(happenings(), ElementsAre("began copy aside", "ended copy aside", "began decision", "ended decision",
                                        "began load", "ended load", "console Migrating accounts", "began version steps",
                                        "ended version steps", "began save", "ended save", kMailNotice));
  EXPECT_EQ(versionSteps().runs, 1);
  EXPECT_EQ(savedVersion(), PropertyValue{kCurrentVersion});
}

TEST_F(RunSequence, BothLegacyFilesAreConvertedExchangeFirstThenTheVersionStepsRun) {
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.putSettings(3, {account("A")});
  device.switchRecordsOn();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(
      happenings(),
      ElementsAre("began copy aside", "ended copy aside", "began decision", "ended decision", "began load",
                  "ended load", "console Migrating accounts", "began exchange conversion", "ended exchange conversion",
                  "began mail conversion", "ended mail conversion", "began version steps", "ended version steps",
                  "began save", "ended save", "began legacy removal", "ended legacy removal", "began report",
                  "console Saving collated migration information", "ended report", kMailNotice));
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("A", "E1", "M1"));
}

struct LegacyRow {
  bool exchange;
  bool mail;
};

TEST_F(RunSequence, LegacyFilesAloneBringTheVersionStepsAboutToo) {
  for (const LegacyRow& row : {LegacyRow{true, false}, LegacyRow{false, true}}) {
    versionSteps().runs = 0;
    device.putSettings(kCurrentVersion, {});
    if (row.exchange) device.put(kLegacyExchangeFile, legacyExchange("E1"));
    if (row.mail) device.put(kLegacyMailFile, legacyMail("M1"));
    EXPECT_TRUE(AccountsDataMigrator{}.performMigration());
    EXPECT_EQ(versionSteps().runs, 1);
    EXPECT_THAT(device.savedIdentifiers(), ElementsAre(row.exchange ? "E1" : "M1"));
    EXPECT_FALSE(device.files->exists(kLegacyExchangeFile) || device.files->exists(kLegacyMailFile));
  }
}

TEST_F(RunSequence, VersionStepsFindTheConvertedAccountsAndTheLoadedVersion) {
  device.putSettings(3, {});
  device.put(kLegacyMailFile, legacyMail("M1"));
  versionSteps().work = [](AccountsManager& store) {
    EXPECT_NE(store.accountWithIdentifier("M1"), nullptr);
    EXPECT_EQ(store.dataVersion(), 3U);
    EXPECT_TRUE(AccountsManager::shouldSkipNotifications());
  };
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(versionSteps().runs, 1);
}

TEST_F(RunSequence, StoreIsStampedBeforeItIsSavedEvenAfterFailedVersionSteps) {
  device.putSettings(3, {});
  std::vector<std::uint64_t> versionsAtSave;
  versionSteps().answer = false;
  versionSteps().work = [&](AccountsManager& store) {
    device.propertyLists->beforeRead = [&](const Path&) { versionsAtSave.push_back(store.dataVersion()); };
  };
  EXPECT_FALSE(migrator.performMigration());
  EXPECT_THAT(versionsAtSave, ElementsAre(kCurrentVersion));
}

TEST_F(RunSequence, StoreIsGoneBeforeTheLegacyFilesAre) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  std::weak_ptr<accountsettings::BasicAccount> account;
  versionSteps().work = [&](AccountsManager& store) { account = store.accountWithIdentifier("M1"); };
  bool isGone = false;
  device.changePlatform([&](platform::Platform& services) {
    services.observer = std::make_shared<StageWatch>("legacy removal", [&] { isGone = account.expired(); });
  });
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_TRUE(isGone);
}

TEST_F(RunSequence, FailedConversionShowsOnlyOnTheConsoleAndItsFileIsDeleted) {
  device.put(kLegacyMailFile, Dictionary{{"MailAccounts", Array{Dictionary{}}}});
  device.put(kLegacyExchangeFile, Dictionary{{"DAAccountsKey", Array{Dictionary{}}}});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.console->lines.size(), 4U) << "no settings file, migrating, and one line for each conversion";
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
  EXPECT_FALSE(device.files->exists(kLegacyExchangeFile));
}

TEST_F(RunSequence, FailedVersionStepsKeepTheLegacyFilesAndStampAndSaveAllTheSame) {
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.files->put(kAutoFetchMarker, "");
  device.switchRecordsOn();
  versionSteps().answer = false;
  EXPECT_FALSE(migrator.performMigration());
  EXPECT_EQ(savedVersion(), PropertyValue{kCurrentVersion});
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("E1", "M1"));
  for (const Path& kept : {kLegacyExchangeFile, kLegacyMailFile, kAutoFetchMarker}) {
    EXPECT_TRUE(device.files->exists(kept)) << kept;
  }
  EXPECT_FALSE(device.files->exists(kReportDirectory));
  EXPECT_THAT(device.outputs, Not(Contains(kMailNotice)));
  EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
}

TEST_F(RunSequence, NextRunConvertsAgainWhatAFailedOneLeftWithoutDoublingIt) {
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  versionSteps().answer = false;
  EXPECT_FALSE(migrator.performMigration());
  versionSteps().answer = true;
  EXPECT_TRUE(AccountsDataMigrator{}.performMigration());
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("E1", "M1"));
  EXPECT_FALSE(device.files->exists(kLegacyExchangeFile) || device.files->exists(kLegacyMailFile));
}

TEST_F(RunSequence, SettingsFileIsCopiedAsideBeforeAnythingElseTouchesIt) {
  device.putSettings(3, {account("A")});
  const std::string before = device.files->contents(kSettingsFile);
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.files->contents(kSettingsCopy), before);
  EXPECT_EQ(device.files->calls.front(), "copy " + kSettingsFile.string() + " " + kSettingsCopy.string());
}

TEST_F(RunSequence, InterruptedRemovalIsFinishedAndNothingElseDone) {
  device.putSettings(3, {account("A")});
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.files->put(kRemovalSentinel, "");
  device.files->put(kAutoFetchMarker, "");
  const std::string before = device.files->contents(kSettingsFile);
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.outputs, ElementsAre("began copy aside", "ended copy aside", "began legacy removal",
                                          "console " + kEarlyReturn, "ended legacy removal"));
  EXPECT_EQ(device.files->contents(kSettingsFile), before);
  EXPECT_EQ(device.files->contents(kSettingsCopy), before);
  EXPECT_THAT(device.propertyLists->reads, IsEmpty());
  EXPECT_TRUE(device.files->exists(kAutoFetchMarker));
  for (const Path& gone : {kLegacyExchangeFile, kLegacyMailFile, kRemovalSentinel}) {
    EXPECT_FALSE(device.files->exists(gone)) << gone;
  }
}

TEST_F(RunSequence, FinishingAnInterruptedRemovalTellsWhichLegacyAccountsWereNeverSaved) {
  device.putSettings(kCurrentVersion, {});
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.files->put(kRemovalSentinel, "");
  const auto recorder = std::make_shared<FactRecorder>();
  device.setObserver(recorder);
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(recorder->lines(),
              IsSupersetOf({"lost E1 (not-saved: DAAccountsKey[0] of " + kLegacyExchangeFile.string() + ")",
                            "lost M1 (not-saved: MailAccounts[0] of " + kLegacyMailFile.string() + ")"}));
}

TEST_F(RunSequence, FinishingAnInterruptedRemovalLeavesNotificationsOff) {
  device.files->put(kRemovalSentinel, "");
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_TRUE(AccountsManager::shouldSkipNotifications());
  EXPECT_THAT(device.locks->held, IsEmpty());
}

TEST_F(RunSequence, FinishingAnInterruptedRemovalReportsNoLegacyFileThatStays) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.files->put(kRemovalSentinel, "");
  device.files->failing = {"remove " + kLegacyExchangeFile.string(), "remove " + kLegacyMailFile.string()};
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.console->lines.back(), kEarlyReturn);
}

TEST_F(RunSequence, LegacyFilesAreDeletedWhetherOrNotTheSaveWentThrough) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.files->failing.insert("rename");
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.logMessages(), Contains("Failed to save accounts to filesystem."));
  EXPECT_FALSE(device.files->exists(kSettingsFile));
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
}

TEST_F(RunSequence, DirectoryInALegacyFilesPlaceIsFoundConvertedToNothingAndDeleted) {
  device.files->putDirectory(kLegacyMailFile);
  device.putSettings(kCurrentVersion, {account("A")});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.console->lines, ElementsAre("Migrating accounts"));
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("A"));
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
}

TEST_F(RunSequence, LegacyFilesTakePrecedenceSoTheSettingsFilesVersionIsNotAskedFor) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.putSettings(3, {});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.logMessages(), Contains("Accounts settings needs migration! oldMailAccountsPresent=1, "
                                             "oldDAAccountsPresent=0, migrateNewAccountsInfo=0"));
  EXPECT_THAT(device.logMessages(),
              Not(Contains("Account Settings Version out of date: savedVersion=3, currentVersion=" +
                           std::to_string(kCurrentVersion))));
}

TEST_F(RunSequence, NegativeVersionIsNewerThanAnyAndNeedsNoMigration) {
  device.putSettings(-1, {account("A")});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.console->lines, IsEmpty());
  EXPECT_EQ(versionSteps().runs, 0);
  EXPECT_EQ(savedVersion(), PropertyValue{kCurrentVersion});
}

TEST_F(RunSequence, ReportOfARunThatMigratedNothingIsADirectoryOnly) {
  device.putSettings(kCurrentVersion, {});
  device.switchRecordsOn();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_TRUE(device.files->exists(kReportDirectory));
  EXPECT_FALSE(device.files->exists(kReportFile));
}

TEST_F(RunSequence, ReportHoldsTheInputsAndTheResultInTheirOrder) {
  device.put(kLegacyExchangeFile, legacyExchange("E1"));
  device.put(kLegacyMailFile, legacyMail("M1"));
  device.switchRecordsOn();
  EXPECT_TRUE(migrator.performMigration());
  std::vector<std::string> keys;
  for (const auto& entry : device.dictionaryAt(kReportFile)) keys.push_back(entry.key.string());
  EXPECT_THAT(keys, ElementsAre("OldExchangeAccount", "OldMailAccounts", "NewAccounSettings"));
  EXPECT_EQ(*device.dictionaryAt(kReportFile).dictionary("NewAccounSettings"), device.dictionaryAt(kSettingsFile));
}

TEST_F(RunSequence, NoReportIsMadeWhileRecordsAreOff) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  migrator._collatedMigrationData.emplace();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_FALSE(migrator._collatedMigrationData.has_value());
  EXPECT_FALSE(device.files->exists(kReportDirectory));
}

TEST_F(RunSequence, AutoFetchMarkerThatCannotBeDeletedIsIgnored) {
  device.putSettings(kCurrentVersion, {});
  device.files->put(kAutoFetchMarker, "");
  device.files->failing.insert("remove " + kAutoFetchMarker.string());
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.outputs, Contains(kMailNotice));
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(RunSequence, LockIsHeldFromFirstToLast) {
  device.putSettings(3, {});
  versionSteps().work = [this](AccountsManager&) {
    EXPECT_THAT(device.locks->held, ElementsAre("AccountMigrationInProgress"));
  };
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_THAT(device.locks->calls, ElementsAre("make AccountMigrationInProgress", "lock AccountMigrationInProgress",
                                               "unlock AccountMigrationInProgress"));
  EXPECT_THAT(device.locks->held, IsEmpty());
}

TEST_F(RunSequence, WithoutALockNoFileIsTouched) {
  device.put(kLegacyMailFile, legacyMail("M1"));
  for (bool* const refused : {&device.locks->canMakeLocks, &device.locks->canLock}) {
    *refused = false;
    EXPECT_FALSE(migrator.performMigration());
    *refused = true;
  }
  EXPECT_THAT(device.files->calls, IsEmpty());
  EXPECT_THAT(device.outputs, IsEmpty());
  EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
}

TEST_F(RunSequence, IsRunWithoutAnybodyWatching) {
  device.setObserver(nullptr);
  device.put(kLegacyMailFile, legacyMail("M1"));
  EXPECT_TRUE(migrator.performMigration());
}

TEST_F(RunSequence, IsMadeByTheHostThroughTheClassRegistry) {
  const auto* const found = dynamic_cast<const platform::DataClassMigratorClass*>(
      platform::current().classes->classNamed("AccountsDataMigrator"));
  ASSERT_NE(found, nullptr);
  EXPECT_EQ(found->make()->dataClassName(), "accounts");
}

}  // namespace
