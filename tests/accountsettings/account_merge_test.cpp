#include <gtest/gtest.h>

#include "tests/support/account_store.h"

namespace tests {
namespace {

using accountsettings::AccountsManager;

constexpr const char* kMerge = "-[AccountsManager mergeInMemoryProperties:originalProperties:onDiskProperties:]";

Dictionary merged(const Dictionary& original, const Dictionary& inMemory, const Dictionary& onDisk) {
  return AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(inMemory, original, &onDisk);
}

class MergingProperties : public AccountStore {};

struct Combination {
  const char* original;
  const char* inMemory;
  const char* onDisk;
  const char* result;
};

// Null is an absent key; equal letters are equal values.
constexpr const char* kAbsent = nullptr;
constexpr Combination kCombinations[]{
    // original, in memory, on disk, result
    {kAbsent, kAbsent, kAbsent, kAbsent},  // nobody has it
    {kAbsent, kAbsent, "D", "D"},          // added on disk
    {kAbsent, "M", kAbsent, "M"},          // added in memory
    {kAbsent, "M", "M", "M"},              // added by both, alike
    {kAbsent, "M", "D", "M"},              // added by both, memory wins
    {"O", kAbsent, kAbsent, kAbsent},      // removed by both
    {"O", kAbsent, "O", kAbsent},          // removed in memory
    {"O", kAbsent, "D", kAbsent},          // removed in memory, changed on disk: memory wins
    {"O", "O", kAbsent, kAbsent},          // removed on disk
    {"O", "O", "O", "O"},                  // untouched
    {"O", "O", "D", "D"},                  // changed on disk
    {"O", "M", kAbsent, "M"},              // changed in memory, removed on disk: memory wins
    {"O", "M", "O", "M"},                  // changed in memory
    {"O", "M", "M", "M"},                  // changed by both, alike
    {"O", "M", "D", "M"},                  // changed by both, memory wins
};

void PrintTo(const Combination& keys, std::ostream* stream) {
  const auto letter = [](const char* value) { return value == nullptr ? "-" : value; };
  *stream << letter(keys.original) << letter(keys.inMemory) << letter(keys.onDisk);
}

class MergingOneKey : public AccountStore, public testing::WithParamInterface<Combination> {};

TEST_P(MergingOneKey, GivesTheValueOfWhoeverChangedItAndOfMemoryWhereBothDid) {
  const auto with = [](const char* value) {
    Dictionary dictionary{{"Other", 1}};  // neither side is empty, which would be no merge
    if (value != nullptr) dictionary.set("Key", value);
    return dictionary;
  };
  const Combination& keys = GetParam();
  EXPECT_EQ(merged(with(keys.original), with(keys.inMemory), with(keys.onDisk)), with(keys.result));
}

INSTANTIATE_TEST_SUITE_P(, MergingOneKey, testing::ValuesIn(kCombinations), [](const auto& combination) {
  const auto letter = [](const char* value) { return std::string{value == nullptr ? "Absent" : value}; };
  const Combination& keys = combination.param;
  return letter(keys.original) + letter(keys.inMemory) + letter(keys.onDisk);
});

TEST_F(MergingProperties, TakesEachKeyByItself) {
  EXPECT_EQ(merged({{"A", 1}, {"B", 2}}, {{"A", 1}, {"B", 3}, {"C", 4}}, {{"A", 5}, {"B", 2}, {"D", 6}}),
            (Dictionary{{"A", 5}, {"B", 3}, {"C", 4}, {"D", 6}}));
}

TEST_F(MergingProperties, LetsARemovalInMemoryWinOverAChangeOnDisk) {
  EXPECT_EQ(merged({{"A", 1}, {"B", 2}}, {{"A", 1}}, {{"A", 1}, {"B", 7}}), (Dictionary{{"A", 1}}));
}

TEST_F(MergingProperties, GivesMemoryItselfWhereThereIsNothingToMergeWith) {
  const Dictionary memory{{"A", 1}};
  EXPECT_TRUE(merged({}, memory, {{"A", 2}}).isIdenticalTo(memory));
  EXPECT_TRUE(merged({{"A", 3}}, memory, {}).isIdenticalTo(memory));
  EXPECT_TRUE(AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(memory, {{"A", 3}}, nullptr)
                  .isIdenticalTo(memory));
}

TEST_F(MergingProperties, TakesANestedValueWholeFromOneSide) {
  const auto nested = [](const char* key) { return Dictionary{{"Inner", Dictionary{{key, 1}}}}; };
  EXPECT_EQ(merged(nested("O"), nested("M"), nested("D")), nested("M"));
  EXPECT_EQ(merged(nested("O"), nested("O"), nested("D")), nested("D"));
}

TEST_F(MergingProperties, TellsEqualNumbersOfDifferentKindsApart) {
  EXPECT_EQ(merged({{"A", 1}}, {{"A", true}}, {{"A", 2}}), (Dictionary{{"A", true}}));
  EXPECT_EQ(merged({{"A", 1}}, {{"A", 1.0}}, {{"A", 2}}), (Dictionary{{"A", 1.0}}));
}

TEST_F(MergingProperties, KeepsTheOrderOfTheFileAndAppendsWhatIsNew) {
  const Dictionary result =
      merged({{"A", 1}, {"B", 1}}, {{"New", 1}, {"B", 2}, {"A", 1}}, {{"B", 1}, {"X", 1}, {"A", 1}});
  std::vector<std::string> keys;
  for (const auto& entry : result) keys.push_back(entry.key.string());
  EXPECT_EQ(keys, (std::vector<std::string>{"B", "X", "A", "New"}));
}

TEST_F(MergingProperties, SaysWhatItMergesAndWhatCameOfIt) {
  (void)merged({{"A", 1}}, {{"A", 2}}, {{"A", 3}});
  EXPECT_EQ(messagesOf(kMerge),
            (std::vector<std::string>{"Merging inmem {A = 2} orig {A = 1} onDisk {A = 3}", "Merged to {A = 2}"}));
}

TEST_F(MergingProperties, SaysSoToTheLetterWhereTheFileHasNoSuchAccount) {
  (void)AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties({{"A", 2}}, {}, nullptr);
  EXPECT_EQ(messagesOf(kMerge),
            (std::vector<std::string>{"Merging inmem {A = 2} orig {} onDisk (null)", "Merged to {A = 2}"}));
}

}  // namespace
}  // namespace tests
