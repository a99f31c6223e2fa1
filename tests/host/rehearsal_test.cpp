// What a rehearsal replaces of a platform, and what it leaves alone.

#include "host/rehearsal.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <map>
#include <memory>
#include <string>

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

class CountingModuleLoader final : public platform::ModuleLoader {
 public:
  platform::Status open(const std::string& path) override {
    ++opened[path];
    return path == "good" ? platform::Status{} : platform::Status::failure(ENOENT, "open a module");
  }

  std::map<std::string, int> opened;
};

class KeptModules : public RehearsedPlatform {
 protected:
  KeptModules() {
    device.modules = loader;
    host::keepModules(device);
    host::rehearseOn(rehearsal);
  }

  std::shared_ptr<CountingModuleLoader> loader = std::make_shared<CountingModuleLoader>();
};

TEST_F(KeptModules, AreLookedAtOnceForAllRehearsals) {
  EXPECT_TRUE(device.modules->open("good").isOk());
  EXPECT_TRUE(rehearsal.modules->open("good").isOk());
  EXPECT_EQ(loader->opened["good"], 1);
}

TEST_F(KeptModules, AreTriedAgainWhereTheyCouldNotBeOpened) {
  EXPECT_FALSE(device.modules->open("bad").isOk());
  EXPECT_FALSE(rehearsal.modules->open("bad").isOk());
  EXPECT_EQ(loader->opened["bad"], 2);
}

}  // namespace
}  // namespace tests
