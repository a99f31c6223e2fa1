#include <gtest/gtest.h>

#include <cstdlib>

#include "platform/base_directories.h"
#include "tests/support/fake_platform.h"
#include "tests/support/real_device.h"

namespace tests {
namespace {

namespace fs = std::filesystem;

std::ptrdiff_t openDescriptors() { return std::distance(fs::directory_iterator{"/proc/self/fd"}, {}); }

TEST(LinuxPlatform, HasEveryService) {
  const platform::Platform device = platform::makeLinuxPlatform();
  EXPECT_TRUE(device.directories && device.files && device.propertyLists && device.preferences);
  EXPECT_TRUE(device.preferencesChanged && device.cloudTabs && device.locks && device.systemLog && device.console);
  EXPECT_TRUE(device.deviceInfo && device.restrictions && device.tetheredSync && device.externalSources);
  EXPECT_TRUE(device.systemAccount && device.modules && device.classes && device.strings && device.identifiers);
  EXPECT_TRUE(device.clock);
  EXPECT_FALSE(device.observer);
}

TEST(LinuxPlatform, OpensAndMakesNothingBeforeItsFirstUse) {
  const auto before = openDescriptors();
  const RealDevice device;
  EXPECT_EQ(openDescriptors(), before);
  EXPECT_TRUE(fs::is_empty(device.root.path()));
}

TEST(LinuxPlatform, IsTheProcesssUntilAnotherIsSet) {
  EXPECT_EQ(platform::current().directories->systemRoot(), "/");
  const FakeDevice device;
  EXPECT_EQ(platform::current().files, device.files);
}

class TemporaryDirectory : public testing::Test {
 protected:
  RealDevice device;
  fs::path directory = device.root / "var/mobile/tmp";

  void SetUp() override { ::unsetenv("TMPDIR"); }
};

TEST_F(TemporaryDirectory, IsMadeOnTheDevicesVolumeForItsOwnerAlone) {
  platform::keepTemporaryDirectoryOnDeviceVolume(device.services);
  EXPECT_STREQ(std::getenv("TMPDIR"), directory.c_str());
  EXPECT_EQ(permissionsOf(directory), 0700U);
  EXPECT_EQ(device.services.files->temporaryName().value().parent_path(), directory);
}

TEST_F(TemporaryDirectory, IsLeftAsItIsWhereThereIsOne) {
  fs::create_directories(directory);
  fs::permissions(directory, fs::perms{0750});
  platform::keepTemporaryDirectoryOnDeviceVolume(device.services);
  EXPECT_STREQ(std::getenv("TMPDIR"), directory.c_str());
  EXPECT_EQ(permissionsOf(directory), 0750U);
}

TEST_F(TemporaryDirectory, IsTheUsersWhereOneIsSet) {
  ::setenv("TMPDIR", "/somewhere", 1);
  platform::keepTemporaryDirectoryOnDeviceVolume(device.services);
  EXPECT_STREQ(std::getenv("TMPDIR"), "/somewhere");
  EXPECT_FALSE(fs::exists(directory));
}

TEST_F(TemporaryDirectory, ThatCannotBeMadeIsNoError) {
  device.root.put("var", "a file where the directory should be");
  EXPECT_NO_THROW(platform::keepTemporaryDirectoryOnDeviceVolume(device.services));
}

TEST(TemporaryDirectoryOfADevice, BelongsToItsUser) {
  ::unsetenv("TMPDIR");
  FakeDevice device;
  device.files->nodes.erase("/var/mobile/tmp");
  platform::keepTemporaryDirectoryOnDeviceVolume(platform::current());
  EXPECT_EQ(device.files->nodes.at("/var/mobile/tmp").owner, "mobile");
  EXPECT_EQ(device.files->nodes.at("/var/mobile/tmp").group, "mobile");
  EXPECT_EQ(device.files->nodes.at("/var/mobile/tmp").permissions, 0700U);
}

}  // namespace
}  // namespace tests
