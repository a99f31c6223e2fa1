// What a rehearsal replaces of a platform, and what it leaves alone.

#include "host/rehearsal.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "platform/linux/linux_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

class RehearsedPlatform : public testing::Test {
 protected:
  RehearsedPlatform() {
    device = platform::makeLinuxPlatform({.systemRoot = scratch.path()});
    rehearsal = device;
    host::rehearseOn(rehearsal);
  }

  ScratchDirectory scratch;
  platform::Platform device;
  platform::Platform rehearsal;
};

TEST_F(RehearsedPlatform, HasALogThatNobodyReads) { EXPECT_FALSE(rehearsal.systemLog->hasReaders()); }

TEST_F(RehearsedPlatform, ReadsThePropertyListsThatTheRehearsalWrote) {
  const auto path = scratch / "list.plist";
  const auto serialized = rehearsal.propertyLists->serialize({{"Key", "value"}});
  ASSERT_TRUE(rehearsal.files->create(path, *serialized.data).isOk());
  EXPECT_EQ(rehearsal.propertyLists->readDictionary(path), (platform::Dictionary{{"Key", "value"}}));
  EXPECT_EQ(device.propertyLists->readDictionary(path).cause(), platform::Cause::missing);
}

TEST_F(RehearsedPlatform, SaysOnTheConsoleWhatARunWould) { EXPECT_EQ(rehearsal.console, device.console); }

TEST_F(RehearsedPlatform, SendsNoNotices) {
  EXPECT_NE(rehearsal.preferencesChanged, device.preferencesChanged);
  EXPECT_NE(rehearsal.cloudTabs, device.cloudTabs);
}

}  // namespace
}  // namespace tests
