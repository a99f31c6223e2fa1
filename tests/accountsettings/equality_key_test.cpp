#include "accountsettings/equality_key.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace accountsettings {
namespace {

using platform::Array;
using platform::Bytes;
using platform::Date;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Uid;

TEST(EqualityKey, IsAnotherForEveryValueThatIsNotEqual) {
  const std::vector<PropertyValue> values{"a",
                                          "b",
                                          "",
                                          Bytes{'a'},
                                          Bytes{'b'},
                                          1,
                                          2,
                                          1.0,
                                          2.0,
                                          true,
                                          false,
                                          Date{1},
                                          Date{2},
                                          Uid{1},
                                          Uid{2},
                                          -1,
                                          std::numeric_limits<std::uint64_t>::max(),
                                          Array{},
                                          Array{1},
                                          Array{2},
                                          Array{1, 2},
                                          Array{2, 1},
                                          Array{Array{1}, 2},
                                          Array{Array{1, 2}},
                                          Array{Array{}, Array{}},
                                          Array{Array{Array{}}},
                                          Array{"a", "b"},
                                          Array{"ab"},
                                          Array{"a", ""},
                                          Array{"", "a"},
                                          Dictionary{},
                                          Dictionary{{"a", 1}},
                                          Dictionary{{"b", 1}},
                                          Dictionary{{"a", 2}},
                                          Dictionary{{"a", 1}, {"b", 1}},
                                          Array{Dictionary{{"a", 1}}, Dictionary{{"b", 1}}},
                                          Array{Dictionary{{"a", 1}, {"b", 1}}},
                                          Dictionary{{"a", Dictionary{{"b", 1}}}, {"c", 1}},
                                          Dictionary{{"a", Dictionary{{"b", 1}, {"c", 1}}}}};
  for (const PropertyValue& one : values) {
    for (const PropertyValue& other : values) {
      EXPECT_EQ(equalityKey(one) == equalityKey(other), one == other);
    }
  }
}

TEST(EqualityKey, TellsWhereOneDataEndsAndTheNextBegins) {
  const auto mark = static_cast<std::uint8_t>(PropertyValue{Bytes{}}.kind());
  EXPECT_NE(equalityKey(Array{Bytes{'a', mark, 'b'}, Bytes{'c'}}),
            equalityKey(Array{Bytes{'a'}, Bytes{'b', mark, 'c'}}));
}

TEST(EqualityKey, IsTheSameForDictionariesWhoseOrderDiffers) {
  const PropertyValue one = Dictionary{{"a", 1}, {"b", Array{"c"}}};
  const PropertyValue other = Dictionary{{"b", Array{"c"}}, {"a", 1}};
  EXPECT_EQ(equalityKey(one), equalityKey(other));
}

}  // namespace
}  // namespace accountsettings
