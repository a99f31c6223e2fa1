#include <gtest/gtest.h>

#include <string>

#include "accountsettings/assertion_failure.h"
#include "accountsettings/file_paths.h"
#include "tests/support/account_store.h"

namespace tests {
namespace {

using accountsettings::AssertionFailure;
using Lines = std::vector<std::string>;

const Path kLegacyExchangeFile = "/var/mobile/Library/Preferences/com.vorlix.DataAccess.plist";
const Path kLegacyMailFile = "/var/mobile/Library/Mail/Accounts.plist";

constexpr std::uint64_t kBefore = kCurrentVersion - 1;

class SupportingMigrations : public AccountStore {
 protected:
  static constexpr const char* kCheck = "+[AccountsManager(MigrationSupport) accountSettingsNeedsToBeMigrated]";
  static constexpr const char* kDecide =
      "+[AccountsManager(MigrationSupport) shouldMigrateOldMailAccounts:oldDAAccounts:newAccountSettings:]";

  struct Decision {
    bool mail;
    bool exchange;
    bool settings;
    friend bool operator==(const Decision&, const Decision&) = default;
  };
  // Every out-parameter starts as the opposite of what is expected of it.
  static Decision decide(const Decision& expected) {
    Decision decision{!expected.mail, !expected.exchange, !expected.settings};
    AccountsManager::shouldMigrateOldMailAccounts_oldDAAccounts_newAccountSettings(&decision.mail, &decision.exchange,
                                                                                   &decision.settings);
    return decision;
  }
};

TEST_F(SupportingMigrations, AnswersTheVersionThatTheHeaderNames) {
  EXPECT_EQ(AccountsManager::currentVersion(), kCurrentVersion);
}

TEST_F(SupportingMigrations, SkipsNoNotificationsToBeginWith) {
  EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
}

TEST_F(SupportingMigrations, SetsTheDataVersionOfAStoreAndNothingElse) {
  const Store store = load({properties("a")});
  store->setDataVersion(UINT64_MAX);
  EXPECT_EQ(store->dataVersion(), UINT64_MAX);
  EXPECT_EQ(*file().find("Version"), PropertyValue{kCurrentVersion});
}

TEST_F(SupportingMigrations, HoldsTheMigrationLockUntilItIsReleased) {
  auto lock = AccountsManager::createAndLockMigrationLock();
  ASSERT_NE(lock, nullptr);
  EXPECT_TRUE(device.locks->held.contains("AccountMigrationInProgress"));
  AccountsManager::releaseMigrationLock(std::move(lock));
  EXPECT_TRUE(device.locks->held.empty());
}

TEST_F(SupportingMigrations, AnswersNoLockWhereNoneCanBeMadeOrTaken) {
  device.locks->canLock = false;
  EXPECT_EQ(AccountsManager::createAndLockMigrationLock(), nullptr);
  device.locks->canMakeLocks = false;
  EXPECT_EQ(AccountsManager::createAndLockMigrationLock(), nullptr);
  AccountsManager::releaseMigrationLock(nullptr);
}

TEST_F(SupportingMigrations, WaitsForAMigrationByTakingItsLockForAMoment) {
  AccountsManager::waitForMigrationToFinish();
  EXPECT_EQ(device.locks->calls, (Lines{"make AccountMigrationInProgress", "lock AccountMigrationInProgress",
                                        "unlock AccountMigrationInProgress"}));
}

TEST_F(SupportingMigrations, DoesNotUnlockWhatItCouldNotLock) {
  device.locks->canLock = false;
  AccountsManager::waitForMigrationToFinish();
  EXPECT_EQ(device.locks->calls.back(), "lock AccountMigrationInProgress");
}

TEST_F(SupportingMigrations, KnowsWhereTheFilesLie) {
  EXPECT_EQ(accountsettings::daAccountPath(), kLegacyExchangeFile);
  EXPECT_EQ(accountsettings::mailAccountsPath(), kLegacyMailFile);
  EXPECT_EQ(accountsettings::accountSettingsAccountsPath(), kSettingsFile);
  EXPECT_EQ(accountsettings::removalSentinelPath(), "/var/mobile/Library/Preferences/.removingOldAccounts");
  EXPECT_EQ(accountsettings::mailAutoFetchMarkerPath(), "/var/mobile/Library/Mail/AutoFetchEnabled");
}

TEST_F(SupportingMigrations, LooksForLegacyFilesInTheHomeDirectory) {
  device.directories->homeDirectory = "/Users/anna";
  EXPECT_EQ(accountsettings::daAccountPath(), "/Users/anna/Library/Preferences/com.vorlix.DataAccess.plist");
  EXPECT_EQ(accountsettings::mailAccountsPath(), "/Users/anna/Library/Mail/Accounts.plist");
}

TEST_F(SupportingMigrations, FindsLegacyAccountsByTheMereExistenceOfTheirFiles) {
  EXPECT_FALSE(AccountsManager::_oldDAAccountsInformationFound());
  EXPECT_FALSE(AccountsManager::_oldMailAccountsInformationFound());
  device.files->put(kLegacyExchangeFile, "anything");
  EXPECT_TRUE(AccountsManager::_oldDAAccountsInformationFound());
  EXPECT_FALSE(AccountsManager::_oldMailAccountsInformationFound());
  device.files->putDirectory(kLegacyMailFile);
  EXPECT_TRUE(AccountsManager::_oldMailAccountsInformationFound());
  EXPECT_TRUE(device.files->calls.empty());
}

TEST_F(SupportingMigrations, NeedsNoneOfAFileThatCannotBeRead) {
  EXPECT_FALSE(AccountsManager::accountSettingsNeedsToBeMigrated());
  device.files->put(kSettingsFile, "no property list");
  EXPECT_FALSE(AccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(SupportingMigrations, NeedsNoneOfAFileWithoutAVersionAndSaysSo) {
  const std::vector<Dictionary> roots{{{"Accounts", Array{}}}, {{"Version", true}}, {{"Version", Array{11}}}};
  for (const Dictionary& root : roots) {
    device.put(kSettingsFile, root);
    EXPECT_FALSE(AccountsManager::accountSettingsNeedsToBeMigrated());
    EXPECT_EQ(messagesOf(kCheck).back(),
              "Account Settings plist is missing a version number, returning NO for migration");
  }
  EXPECT_EQ(device.logMessages().size(), roots.size());
}

TEST_F(SupportingMigrations, ComparesVersionsWithoutSign) {
  const std::vector<std::pair<PropertyValue, bool>> cases{{0, true},
                                                          {kBefore, true},
                                                          {kCurrentVersion, false},
                                                          {kCurrentVersion + 1, false},
                                                          {-1, false},
                                                          {UINT64_MAX, false},
                                                          {static_cast<double>(kBefore) + 0.9, true},
                                                          {std::to_string(kBefore), true},
                                                          {std::to_string(kCurrentVersion), false},
                                                          {"no number", true},
                                                          {-0.5, true}};
  for (const auto& [version, isNeeded] : cases) {
    putFile({}, version);
    EXPECT_EQ(AccountsManager::accountSettingsNeedsToBeMigrated(), isNeeded)
        << testing::PrintToString(version.integerValue());
  }
}

TEST_F(SupportingMigrations, SaysHowFarTheFileIsOutOfDate) {
  putFile({}, kBefore);
  EXPECT_TRUE(AccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_EQ(messagesOf(kCheck), (Lines{"Account Settings Version out of date: savedVersion=" + std::to_string(kBefore) +
                                       ", currentVersion=" + std::to_string(kCurrentVersion)}));
}

TEST_F(SupportingMigrations, SaysNothingOfAFileThatIsUpToDate) {
  putFile({}, kCurrentVersion);
  EXPECT_FALSE(AccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(SupportingMigrations, MigratesNothingOnACurrentDeviceAndSaysNothing) {
  putFile({}, kCurrentVersion);
  const Decision nothing{false, false, false};
  EXPECT_EQ(decide(nothing), nothing);
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(SupportingMigrations, MigratesAnOutdatedSettingsFile) {
  putFile({}, kBefore);
  const Decision settings{false, false, true};
  EXPECT_EQ(decide(settings), settings);
  EXPECT_EQ(messagesOf(kDecide), (Lines{"Accounts settings needs migration! oldMailAccountsPresent=0, "
                                        "oldDAAccountsPresent=0, migrateNewAccountsInfo=1"}));
}

TEST_F(SupportingMigrations, MigratesLegacyMailAccounts) {
  device.files->put(kLegacyMailFile, "");
  const Decision mail{true, false, false};
  EXPECT_EQ(decide(mail), mail);
  EXPECT_EQ(messagesOf(kDecide), (Lines{"Accounts settings needs migration! oldMailAccountsPresent=1, "
                                        "oldDAAccountsPresent=0, migrateNewAccountsInfo=0"}));
}

TEST_F(SupportingMigrations, DoesNotLookAtTheSettingsFileWhereThereAreLegacyFiles) {
  putFile({}, 3);
  device.files->put(kLegacyMailFile, "");
  device.files->put(kLegacyExchangeFile, "");
  const Decision both{true, true, false};
  EXPECT_EQ(decide(both), both);
  EXPECT_TRUE(device.propertyLists->reads.empty());
  device.files->nodes.erase(kLegacyMailFile);
  const Decision exchange{false, true, false};
  EXPECT_EQ(decide(exchange), exchange);
  EXPECT_TRUE(device.propertyLists->reads.empty());
}

TEST_F(SupportingMigrations, RequiresAPlaceForEachPartOfTheDecision) {
  bool answer = false;
  const auto messageOf = [](bool* mail, bool* exchange, bool* settings) -> std::string {
    try {
      AccountsManager::shouldMigrateOldMailAccounts_oldDAAccounts_newAccountSettings(mail, exchange, settings);
    } catch (const AssertionFailure& failure) {
      EXPECT_EQ(failure.method(), kDecide);
      EXPECT_EQ(failure.file(), "AccountsManager");
      return failure.message();
    }
    return "no failure";
  };
  EXPECT_EQ(messageOf(nullptr, nullptr, nullptr), "migrateOldMailAccounts cannot be nil");
  EXPECT_EQ(messageOf(&answer, nullptr, nullptr), "migrateOldDAAccounts cannot be nil");
  EXPECT_EQ(messageOf(&answer, &answer, nullptr), "migrateNewAccounts cannot be nil");
  EXPECT_EQ(messageOf(&answer, &answer, &answer), "no failure");
}

TEST_F(SupportingMigrations, RemovesTheSettingsFileForClientsThatWantLegacyAccountsMigratedAgain) {
  putFile({});
  AccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  EXPECT_FALSE(device.files->exists(kSettingsFile));
  AccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  EXPECT_TRUE(device.logMessages().empty());
}

TEST_F(SupportingMigrations, SaysWhyTheSettingsFileCouldNotBeRemoved) {
  putFile({});
  device.files->failing = {"remove"};
  AccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  const std::string path = kSettingsFile.string();
  EXPECT_EQ(
      messagesOf("+[AccountsManager(MigrationSupport) "
                 "removeNewAccountSettingsToMigrateOldAccountInformation]"),
      (Lines{"Could not remove " + path + ". Error Could not remove " + path + ": Input/output error (errno 5)"}));
}

}  // namespace
}  // namespace tests
