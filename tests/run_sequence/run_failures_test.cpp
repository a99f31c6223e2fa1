#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <new>
#include <stdexcept>

#include "accountsettings/assertion_failure.h"
#include "migrator/accounts_data_migrator.h"
#include "platform/run_observer.h"
#include "tests/run_sequence/scripted_version_steps.h"
#include "tests/support/migration_device.h"

using namespace tests;
using accountsettings::AccountsManager;
using migrator::AccountsDataMigrator;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

class ThrowingConsole final : public platform::ConsoleLog {
 public:
  void write(std::string_view) override { throw std::bad_alloc{}; }
};

// Has no room for a line that says why.
class ForgetfulConsole final : public platform::ConsoleLog {
 public:
  std::vector<std::string> lines;
  void write(std::string_view line) override {
    if (line.ends_with("odd")) throw std::bad_alloc{};
    lines.emplace_back(line);
  }
};

class ThrowingNotice final : public platform::PreferencesChangedNotice {
 public:
  void post(std::string_view, std::string_view) override { throw std::bad_alloc{}; }
};

class ThrowingObserver final : public platform::RunObserver {
 public:
  void stageBegan(std::string_view, std::string_view) override {}
  void stageEnded(std::string_view) override { throw std::runtime_error{"observer"}; }
};

class ThrowingLocks final : public platform::ExclusiveFileLocks {
 public:
  platform::Result<std::unique_ptr<platform::ExclusiveFileLock>> lockNamed(std::string_view) override {
    throw std::bad_alloc{};
  }
};

class RunFailures : public testing::Test {
 protected:
  RunFailures() {
    device.observe();
    device.put(kLegacyMailFile,
               Dictionary{{"MailAccounts", Array{Dictionary{{"AccountType", "IMAPAccount"}, {"uniqueId", "M1"}}}}});
  }
  // The run fails, says so, and leaves the process as a finished run does.
  void expectGivenUp(const std::string& what) {
    EXPECT_FALSE(migrator.performMigration());
    EXPECT_EQ(device.console->lines.back(), "AccountsDataMigrator: The migration was given up. " + what);
    expectCleanedUp();
  }
  void expectCleanedUp() {
    EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
    EXPECT_THAT(device.locks->held, IsEmpty());
    EXPECT_TRUE(device.files->exists(kLegacyMailFile));
  }

  MigrationDevice device;
  AccountsDataMigrator migrator;
};

TEST_F(RunFailures, OutOfMemoryWhileLoadingFailsTheRun) {
  device.propertyLists->beforeRead = [](const Path& path) {
    if (path == kSettingsFile) throw std::bad_alloc{};
  };
  expectGivenUp("std::bad_alloc");
}

TEST_F(RunFailures, OutOfMemoryWhileConvertingFailsTheRun) {
  device.propertyLists->beforeRead = [](const Path& path) {
    if (path == kLegacyMailFile) throw std::bad_alloc{};
  };
  expectGivenUp("std::bad_alloc");
}

TEST_F(RunFailures, WhatAVersionStepThrowsFailsTheRun) {
  versionSteps().work = [](AccountsManager&) { throw std::runtime_error{"odd"}; };
  expectGivenUp("odd");
}

TEST_F(RunFailures, WhatIsNoExceptionFailsTheRunToo) {
  versionSteps().work = [](AccountsManager&) { throw 7; };
  expectGivenUp("Something was thrown that is no exception");
}

TEST_F(RunFailures, MissingConfigurationFailsTheRun) {
  device.files->nodes.erase("/resources/AccountTypesProperties.plist");
  expectGivenUp(
      "Assertion failure in +[BasicAccount initialize], BasicAccount: Could not find AccountTypesProperties.plist");
}

TEST_F(RunFailures, StagesEndAlsoWhereOneIsLeftByAnException) {
  versionSteps().work = [](AccountsManager&) { throw std::bad_alloc{}; };
  EXPECT_FALSE(migrator.performMigration());
  const auto begins = std::ranges::count_if(device.outputs, [](auto& line) { return line.starts_with("began "); });
  const auto ends = std::ranges::count_if(device.outputs, [](auto& line) { return line.starts_with("ended "); });
  EXPECT_EQ(begins, ends);
  EXPECT_EQ(device.namesOfStages().back(), "version steps");
}

TEST_F(RunFailures, FailureAfterTheSaveFailsTheRunToo) {
  device.changePlatform(
      [](platform::Platform& services) { services.preferencesChanged = std::make_shared<ThrowingNotice>(); });
  EXPECT_FALSE(migrator.performMigration());
  EXPECT_FALSE(AccountsManager::shouldSkipNotifications());
  EXPECT_THAT(device.locks->held, IsEmpty());
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("M1"));
}

TEST_F(RunFailures, ConsoleThatThrowsIsSurvived) {
  device.changePlatform([](platform::Platform& services) { services.console = std::make_shared<ThrowingConsole>(); });
  EXPECT_FALSE(migrator.performMigration());
  expectCleanedUp();
}

TEST_F(RunFailures, OutOfMemoryForTheLineThatSaysWhyIsSaidInFewerWords) {
  const auto console = std::make_shared<ForgetfulConsole>();
  device.changePlatform([&](platform::Platform& services) { services.console = console; });
  versionSteps().work = [](AccountsManager&) { throw std::runtime_error{"odd"}; };
  EXPECT_FALSE(migrator.performMigration());
  EXPECT_EQ(console->lines.back(), "AccountsDataMigrator: The migration was given up.");
}

TEST_F(RunFailures, LockThatCannotBeMadeForWantOfMemoryFailsTheRun) {
  device.changePlatform([](platform::Platform& services) { services.locks = std::make_shared<ThrowingLocks>(); });
  EXPECT_FALSE(migrator.performMigration());
  EXPECT_THAT(device.console->lines, ElementsAre("AccountsDataMigrator: The migration was given up. std::bad_alloc"));
  EXPECT_THAT(device.files->calls, IsEmpty());
}

TEST_F(RunFailures, ObserverThatThrowsAtTheEndOfAStageFailsNothing) {
  device.setObserver(std::make_shared<ThrowingObserver>());
  EXPECT_TRUE(migrator.performMigration());
}

TEST_F(RunFailures, NextRunAfterAFailedOneMigratesAsIfThatHadNotBeen) {
  versionSteps().work = [](AccountsManager&) { throw std::bad_alloc{}; };
  EXPECT_FALSE(migrator.performMigration());
  versionSteps().work = nullptr;
  EXPECT_TRUE(AccountsDataMigrator{}.performMigration());
  EXPECT_THAT(device.savedIdentifiers(), ElementsAre("M1"));
}

}  // namespace
