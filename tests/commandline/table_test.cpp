#include "commandline/table.h"

#include <gtest/gtest.h>

#include <sstream>

#include "commandline/text.h"

namespace tests {
namespace {

using commandline::columnsOf;
using commandline::Emphasis;
using commandline::Page;
using commandline::Row;
using commandline::table;

std::size_t widestLine(const std::string& lines) {
  std::istringstream stream{lines};
  std::size_t widest = 0;
  for (std::string line; std::getline(stream, line);) widest = std::max(widest, columnsOf(line));
  return widest;
}

TEST(Tables, AlignTheirColumnsAndEndNoLineInBlanks) {
  EXPECT_EQ(table({{"A", "B", "C"}, {"long", "", "x"}, {"y", "", ""}}), "A     B  C\nlong     x\ny\n");
}

TEST(Tables, AlignByWhatIsSeen) {
  EXPECT_EQ(table({{"日本", "x"}, {"\U0001F680", "x"}, {"ก็ดี", "x"}, {"e\u0301", "x"}}),
            "日本  x\n\U0001F680    x\nก็ดี    x\ne\u0301     x\n");
}

TEST(Tables, ShowWhatWouldSteerATerminalAsHarmless) {
  EXPECT_EQ(table({{"a\x1b[2J\u202Eb\nc", "x"}}), "a\uFFFD[2J\uFFFDb\uFFFDc  x\n");
}

TEST(Tables, AreAsWideAsTheyMustBeWhereNobodyLimitsThem) {
  EXPECT_EQ(widestLine(table({{std::string(500, 'a'), "b"}})), 503U);
}

TEST(Tables, FitTheirPageByShorteningTheWidestColumn) {
  EXPECT_EQ(table({{"short", std::string(100, '-') + "end"}}, Page{.columns = 20}), "short  ------…---end\n");
  const Row row{std::string(60, 'a'), std::string(50, 'b'), "kept whole", "日本語日本語日本語"};
  for (const std::size_t columns : {40U, 80U, 200U}) EXPECT_LE(widestLine(table({row}, {.columns = columns})), columns);
}

TEST(Tables, KeepAFewColumnsOfEachCellOnTheNarrowestPage) {
  EXPECT_EQ(table({{"0123456789", "0123456789"}}, Page{.columns = 3}), "0123…789  0123…789\n");
}

TEST(Tables, AreEmphasisedWhereThePageIs) {
  const std::vector<Row> rows{Row{{"HEAD"}, Emphasis::strong}, Row{{"plain"}}};
  EXPECT_EQ(table(rows), "HEAD\nplain\n");
  EXPECT_EQ(table(rows, {.isEmphasised = true}), "\x1b[1mHEAD\x1b[0m\nplain\n");
}

TEST(Meanings, GoOnBelowThemselves) {
  EXPECT_EQ(commandline::meanings({{"--a", "one two three four five six"}, {"--bc", "x"}}, {.columns = 30}),
            "  --a   one two three four\n        five six\n  --bc  x\n");
  EXPECT_EQ(commandline::meanings({{"--a", "one two three four five six"}}), "  --a  one two three four five six\n");
}

}  // namespace
}  // namespace tests
