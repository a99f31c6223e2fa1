#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/linux/linux_platform.h"
#include "tests/support/fake_platform.h"
#include "tests/support/scratch_directory.h"

namespace tests {
namespace {

using testing::HasSubstr;
using testing::Optional;

const std::string modules = PLATFORM_TEST_MODULES;

class Modules : public testing::Test {
 protected:
  platform::Platform device = platform::makeLinuxPlatform();
};

TEST_F(Modules, MakeTheirClassesKnownAsTheyAreOpened) {
  EXPECT_EQ(device.classes->classNamed("KnownClass"), nullptr);
  EXPECT_TRUE(device.modules->open(modules + "/known_class.so").isOk());
  ASSERT_NE(device.classes->classNamed("KnownClass"), nullptr);
  EXPECT_EQ(device.classes->classNamed("KnownClass")->name(), "KnownClass");
}

TEST_F(Modules, CanBeOpenedAgain) {
  EXPECT_TRUE(device.modules->open(modules + "/known_class.so").isOk());
  const auto* const known = device.classes->classNamed("KnownClass");
  EXPECT_TRUE(device.modules->open(modules + "/known_class.so").isOk());
  EXPECT_EQ(device.classes->classNamed("KnownClass"), known);
}

TEST_F(Modules, AreOpenedOnlyWithAllTheirSymbols) {
  EXPECT_THAT(device.modules->open(modules + "/unresolved.so").reason(), HasSubstr("definedNowhere"));
}

TEST_F(Modules, AreFoundByTheirPathAlone) {
  std::filesystem::current_path(modules);
  EXPECT_TRUE(device.modules->open("known_class.so").isOk());
  EXPECT_THAT(device.modules->open("libc.so.6").reason(), HasSubstr("libc.so.6"));
}

TEST_F(Modules, SayWhyTheyCannotBeOpened) {
  const ScratchDirectory scratch;
  scratch.put("text.so", "no module");
  ASSERT_EQ(::mkfifo((scratch / "pipe.so").c_str(), 0600), 0);
  const std::pair<std::string, std::string> cases[] = {{scratch / "missing.so", "No such file or directory"},
                                                       {scratch / "text.so", "text.so"},
                                                       {scratch / "pipe.so", "not a regular file"},
                                                       {scratch.path(), "not a regular file"},
                                                       {"", "No such file or directory"}};
  for (const auto& [path, text] : cases) EXPECT_THAT(device.modules->open(path).reason(), HasSubstr(text)) << path;
}

TEST(ModulesOfATest, AreRecordedAndFailAsTheTestSays) {
  FakeModuleLoader loader;
  loader.errors["/bad.so"] = "why";
  EXPECT_TRUE(loader.open("/good.so").isOk());
  EXPECT_EQ(loader.open("/bad.so").reason(), "why");
  EXPECT_THAT(loader.opened, testing::ElementsAre("/good.so", "/bad.so"));
}

TEST(ClassRegistry, FindsAClassAsLongAsItIsRegistered) {
  const auto classes = platform::makeLinuxPlatform().classes;
  {
    const platform::ClassRegistration registration{std::make_shared<platform::ClassInfo>("Passing")};
    EXPECT_NE(classes->classNamed("Passing"), nullptr);
    EXPECT_EQ(classes->classNamed("passing"), nullptr);
  }
  EXPECT_EQ(classes->classNamed("Passing"), nullptr);
}

TEST(ClassRegistry, FindsTheLaterOfTwoClassesWithOneName) {
  const auto classes = platform::makeLinuxPlatform().classes;
  const auto first = std::make_shared<platform::ClassInfo>("Twice");
  const platform::ClassRegistration early{first};
  const auto second = std::make_shared<platform::ClassInfo>("Twice");
  const platform::ClassRegistration late{second};
  EXPECT_EQ(classes->classNamed("Twice"), second.get());
}

}  // namespace
}  // namespace tests
