#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "migrator/accounts_data_migrator.h"
#include "tests/support/migration_device.h"

using namespace tests;
using migrator::AccountsDataMigrator;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

std::string failureLine(const Path& path, const std::string& reason = "Input/output error (errno 5)") {
  return "-[AccountsDataMigrator(Internal) _removeOldAccountsInfo]. Could not delete " + path.string() +
         ". Error = Could not remove " + path.string() + ": " + reason;
}

class LegacyRemoval : public testing::Test {
 protected:
  LegacyRemoval() {
    device.files->put(kLegacyExchangeFile, "exchange");
    device.files->put(kLegacyMailFile, "mail");
    device.files->calls.clear();
  }
  void find(bool exchange, bool mail) {
    migrator._foundOldDAAccountsToMigrate = exchange;
    migrator._foundOldMailAccountsToMigrate = mail;
  }
  void failToRemove(const Path& path) { device.files->failing.insert("remove " + path.string()); }

  MigrationDevice device;
  AccountsDataMigrator migrator;
};

TEST_F(LegacyRemoval, DeletesBothFilesBetweenMakingAndDeletingTheSentinel) {
  find(true, true);
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_THAT(device.files->calls,
              ElementsAre("create " + kRemovalSentinel.string(), "remove " + kLegacyExchangeFile.string(),
                          "remove " + kLegacyMailFile.string(), "remove " + kRemovalSentinel.string()));
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyRemoval, SentinelHoldsItsTextAndNothingElse) {
  failToRemove(kRemovalSentinel);
  migrator._removeOldAccountsInfo();
  EXPECT_EQ(device.files->contents(kRemovalSentinel), "Old Account Information Removal Sentinel");
}

TEST_F(LegacyRemoval, SentinelOfAnInterruptedRemovalIsNotMadeAgain) {
  device.files->put(kRemovalSentinel, "");
  EXPECT_TRUE(AccountsDataMigrator::_failedToRemoveOldAccountsInfo());
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_EQ(device.files->calls.front(), "remove " + kLegacyExchangeFile.string());
  EXPECT_FALSE(AccountsDataMigrator::_failedToRemoveOldAccountsInfo());
}

TEST_F(LegacyRemoval, DirectoryCountsAsASentinelToo) {
  device.files->putDirectory(kRemovalSentinel);
  EXPECT_TRUE(AccountsDataMigrator::_failedToRemoveOldAccountsInfo());
  migrator._removeOldAccountsInfo();
  EXPECT_FALSE(device.files->exists(kRemovalSentinel));
}

TEST_F(LegacyRemoval, SentinelLiesInTheHomeDirectory) {
  EXPECT_EQ(AccountsDataMigrator::_absolutePathToOldAccountsInfoRemovalSentinel(), kRemovalSentinel);
  device.directories->homeDirectory = "/elsewhere";
  EXPECT_EQ(AccountsDataMigrator::_absolutePathToOldAccountsInfoRemovalSentinel(),
            "/elsewhere/Library/Preferences/.removingOldAccounts");
}

TEST_F(LegacyRemoval, SentinelThatCannotBeMadeHindersNothing) {
  device.files->failing.insert("create");
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_FALSE(device.files->exists(kLegacyExchangeFile));
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
  EXPECT_THAT(device.console->lines, ElementsAre(failureLine(kRemovalSentinel, "No such file or directory (errno 2)")));
}

TEST_F(LegacyRemoval, ExchangeFileThatCannotBeDeletedKeepsTheMailFileWhereAccountsWereFoundInIt) {
  find(true, true);
  failToRemove(kLegacyExchangeFile);
  EXPECT_FALSE(migrator._removeOldAccountsInfo());
  EXPECT_TRUE(device.files->exists(kLegacyMailFile));
  EXPECT_FALSE(device.files->exists(kRemovalSentinel));
  EXPECT_THAT(device.console->lines, ElementsAre(failureLine(kLegacyExchangeFile)));
}

TEST_F(LegacyRemoval, ExchangeFileThatCannotBeDeletedKeepsNothingWhereNoAccountsWereFoundInIt) {
  find(false, true);
  failToRemove(kLegacyExchangeFile);
  EXPECT_FALSE(migrator._removeOldAccountsInfo());
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyRemoval, ExchangeFileThatIsNotThereIsAnErrorToo) {
  find(false, true);
  device.files->nodes.erase(kLegacyExchangeFile);
  EXPECT_FALSE(migrator._removeOldAccountsInfo());
  EXPECT_FALSE(device.files->exists(kLegacyMailFile));
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyRemoval, MailFileThatCannotBeDeletedIsReportedWhereAccountsWereFoundInIt) {
  find(true, true);
  failToRemove(kLegacyMailFile);
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_FALSE(device.files->exists(kRemovalSentinel));
  EXPECT_THAT(device.console->lines, ElementsAre(failureLine(kLegacyMailFile)));
}

TEST_F(LegacyRemoval, MailFileThatCannotBeDeletedIsNotReportedOtherwise) {
  find(true, false);
  failToRemove(kLegacyMailFile);
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_THAT(device.console->lines, IsEmpty());
}

TEST_F(LegacyRemoval, SentinelThatCannotBeDeletedIsAlwaysReported) {
  failToRemove(kRemovalSentinel);
  EXPECT_TRUE(migrator._removeOldAccountsInfo());
  EXPECT_THAT(device.console->lines, ElementsAre(failureLine(kRemovalSentinel)));
}

}  // namespace
