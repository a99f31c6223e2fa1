#include "platform/insertion_ordered_map.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/support/colliding_keys.h"

using platform::InsertionOrderedMap;

namespace {

std::vector<std::string> keysOf(const InsertionOrderedMap<int>& map) {
  std::vector<std::string> keys;
  for (const auto& entry : map) keys.push_back(entry.first.string());
  return keys;
}

TEST(InsertionOrderedMap, IsWalkedInTheOrderInWhichKeysCame) {
  InsertionOrderedMap<int> map;
  map.set("b", 1);
  map.set("a", 2);
  map.set("b", 3);
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"b", "a"}));
  EXPECT_EQ(*map.find("b"), 3);
}

TEST(InsertionOrderedMap, TakesNoLongerForKeysThatAreMadeToCollide) {
  constexpr std::size_t kCount = 30'000;
  const auto fill = [](const std::vector<std::string>& keys) {
    return tests::secondsFor([&keys] {
      InsertionOrderedMap<int> map;
      for (const std::string& key : keys) map.set(key, 1);
    });
  };
  EXPECT_LT(fill(tests::CollidingKeys::make(kCount)), 4 * fill(tests::harmlessKeys(kCount)) + 0.2);
}

TEST(InsertionOrderedMap, PutsAKeyThatComesBackAtTheEnd) {
  InsertionOrderedMap<int> map;
  map.set("a", 1);
  map.set("b", 2);
  EXPECT_TRUE(map.remove("a"));
  EXPECT_FALSE(map.remove("a"));
  map.set("a", 3);
  EXPECT_EQ(keysOf(map), (std::vector<std::string>{"b", "a"}));
}

TEST(InsertionOrderedMap, CopiesStandOnTheirOwn) {
  InsertionOrderedMap<int> map;
  map.set("a", 1);
  InsertionOrderedMap<int> copy = map;
  map.clear();
  copy.set("b", 2);
  EXPECT_TRUE(map.empty());
  EXPECT_EQ(keysOf(copy), (std::vector<std::string>{"a", "b"}));
}

}  // namespace
