#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "platform/property_value.h"

using platform::Dictionary;
using platform::PropertyValue;

namespace {

Dictionary withKeys(int count) {
  Dictionary dictionary;
  for (int key = 0; key < count; ++key) dictionary.set("key " + std::to_string(key), key);
  return dictionary;
}

TEST(SharedDictionaries, StayAsTheyWereWhenACopyIsEdited) {
  const Dictionary original = withKeys(3);
  Dictionary copy = original;
  EXPECT_TRUE(copy.isIdenticalTo(original));
  copy.set("key 1", "changed");
  EXPECT_EQ(original, withKeys(3));
  EXPECT_EQ(*copy.find("key 1"), PropertyValue{"changed"});
}

TEST(SharedDictionaries, AreNotCopiedForASoleHolder) {
  Dictionary dictionary = withKeys(3);
  const auto* const before = dictionary.begin();
  dictionary.set("key 1", "changed");
  EXPECT_EQ(dictionary.begin(), before);
}

TEST(SharedDictionaries, MayBeSearchedByManyThreadsWhileAnotherEditsItsOwnCopy) {
  for (const int size : {8, 100}) {
    Dictionary mine = withKeys(size);
    std::vector<std::thread> readers;
    readers.reserve(4);
    for (int reader = 0; reader < 4; ++reader) {
      readers.emplace_back([copy = mine, size] {
        for (int key = 0; key < size; ++key) EXPECT_EQ(*copy.find("key " + std::to_string(key)), PropertyValue{key});
      });
    }
    for (int round = 0; round < 100; ++round) mine.set("key 0", round);
    for (std::thread& reader : readers) reader.join();
    EXPECT_EQ(*mine.find("key 0"), PropertyValue{99});
  }
}

}  // namespace
