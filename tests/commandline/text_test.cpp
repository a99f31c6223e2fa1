#include "commandline/text.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

namespace tests {
namespace {

using commandline::columnsOf;
using commandline::shortened;
using Lines = std::vector<std::string>;

constexpr const char* kFamily = "\U0001F468\u200D\U0001F469\u200D\U0001F467";
constexpr const char* kGermany = "\U0001F1E9\U0001F1EA";

TEST(Columns, AreCountedByWhatIsSeen) {
  const std::pair<const char*, std::size_t> cases[] = {
      {"", 0},
      {"plain", 5},
      {"Öre", 3},
      {"Cafe\u0301", 4},
      {"日本", 4},
      {"한국", 4},
      {"ｗｉｄｅ", 8},
      {"\U0001F680", 2},                                // a rocket
      {"\u2764\uFE0F", 2},                              // a heart in colour
      {"\u2764", 1},                                    // and one that is a letter
      {"1\uFE0F\u20E3", 2},                             // a key
      {"\U0001F44D\U0001F3FD", 2},                      // a hand with its skin
      {"\U0001F3F4\U000E0067\U000E0062\U000E007F", 2},  // a flag that is spelt with tags
      {"ก็ดี", 2},
      {"กำ", 2},
      {"नमस्ते", 4},
      {"שלום", 4},
      {"مَرْحَبًا", 5},
  };
  for (const auto& [text, columns] : cases) EXPECT_EQ(columnsOf(text), columns) << text;
  EXPECT_EQ(columnsOf(kFamily), 2U);
  EXPECT_EQ(columnsOf(kGermany + std::string{kGermany}), 4U);
}

TEST(Shortening, LeavesWhatFits) {
  EXPECT_EQ(shortened("twelve bytes", 12), "twelve bytes");
  EXPECT_EQ(shortened("", 1), "");
  EXPECT_EQ(shortened("日本", 4), "日本");
}

TEST(Shortening, KeepsTheBeginningAndTheEnd) {
  EXPECT_EQ(shortened("0123456789", 7), "012…789");
  EXPECT_EQ(shortened("0123456789", 6), "012…89");
  EXPECT_EQ(shortened("0123456789", 2), "0…");
  EXPECT_EQ(shortened("0123456789", 1), "…");
}

TEST(Shortening, TearsNoCharacterApart) {
  EXPECT_EQ(shortened("日本語日本語", 7), "日…本語");
  EXPECT_EQ(shortened(std::string{"ab"} + kFamily + "cdef" + kGermany, 7), "ab…ef" + std::string{kGermany});
  EXPECT_EQ(shortened("e\u0301e\u0301e\u0301e\u0301", 3), "e\u0301…e\u0301");
}

TEST(Shortening, NeverTakesMoreThanItMay) {
  const std::string text = "日a" + std::string{kFamily} + "नमस्ते" + kGermany + "กำ plain";
  for (std::size_t columns = 1; columns < 30; ++columns) {
    EXPECT_LE(columnsOf(shortened(text, columns)), columns) << columns;
  }
}

TEST(Wrapping, BreaksBetweenWords) {
  EXPECT_EQ(commandline::wrapped("one two three", 7), (Lines{"one two", "three"}));
  EXPECT_EQ(commandline::wrapped("uninterrupted word", 4), (Lines{"uninterrupted", "word"}));
  EXPECT_EQ(commandline::wrapped("", 4), (Lines{""}));
}

TEST(PrintableLines, StayLinesAndAreHarmless) {
  EXPECT_EQ(commandline::printableLines("a\n\x1b[2Jb\r\n\n"), "a\n\uFFFD[2Jb\uFFFD\n\n");
  EXPECT_EQ(commandline::printableLines(""), "");
  EXPECT_EQ(commandline::printableLines("last"), "last");
}

}  // namespace
}  // namespace tests
