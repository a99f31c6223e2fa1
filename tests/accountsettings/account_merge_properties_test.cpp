#include <gtest/gtest.h>
#include <rapidcheck.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "tests/support/account_store.h"

namespace tests {
namespace {

using accountsettings::AccountsManager;

const Array kValues{1, 1.0, true, "1", Array{1}, Dictionary{{"1", 1}}, std::uint64_t{1} << 63U};

// A dictionary in small numbers: for each of six keys 0, the key is absent, or the value's place in the list above.
using Sketch = std::vector<std::size_t>;

std::string keyOf(std::size_t number) { return "key " + std::to_string(number); }

Dictionary drawn(const Sketch& sketch) {
  Dictionary dictionary;
  for (std::size_t key = 0; key < sketch.size(); ++key) {
    if (sketch[key] != 0) dictionary.set(keyOf(key), kValues[sketch[key] - 1]);
  }
  return dictionary;
}

rc::Gen<Sketch> sketches() {
  return rc::gen::container<Sketch>(6, rc::gen::inRange(std::size_t{0}, kValues.size() + 1));
}

rc::Gen<Sketch> nonEmptySketches() {
  return rc::gen::suchThat(sketches(), [](const Sketch& sketch) { return !drawn(sketch).empty(); });
}

Dictionary merged(const Dictionary& original, const Dictionary& inMemory, const Dictionary& onDisk) {
  return AccountsManager::mergeInMemoryProperties_originalProperties_onDiskProperties(inMemory, original, &onDisk);
}

std::optional<PropertyValue> at(const Dictionary& dictionary, std::string_view key) {
  const PropertyValue* const value = dictionary.find(key);
  return value == nullptr ? std::nullopt : std::optional{*value};
}

class MergingAnyProperties : public AccountStore {
 protected:
  MergingAnyProperties() {
    device.systemLog->readers = false;
    setenv("RC_PARAMS", "max_success=2000", 0);
  }
};

TEST_F(MergingAnyProperties, GivesMemoryWhereTheFileIsUnchanged) {
  EXPECT_TRUE(rc::check([] {
    const Dictionary original = drawn(*nonEmptySketches());
    const Dictionary memory = drawn(*sketches());
    RC_ASSERT(merged(original, memory, original) == memory);
  }));
}

TEST_F(MergingAnyProperties, GivesTheFileWhereMemoryIsUnchanged) {
  EXPECT_TRUE(rc::check([] {
    const Dictionary original = drawn(*nonEmptySketches());
    const Dictionary disk = drawn(*nonEmptySketches());
    RC_ASSERT(merged(original, original, disk) == disk);
  }));
}

TEST_F(MergingAnyProperties, GivesWhatBothSayWhereTheyAgree) {
  EXPECT_TRUE(rc::check([] {
    const Dictionary both = drawn(*nonEmptySketches());
    RC_ASSERT(merged(drawn(*sketches()), both, both) == both);
  }));
}

TEST_F(MergingAnyProperties, DecidesEveryKeyByItselfAndLosesNone) {
  EXPECT_TRUE(rc::check([] {
    const Dictionary original = drawn(*nonEmptySketches());
    const Dictionary memory = drawn(*sketches());
    const Dictionary disk = drawn(*nonEmptySketches());
    const Dictionary result = merged(original, memory, disk);
    for (std::size_t number = 0; number < 6; ++number) {
      const std::string key = keyOf(number);
      const bool isUntouchedInMemory = at(memory, key) == at(original, key);
      RC_ASSERT(at(result, key) == (isUntouchedInMemory ? at(disk, key) : at(memory, key)));
    }
  }));
}

}  // namespace
}  // namespace tests
