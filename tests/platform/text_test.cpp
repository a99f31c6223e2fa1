#include "platform/text.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>
#include <vector>

using platform::isWellFormedText;
using platform::StringConstant;
using platform::Text;
using namespace std::string_view_literals;

namespace {

constexpr StringConstant kConstant = "a constant";

TEST(Texts, KeepWellFormedUtf8) {
  for (const std::string_view text :
       {""sv, "plain"sv, "\x01\x7F"sv, "\u00E9\u20AC"sv, "\U0001F600"sv, "\uFFFF"sv, "\xC2\x80"sv, "\xDF\xBF"sv,
        "\xE0\xA0\x80"sv, "\xED\x9F\xBF"sv, "\xEE\x80\x80"sv, "\xF0\x90\x80\x80"sv, "\xF4\x8F\xBF\xBF"sv}) {
    EXPECT_TRUE(isWellFormedText(text));
    EXPECT_EQ(Text{text}, text);
  }
}

TEST(Texts, ReplaceWhatIsNotWellFormed) {
  const std::vector<std::pair<std::string_view, std::string_view>> rows{
      {"a\0b"sv, "a\uFFFDb"sv},
      {"\xFF"sv, "\uFFFD"sv},
      {"\x80"sv, "\uFFFD"sv},
      {"a\xC3"sv, "a\uFFFD"sv},
      {"\xC0\x80"sv, "\uFFFD\uFFFD"sv},
      {"\xC1\xBF"sv, "\uFFFD\uFFFD"sv},
      {"\xE0\x9F\xBF"sv, "\uFFFD\uFFFD\uFFFD"sv},
      {"\xED\xA0\x80"sv, "\uFFFD\uFFFD\uFFFD"sv},
      {"\xF0\x8F\xBF\xBF"sv, "\uFFFD\uFFFD\uFFFD\uFFFD"sv},
      {"\xF4\x90\x80\x80"sv, "\uFFFD\uFFFD\uFFFD\uFFFD"sv},
      {"\xF5\x80\x80\x80"sv, "\uFFFD\uFFFD\uFFFD\uFFFD"sv},
      {"\xE2\x82"
       "a"sv,
       "\uFFFD\uFFFDa"sv},
  };
  for (const auto& [bytes, expected] : rows) {
    EXPECT_FALSE(isWellFormedText(bytes));
    EXPECT_EQ(Text{bytes}, expected);
    EXPECT_TRUE(isWellFormedText(Text{bytes}.view()));
  }
}

TEST(Texts, ShareTheCharactersOfAConstant) {
  const Text text = kConstant;
  EXPECT_EQ(text.view().data(), kConstant.view().data());
  EXPECT_EQ(text, kConstant);
}

TEST(Texts, ShareTheirCharactersWithTheirCopies) {
  const Text text{std::string{"shared"}};
  const Text copy = text;  // NOLINT(performance-unnecessary-copy-initialization)
  EXPECT_EQ(copy.view().data(), text.view().data());
}

TEST(Texts, AreEqualByTheirCharacters) {
  EXPECT_EQ(Text{"same"}, Text{std::string{"same"}});
  EXPECT_FALSE(Text{"same"} == Text{"Same"});
  EXPECT_FALSE(Text{"same"} == Text{"sam"});
  EXPECT_EQ(Text{}, ""sv);
}

}  // namespace
