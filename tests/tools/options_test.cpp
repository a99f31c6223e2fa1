#include "tools/options.h"

#include <gtest/gtest.h>

#include <ostream>

namespace tools {
namespace {

using Arguments = std::vector<const char*>;

struct Case {
  Arguments arguments;
  bool opensModules;
  friend void PrintTo(const Case& given, std::ostream* stream) {
    for (const char* const argument : given.arguments) *stream << argument << ' ';
  }
};

class OpeningModules : public ::testing::TestWithParam<Case> {};

TEST_P(OpeningModules, IsForThisDeviceHoweverItsRootIsWrittenElseOnRequest) {
  EXPECT_EQ(parseArguments(GetParam().arguments).opensModules(), GetParam().opensModules);
}

INSTANTIATE_TEST_SUITE_P(
    Roots, OpeningModules,
    ::testing::Values(Case{{"list"}, true}, Case{{"--root", "/", "list"}, true}, Case{{"--root=//", "list"}, true},
                      Case{{"--root", "/usr/..", "list"}, true}, Case{{"--root", "/proc/self/root", "list"}, true},
                      Case{{"--root", "/usr", "list"}, false}, Case{{"--root", "/usr", "--modules", "list"}, true},
                      Case{{"list", "--modules", "--root=/usr"}, true}, Case{{"list", "--home", "/usr"}, true}));

TEST(Options, StandBeforeAndAfterTheCommand) {
  const auto options = parseArguments(Arguments{"--json", "rename", "--root=/usr", "A", "--modules", "New"});
  EXPECT_EQ(options.command, "rename");
  EXPECT_EQ(options.arguments, (std::vector<std::string>{"A", "New"}));
  EXPECT_TRUE(options.printsJson);
  EXPECT_EQ(options.device.systemRoot, "/usr");
}

TEST(Options, EndAtTwoHyphens) {
  const auto options = parseArguments(Arguments{"rename", "A", "--", "--json", "--"});
  EXPECT_EQ(options.arguments, (std::vector<std::string>{"A", "--json", "--"}));
  EXPECT_FALSE(options.printsJson);
}

TEST(Options, LeadToWholePaths) {
  const auto options = parseArguments(Arguments{"list", "--home", "here", "--resources=there"});
  EXPECT_EQ(options.device.home, std::filesystem::current_path() / "here");
  EXPECT_EQ(options.device.resources, std::filesystem::current_path() / "there");
}

TEST(Options, ThatSetPropertiesMayBeRepeated) {
  const auto options = parseArguments(Arguments{"recover", "--set", "A=1", "F", "--set=B:=null", "M1"});
  EXPECT_EQ(options.settings, (std::vector<std::string>{"A=1", "B:=null"}));
  EXPECT_EQ(options.arguments, (std::vector<std::string>{"F", "M1"}));
}

TEST(Options, ThatSetPropertiesNeedAValueEachTime) {
  EXPECT_THROW(static_cast<void>(parseArguments(Arguments{"recover", "--set", "A=1", "--set"})), Failure);
  EXPECT_THROW(static_cast<void>(parseArguments(Arguments{"recover", "--set=", "F"})), Failure);
}

TEST(Options, AreNotFoundInAnEmptyWord) {
  EXPECT_THROW(static_cast<void>(parseArguments(Arguments{"", "list"})), Failure);
}

}  // namespace
}  // namespace tools
