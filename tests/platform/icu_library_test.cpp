// When ICU is loaded: each test in a process of its own, which has not needed it before.

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <iterator>

#include "platform/linux/linux_platform.h"

namespace tests {
namespace {

bool isIcuLoaded() {
  std::ifstream maps{"/proc/self/maps"};
  return std::string{std::istreambuf_iterator<char>{maps}, {}}.find("libicu") != std::string::npos;
}

class IcuLibrary : public testing::Test {
 protected:
  platform::Platform device = platform::makeLinuxPlatform();

  void lookForATextIn(const char* language) const {
    ::setenv("LC_ALL", language, 1);
    EXPECT_EQ(device.strings->text("NoTable", "KEY"), std::nullopt);
  }
};

TEST_F(IcuLibrary, IsLoadedForADate) {
  EXPECT_FALSE(isIcuLoaded());
  EXPECT_TRUE(device.clock->currentLocalTime("y").isOk());
  EXPECT_TRUE(isIcuLoaded());
}

TEST_F(IcuLibrary, IsNotLoadedForTheNameOfAReport) {
  EXPECT_TRUE(device.clock->currentLocalTime("Y-M-d-H-M-S").isOk());
  EXPECT_FALSE(isIcuLoaded());
}

TEST_F(IcuLibrary, IsLoadedForALanguage) {
  EXPECT_FALSE(isIcuLoaded());
  lookForATextIn("de_DE.UTF-8");
  EXPECT_TRUE(isIcuLoaded());
}

TEST_F(IcuLibrary, IsNotLoadedWhereThereIsNoLanguage) {
  for (const char* const language : {"C", "POSIX", "C.UTF-8", ""}) lookForATextIn(language);
  EXPECT_FALSE(isIcuLoaded());
}

}  // namespace
}  // namespace tests
