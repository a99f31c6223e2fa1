#include "platform/characters.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>

namespace tests {
namespace {

using namespace std::string_view_literals;

struct Case {
  std::string_view text;
  std::string_view asLine;
  std::string_view asCell;
};

constexpr Case kCases[] = {
    {"", "", ""},
    {"plain é 日本", "plain é 日本", "plain é 日本"},
    {"a\tb", "a\tb", "a\uFFFDb"},
    {"a\nb\rc", "a\\nb\\rc", "a\uFFFDb\uFFFDc"},
    {"\0\v\f"sv, "\\x00\\x0b\\x0c", "\uFFFD\uFFFD\uFFFD"},
    {"\x1b[31m\x7f", "\\x1b[31m\\x7f", "\uFFFD[31m\uFFFD"},
    {"\u0085\u009B2J\u00A0", "\\x85\\x9b2J\u00A0", "\uFFFD\uFFFD2J\u00A0"},
    {"\u2028\u2029\u2030", "\\u2028\\u2029\u2030", "\uFFFD\uFFFD\u2030"},
    {"\u202Eab\u2066c\u2069", "\\u202eab\\u2066c\\u2069", "\uFFFDab\uFFFDc\uFFFD"},
    {"\u200F\u05D0\u200E", "\u200F\u05D0\u200E", "\u200F\u05D0\u200E"},
    {"\xc2[\xc2\n\x9b", "\\xc2[\\xc2\\n\\x9b", "\uFFFD[\uFFFD\uFFFD\uFFFD"},
    {"cut \xe2\x82", "cut \\xe2\\x82", "cut \uFFFD\uFFFD"},
};

TEST(SingleLines, SpellOutWhatWouldBreakThemOrSteerATerminal) {
  for (const Case& each : kCases) EXPECT_EQ(platform::singleLine(each.text), each.asLine);
}

TEST(PrintableText, HasAMarkInPlaceOfWhatWouldBreakItsLineOrSteerATerminal) {
  for (const Case& each : kCases) EXPECT_EQ(platform::printable(each.text), each.asCell);
}

TEST(SafeText, StaysAsItIs) {
  for (const Case& each : kCases) {
    EXPECT_EQ(platform::singleLine(each.asLine), each.asLine);
    EXPECT_EQ(platform::printable(each.asCell), each.asCell);
  }
}

TEST(UpperCase, IsThatOfEveryScript) {
  EXPECT_EQ(platform::upperCased("0b6c-az"), "0B6C-AZ");
  EXPECT_EQ(platform::upperCased("öre ñ ÿ žβя"), "ÖRE Ñ Ÿ ŽΒЯ");
  EXPECT_EQ(platform::upperCased("日本 \U00010428"), "日本 \U00010400");
}

TEST(UpperCase, WritesALetterWithSeveralCapitalsAsThose) {
  const std::pair<const char*, const char*> table[] = {{"straße", "STRASSE"},       {"ﬁn", "FIN"}, {"ŉ", "ʼN"},
                                                       {"ΐ", "\u0399\u0308\u0301"}, {"և", "ԵՒ"},   {"ᾳ", "ΑΙ"}};
  for (const auto& [text, upper] : table) EXPECT_EQ(platform::upperCased(text), upper);
}

TEST(UpperCase, LeavesCapitalsAsTheyAre) {
  for (const char* const capitals : {"ÀŸ", "ẞ", "İ", "\u212A", "\u2126"}) {
    EXPECT_EQ(platform::upperCased(capitals), capitals);
  }
}

TEST(UpperCase, LeavesBytesThatAreNoCharacters) { EXPECT_EQ(platform::upperCased("a\xff\xc3z"sv), "A\xff\xc3Z"); }

TEST(CaseFolding, MakesTextsEqualThatDifferByCaseAlone) {
  EXPECT_EQ(platform::caseFolded("Straße ΜΑΪΟΣ"), platform::caseFolded("STRASSE μαϊος"));
  EXPECT_EQ(platform::caseFolded("Cafe\u0301"), platform::caseFolded("CAFÉ"));
  EXPECT_NE(platform::caseFolded("Mail"), platform::caseFolded("Mall"));
}

TEST(CaseFolding, LeavesWhatIsNoText) { EXPECT_EQ(platform::caseFolded("A\xff"sv), "A\xff"); }

}  // namespace
}  // namespace tests
