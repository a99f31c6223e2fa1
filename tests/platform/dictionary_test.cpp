#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "platform/property_value.h"
#include "tests/support/colliding_keys.h"

using platform::Array;
using platform::Dictionary;
using platform::PropertyValue;

namespace {

std::vector<std::string> keysOf(const Dictionary& dictionary) {
  std::vector<std::string> keys;
  for (const auto& [key, value] : dictionary) keys.push_back(key.string());
  return keys;
}

Dictionary numbered(int count) {
  Dictionary dictionary;
  for (int key = 0; key < count; ++key) dictionary.set(std::to_string(key), key);
  return dictionary;
}

TEST(Dictionaries, KeepTheOrderInWhichKeysCame) {
  Dictionary dictionary{{"b", 1}, {"a", 2}};
  dictionary.set("b", 3);
  dictionary.set("c", 4);
  EXPECT_EQ(keysOf(dictionary), (std::vector<std::string>{"b", "a", "c"}));
  EXPECT_EQ(*dictionary.find("b"), PropertyValue{3});
}

TEST(Dictionaries, TakeNoLongerForKeysThatAreMadeToCollide) {
  constexpr std::size_t kCount = 30'000;
  const auto fill = [](const std::vector<std::string>& keys) {
    return tests::secondsFor([&keys] {
      Dictionary dictionary;
      for (const std::string& key : keys) dictionary.set(key, true);
    });
  };
  const std::vector<std::string> colliding = tests::CollidingKeys::make(kCount);
  for (const std::string& key : colliding) {
    ASSERT_EQ(std::hash<std::string_view>{}(key), std::hash<std::string_view>{}(colliding[0]));
  }
  EXPECT_LT(fill(colliding), 4 * fill(tests::harmlessKeys(kCount)) + 0.2);
}

TEST(Dictionaries, AnswerTheValueThatIsTakenOut) {
  Dictionary dictionary{{"a", 1}, {"b", 2}};
  EXPECT_EQ(dictionary.remove("a"), PropertyValue{1});
  EXPECT_EQ(dictionary.remove("a"), std::nullopt);
  EXPECT_EQ(keysOf(dictionary), std::vector<std::string>{"b"});
}

TEST(Dictionaries, PutAKeyThatComesBackAtTheEnd) {
  Dictionary dictionary{{"a", 1}, {"b", 2}};
  EXPECT_TRUE(dictionary.remove("a"));
  dictionary.set("a", 3);
  EXPECT_EQ(keysOf(dictionary), (std::vector<std::string>{"b", "a"}));
}

TEST(Dictionaries, AreEqualWhateverTheirOrder) {
  EXPECT_EQ((Dictionary{{"a", 1}, {"b", 2}}), (Dictionary{{"b", 2}, {"a", 1}}));
  EXPECT_NE((Dictionary{{"a", 1}, {"b", 2}}), (Dictionary{{"a", 1}}));
  EXPECT_NE((Dictionary{{"a", 1}, {"b", 2}}), (Dictionary{{"a", 1}, {"c", 2}}));
  EXPECT_EQ(Dictionary{}, Dictionary{});
}

TEST(Dictionaries, FindTheSameWhateverTheirSize) {
  for (const int size : {1, 32, 33, 34, 1000}) {
    Dictionary dictionary = numbered(size);
    dictionary.set("0", "changed");
    EXPECT_EQ(*dictionary.find("0"), PropertyValue{"changed"});
    EXPECT_EQ(dictionary.find("absent"), nullptr);
    EXPECT_TRUE(dictionary.remove("0"));
    EXPECT_FALSE(dictionary.contains("0"));
    for (int key = 1; key < size; ++key) EXPECT_EQ(*dictionary.find(std::to_string(key)), PropertyValue{key});
  }
}

TEST(Dictionaries, AnswerTypedReadsOfTheAskedKindAlone) {
  const Dictionary dictionary{{"text", "t"}, {"array", Array{1}}, {"dictionary", Dictionary{{"k", 1}}}};
  EXPECT_EQ(dictionary.text("text")->view(), "t");
  EXPECT_EQ(dictionary.text("array"), nullptr);
  EXPECT_EQ(dictionary.array("array")->size(), 1U);
  EXPECT_EQ(dictionary.array("dictionary"), nullptr);
  EXPECT_EQ(dictionary.dictionary("dictionary")->size(), 1U);
  EXPECT_EQ(dictionary.dictionary("text"), nullptr);
  EXPECT_EQ(dictionary.text("absent"), nullptr);
}

TEST(Dictionaries, MayBeSetToAValueOfTheirOwn) {
  Dictionary dictionary = numbered(40);
  for (int round = 0; round < 40; ++round) dictionary.set("copy " + std::to_string(round), *dictionary.find("7"));
  EXPECT_EQ(*dictionary.find("copy 39"), PropertyValue{7});
}

TEST(Dictionaries, AreEmptyOnceCleared) {
  Dictionary dictionary = numbered(3);
  const Dictionary copy = dictionary;
  dictionary.clear();
  EXPECT_TRUE(dictionary.empty());
  EXPECT_EQ(dictionary.begin(), dictionary.end());
  EXPECT_EQ(copy.size(), 3U);
}

}  // namespace
