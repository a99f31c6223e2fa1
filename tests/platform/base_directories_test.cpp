#include <gtest/gtest.h>
#include <pwd.h>
#include <unistd.h>

#include <cstdlib>

#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"

namespace tests {
namespace {

namespace fs = std::filesystem;

auto directories(const platform::LinuxPlatformOptions& options = {}) {
  return platform::makeLinuxPlatform(options).directories;
}

TEST(BaseDirectories, OfTheDeviceItself) {
  ::setenv("HOME", "/home/somebody", 1);
  const auto device = directories();
  EXPECT_EQ(device->systemRoot(), "/");
  EXPECT_EQ(device->home(), "/home/somebody");
  EXPECT_EQ(device->sharedResources(), "/var/mobile");
  EXPECT_EQ(device->mailData(), "/home/somebody/Library/Mail");
}

TEST(BaseDirectories, UnderAnotherRootLieBelowIt) {
  const auto device = directories({.systemRoot = "/mnt/device"});
  EXPECT_EQ(device->systemRoot(), "/mnt/device");
  EXPECT_EQ(device->home(), "/mnt/device/var/mobile");
  EXPECT_EQ(device->sharedResources(), "/mnt/device/var/mobile");
  EXPECT_EQ(device->mailData(), "/mnt/device/var/mobile/Library/Mail");
}

TEST(BaseDirectories, UnderTheRootItselfGivenInWordsLieAsBelowEveryOther) {
  ::setenv("HOME", "/home/somebody", 1);
  const auto device = directories({.systemRoot = "/"});
  EXPECT_EQ(device->systemRoot(), "/");
  EXPECT_EQ(device->home(), "/var/mobile");
  EXPECT_EQ(device->sharedResources(), "/var/mobile");
  EXPECT_EQ(device->mailData(), "/var/mobile/Library/Mail");
}

TEST(BaseDirectories, CanBeSetEachByItself) {
  const auto device = directories({.systemRoot = "/mnt", .home = "/h", .sharedResources = "/s", .resources = "/r"});
  EXPECT_EQ(device->home(), "/h");
  EXPECT_EQ(device->mailData(), "/h/Library/Mail");
  EXPECT_EQ(device->sharedResources(), "/s");
  EXPECT_EQ(device->resources(), "/r");
}

TEST(BaseDirectories, AreAbsoluteAndPlain) {
  fs::current_path("/usr");
  EXPECT_EQ(directories({.systemRoot = "lib/../share/"})->systemRoot(), "/usr/share");
  EXPECT_EQ(directories({.systemRoot = "//"})->systemRoot(), "/");
  EXPECT_EQ(directories({.systemRoot = "/mnt//device/"})->home(), "/mnt/device/var/mobile");
}

TEST(BaseDirectories, TakeTheAccountsHomeWithoutOneInTheEnvironment) {
  const passwd* const account = ::getpwuid(::getuid());
  const fs::path expected = account == nullptr ? "/" : account->pw_dir;
  ::unsetenv("HOME");
  EXPECT_EQ(directories()->home(), expected);
  ::setenv("HOME", "relative", 1);
  EXPECT_EQ(directories()->home(), expected);
}

TEST(BaseDirectories, HaveTheResourcesBesideTheLibrary) {
  const fs::path resources = directories()->resources();
  EXPECT_TRUE(resources.is_absolute());
  EXPECT_EQ(resources.filename(), "account-settings");
  EXPECT_EQ(resources.parent_path().filename(), "share");
}

TEST(BaseDirectories, OfATestAreWhatTheTestSays) {
  FakeBaseDirectories device;
  device.homeDirectory = "/home";
  EXPECT_EQ(device.home(), "/home");
  EXPECT_EQ(device.mailData(), "/home/Library/Mail");
}

}  // namespace
}  // namespace tests
