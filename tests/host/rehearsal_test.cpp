// What a rehearsal replaces of a platform, and what it leaves alone.

#include "host/rehearsal.h"

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <thread>

#include "platform/linux/linux_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

constexpr std::string_view kLock = "SomeLock";

class RehearsedPlatform : public testing::Test {
 protected:
  RehearsedPlatform() {
    const platform::LinuxPlatformOptions options{.systemRoot = scratch.path(), .lockDirectory = scratch.path()};
    device = platform::makeLinuxPlatform(options);
    rehearsal = device;
    host::rehearseOn(rehearsal, options.lockDirectory);
  }

  ScratchDirectory scratch;
  platform::Platform device;
  platform::Platform rehearsal;
};

TEST_F(RehearsedPlatform, LeavesNoLockFileWhereThereIsNone) {
  const auto lock = rehearsal.locks->lockNamed(kLock);
  ASSERT_NE(lock, nullptr);
  EXPECT_TRUE(lock.value()->lock().isOk());
  lock.value()->unlock();
  EXPECT_FALSE(std::filesystem::exists(scratch / kLock));
}

TEST_F(RehearsedPlatform, WaitsForWhoeverHoldsTheLock) {
  using std::chrono::steady_clock;
  constexpr std::chrono::milliseconds patience{200};
  const auto held = device.locks->lockNamed(kLock);
  ASSERT_TRUE(held.value()->lock().isOk());
  std::thread holder{[&] {
    std::this_thread::sleep_for(patience);
    held.value()->unlock();
  }};
  const auto began = steady_clock::now();
  EXPECT_TRUE(rehearsal.locks->lockNamed(kLock).value()->lock().isOk());
  EXPECT_GE(steady_clock::now() - began, patience / 2);
  holder.join();
}

TEST_F(RehearsedPlatform, HasALogThatNobodyReads) { EXPECT_FALSE(rehearsal.systemLog->hasReaders()); }

TEST_F(RehearsedPlatform, ReadsThePropertyListsThatTheRehearsalWrote) {
  const auto path = scratch / "list.plist";
  const auto serialized = rehearsal.propertyLists->serialize({{"Key", "value"}});
  ASSERT_TRUE(rehearsal.files->create(path, *serialized.value()).isOk());
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
