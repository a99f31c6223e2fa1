#include <fcntl.h>
#include <sys/file.h>

#include <thread>

#include "tests/support/device_with_accounts.h"

namespace tests {
namespace {

using accounts::AccountSettings;
using accounts::Code;

class OpeningAccountSettings : public DeviceWithAccounts {
 protected:
  [[nodiscard]] Code whyNot() const { return codeOf(AccountSettings::open(options())); }

  // Holds the migration lock as a process that migrates does.
  [[nodiscard]] int heldLock() const {
    device.root.put(kLock, "");
    const int file = ::open((device.root / kLock).c_str(), O_RDONLY | O_CLOEXEC);
    ::flock(file, LOCK_EX);
    return file;
  }
};

TEST_F(OpeningAccountSettings, SaysThatTheFileIsMissing) {
  std::filesystem::remove(device.root / kSettings);
  EXPECT_EQ(whyNot(), Code::missing);
}

TEST_F(OpeningAccountSettings, TakesAMissingFileForNoAccountsWhereItMay) {
  std::filesystem::remove(device.root / kSettings);
  auto may = options();
  may.mayBeMissing = true;
  EXPECT_TRUE(opened(may).accounts().value().empty());
}

TEST_F(OpeningAccountSettings, SaysThatAnEarlierReleasesFileIsNotMigrated) {
  putAccounts(kAccounts, 11);
  EXPECT_EQ(whyNot(), Code::notMigrated);
}

TEST_F(OpeningAccountSettings, SaysThatLegacyFilesAreNotMigrated) {
  std::filesystem::remove(device.root / kSettings);
  device.put("var/mobile/Library/Mail/Accounts.plist", "");
  EXPECT_EQ(whyNot(), Code::notMigrated);
}

TEST_F(OpeningAccountSettings, SaysThatALaterReleasesFileIsNewer) {
  putAccounts(kAccounts, 13);
  EXPECT_EQ(whyNot(), Code::newer);
}

TEST_F(OpeningAccountSettings, SaysThatADamagedFileIsUnreadable) {
  device.root.put(kSettings, "bplist00 and nothing more");
  EXPECT_EQ(whyNot(), Code::unreadable);
}

TEST_F(OpeningAccountSettings, RefusesAFileThatAnybodyMayHavePlanted) {
  std::filesystem::permissions((device.root / kSettings).parent_path(), std::filesystem::perms::all);
  std::filesystem::create_hard_link(device.root / kSettings, device.root / "second");
  EXPECT_EQ(whyNot(), Code::refused);
}

TEST_F(OpeningAccountSettings, SaysThatTheConfigurationIsMissing) {
  auto elsewhere = options();
  elsewhere.resources = device.root.path();
  EXPECT_EQ(codeOf(AccountSettings::open(elsewhere)), Code::brokenInstallation);
}

TEST_F(OpeningAccountSettings, ThrowsForWantOfMemoryAlone) {
  runOutOfMemory();
  EXPECT_THROW(static_cast<void>(AccountSettings::open()), std::bad_alloc);
}

TEST_F(OpeningAccountSettings, SaysWhatIsWrong) {
  putAccounts(kAccounts, 13);
  const auto result = AccountSettings::open(options());
  EXPECT_EQ(result.error().sentence, "the account settings have data version 13, a later release's");
}

TEST_F(OpeningAccountSettings, SaysThatTheUserMayNotReadTheFile) {
  EXPECT_EQ(asStranger([this] { return whyNot(); }), Code::noPermission);
}

TEST_F(OpeningAccountSettings, ShowsTheAccountsOfAnotherReleaseWhereItMayButChangesNone) {
  auto may = options();
  may.mayBeOfOtherRelease = true;
  for (const auto& [version, code] : {std::pair{11, Code::notMigrated}, {13, Code::newer}}) {
    putAccounts(kAccounts, version);
    const AccountSettings settings = opened(may);
    EXPECT_EQ(settings.accounts().value().dataVersion(), static_cast<std::uint64_t>(version));
    EXPECT_EQ(codeOf(settings.edit()), code);
    EXPECT_EQ(codeOf(settings.trial()), code);
  }
}

TEST_F(OpeningAccountSettings, WaitsForNoMigrationWhereItMayBeOne) {
  const int lock = heldLock();
  auto may = options();
  may.mayBeMigrating = true;
  EXPECT_EQ(opened(may).accounts().value().size(), 2U);
  EXPECT_EQ(codeOf(AccountSettings::waitForMigration(may)), Code::busy);
  ::close(lock);
  EXPECT_TRUE(AccountSettings::waitForMigration(may).isOk());
}

TEST_F(OpeningAccountSettings, LooksAtTheFileAsItIsByThen) {
  const AccountSettings settings = opened();
  replaceAccounts(account("A"));
  EXPECT_TRUE(settings.accounts().value().withIdentifier("A").has_value());
}

TEST_F(OpeningAccountSettings, GivesAMigrationNoMoreThanTheTimeLimit) {
  const int lock = heldLock();
  EXPECT_EQ(whyNot(), Code::busy);
  ::close(lock);
}

TEST_F(OpeningAccountSettings, WaitsForAMigrationAndSeesWhatItLeft) {
  const int lock = heldLock();
  putAccounts(kAccounts, 3);
  std::thread migration{[&] {
    std::this_thread::sleep_for(50ms);
    replaceAccounts(account("A"));
    ::close(lock);
  }};
  const auto accounts = looked();
  migration.join();
  EXPECT_TRUE(accounts.withIdentifier("A").has_value());
}

TEST_F(OpeningAccountSettings, LeavesEverythingOnTheDeviceAsItIs) {
  const std::string before = device.root.contents(kSettings);
  static_cast<void>(looked());
  EXPECT_EQ(device.root.contents(kSettings), before);
  EXPECT_FALSE(std::filesystem::exists(device.root / "tmp"));
}

TEST_F(OpeningAccountSettings, OpensSeveralDevicesInOneProcess) {
  const RealDevice other;
  other.put(kSettings, "<key>Accounts</key><array/><key>Version</key><integer>" +
                           std::to_string(accountsettings::kCurrentVersion) + "</integer>");
  auto elsewhere = options();
  elsewhere.root = other.root.path();
  const AccountSettings first = opened();
  const AccountSettings second = opened(elsewhere);
  EXPECT_EQ(first.accounts().value().size(), 2U);
  EXPECT_EQ(second.accounts().value().size(), 0U);
}

}  // namespace
}  // namespace tests
