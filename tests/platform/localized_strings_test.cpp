#include <gtest/gtest.h>

#include <cstdlib>

#include "tests/support/fake_platform.h"
#include "tests/support/real_device.h"

namespace tests {
namespace {

constexpr std::string_view table = "DeviceLocalAccount";

class Strings : public testing::Test {
 protected:
  ScratchDirectory resources;
  std::shared_ptr<platform::LocalizedStrings> strings =
      platform::makeLinuxPlatform({.resources = resources.path()}).strings;

  void SetUp() override {
    for (const char* const variable : {"LC_ALL", "LC_MESSAGES", "LANG"}) ::unsetenv(variable);
    put("en", "<key>A</key><string>color</string><key>B</key><string>base</string>");
    put("en_GB", "<key>A</key><string>colour</string>");
    put("de", "<key>A</key><string>Farbe</string><key>B</key><integer>1</integer>");
    put("de_AT", "<key>C</key><string>Jänner</string>");
    put("zh_Hant", "<key>A</key><string>顏色</string>");
  }
  void put(const std::string& language, const std::string& entries) const {
    resources.put("strings/" + language + "/" + std::string{table} + ".strings", RealDevice::xml(entries));
  }
};

TEST_F(Strings, AreEnglishWithoutALanguage) {
  EXPECT_EQ(strings->text(table, "A"), "color");
  for (const char* const language : {"C", "POSIX", "C.UTF-8", "", "xx_YY", "../../etc", "\xff"}) {
    ::setenv("LANG", language, 1);
    EXPECT_EQ(strings->text(table, "A"), "color") << language;
  }
}

TEST_F(Strings, AreInTheUsersLanguage) {
  const std::pair<const char*, const char*> cases[] = {{"de_DE.UTF-8", "Farbe"}, {"de", "Farbe"},
                                                       {"de_AT@euro", "Farbe"},  {"en_GB", "colour"},
                                                       {"en_US.UTF-8", "color"}, {"zh_Hant_TW", "顏色"}};
  for (const auto& [language, text] : cases) {
    ::setenv("LANG", language, 1);
    EXPECT_EQ(strings->text(table, "A"), text) << language;
  }
}

TEST_F(Strings, FallBackFromRegionToLanguageToEnglish) {
  ::setenv("LANG", "de_AT.UTF-8", 1);
  EXPECT_EQ(strings->text(table, "C"), "Jänner");
  EXPECT_EQ(strings->text(table, "A"), "Farbe");
  EXPECT_EQ(strings->text(table, "B"), "base");  // what the language has there is no text
}

TEST_F(Strings, TakeAnEmptyVariableForOneThatIsNotSet) {
  ::setenv("LC_ALL", "", 1);
  ::setenv("LANG", "de", 1);
  EXPECT_EQ(strings->text(table, "A"), "Farbe");
}

TEST_F(Strings, FollowTheEnvironmentsOrder) {
  ::setenv("LANG", "en", 1);
  ::setenv("LC_MESSAGES", "de", 1);
  EXPECT_EQ(strings->text(table, "A"), "Farbe");
  ::setenv("LC_ALL", "en_GB", 1);
  EXPECT_EQ(strings->text(table, "A"), "colour");
}

TEST_F(Strings, AreAbsentWithoutATableOrAKey) {
  EXPECT_EQ(strings->text(table, "Z"), std::nullopt);
  EXPECT_EQ(strings->text("NoTable", "A"), std::nullopt);
  EXPECT_EQ(strings->text("../en/DeviceLocalAccount", "A"), std::nullopt);
}

TEST_F(Strings, AreReadOnce) {
  EXPECT_EQ(strings->text(table, "A"), "color");
  put("en", "<key>A</key><string>changed</string>");
  EXPECT_EQ(strings->text(table, "A"), "color");
}

TEST(StringsOfATest, AreWhatTheTestSays) {
  FakeLocalizedStrings strings;
  strings.texts[{"Table", "A"}] = "text";
  EXPECT_EQ(strings.text("Table", "A"), "text");
  EXPECT_EQ(strings.text("Table", "B"), std::nullopt);
}

}  // namespace
}  // namespace tests
