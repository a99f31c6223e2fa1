#include "platform/linux/property_lists/binary_plist_comparison.h"

#include <gtest/gtest.h>
#include <rapidcheck/gtest.h>

#include <limits>
#include <string>
#include <utility>
#include <vector>

#include "platform/linux/property_lists/binary_plist_scan.h"
#include "platform/linux/property_lists/libplist_conversion.h"
#include "tests/support/property_list_files.h"
#include "tests/support/property_value_generator.h"

using platform::Array;
using platform::Bytes;
using platform::Date;
using platform::Dictionary;
using platform::holdsExactly;
using platform::PropertyValue;
using platform::Uid;
using tests::BinaryFile;
using namespace std::string_literals;

namespace {

Bytes bytesOf(const std::string& text) { return {text.begin(), text.end()}; }

bool isHeldAs(const std::string& object, const PropertyValue& value) {
  const BinaryFile file{.objects = {"\xD1\x01\x02"s, "\x51k"s, object, "\x51"s + "a", "\x51"s + "b"}};
  return holdsExactly(bytesOf(file.bytes()), {{"k", value}});
}

TEST(BinaryPropertyListComparison, KnowsEachKindByItsObject) {
  constexpr std::uint64_t kMost = std::numeric_limits<std::uint64_t>::max();
  const std::string zeros(8, '\0');
  const std::string ones(8, '\xFF');
  const std::vector<std::pair<std::string, PropertyValue>> rows{
      {"\x08"s, false},
      {"\x09"s, true},
      {"\x10\xFF"s, 255},
      {"\x11\xFF\xFE"s, 65534},
      {"\x12\xFF\xFF\xFF\xFE"s, std::int64_t{4294967294}},
      {"\x13"s + ones, -1},
      {"\x14"s + zeros + ones, kMost},
      {"\x14"s + zeros + "\0\0\0\0\0\0\0\x05"s, 5},
      {"\x22\x3F\x80\0\0"s, 1.0},
      {"\x23\x3F\xF0\0\0\0\0\0\0"s, 1.0},
      {"\x33\x3F\xF0\0\0\0\0\0\0"s, Date{1.0}},
      {"\x42\x01\x02"s, Bytes{1, 2}},
      {"\x52hi"s, "hi"},
      {"\x62\0A\0\xE9"s, "A\u00E9"},
      {"\x62\xD8\x3D\xDE\0"s, "\U0001F600"},
      {"\x80\x07"s, Uid{7}},
      {"\xA2\x03\x04"s, Array{"a", "b"}},
      {"\xD1\x03\x04"s, Dictionary{{"a", "b"}}},
  };
  for (std::size_t object = 0; object < rows.size(); ++object) {
    for (std::size_t value = 0; value < rows.size(); ++value) {
      const bool isSame = rows[object].second == rows[value].second;
      EXPECT_EQ(isHeldAs(rows[object].first, rows[value].second), isSame) << object << " as " << value;
    }
  }
}

TEST(BinaryPropertyListComparison, TellsOtherContentsOfOneKindApart) {
  EXPECT_FALSE(isHeldAs("\x52hi"s, "hit"));
  EXPECT_FALSE(isHeldAs("\x52hi"s, "ho"));
  EXPECT_FALSE(isHeldAs("\x61\0A"s, "B"));
  EXPECT_FALSE(isHeldAs("\x42\x01\x02"s, Bytes{1, 3}));
  EXPECT_FALSE(isHeldAs("\x42\x01\x02"s, Bytes{1}));
  EXPECT_FALSE(isHeldAs("\x23\0\0\0\0\0\0\0\0"s, -0.0));
  EXPECT_FALSE(isHeldAs("\xA2\x03\x04"s, Array{"b", "a"}));
  EXPECT_FALSE(isHeldAs("\xA2\x03\x04"s, Array{"a"}));
  EXPECT_FALSE(isHeldAs("\xA1\x03"s, Array{"a", "b"}));
}

TEST(BinaryPropertyListComparison, TellsKeysAndTheirOrderApart) {
  const BinaryFile file{.objects = {"\xD2\x01\x02\x03\x04"s, "\x51k"s, "\x51z"s, "\x51"s + "1", "\x51"s + "2"}};
  const Bytes bytes = bytesOf(file.bytes());
  EXPECT_TRUE(holdsExactly(bytes, {{"k", "1"}, {"z", "2"}}));
  EXPECT_FALSE(holdsExactly(bytes, {{"z", "2"}, {"k", "1"}}));
  EXPECT_FALSE(holdsExactly(bytes, {{"k", "2"}, {"z", "1"}}));
  EXPECT_FALSE(holdsExactly(bytes, {{"k", "1"}, {"y", "2"}}));
  EXPECT_FALSE(holdsExactly(bytes, {{"k", "1"}}));
  EXPECT_FALSE(holdsExactly(bytes, {{"k", "1"}, {"z", "2"}, {"zz", "3"}}));
}

TEST(BinaryPropertyListComparison, FindsNothingInWhatIsNoSuchFileOrHasAnotherRoot) {
  EXPECT_FALSE(holdsExactly(Bytes{}, {}));
  EXPECT_FALSE(holdsExactly(bytesOf(BinaryFile{.objects = {"\xA0"s}}.bytes()), {}));
  EXPECT_TRUE(holdsExactly(bytesOf(BinaryFile{.objects = {"\xD0"s}}.bytes()), {}));
}

RC_GTEST_PROP(BinaryPropertyListComparison, HoldsWhatWasWrittenAndNothingElse, ()) {
  const Dictionary values = *tests::genDictionary({}, 3);
  const Dictionary others = *tests::genDictionary({}, 3);
  const auto written = platform::writePropertyList(values);
  RC_ASSERT(written.data != nullptr);
  RC_ASSERT(holdsExactly(*written.data, values));
  RC_ASSERT(holdsExactly(*written.data, others) <= (values == others));
}

// What libplist makes of the file is what the comparison sees in it, whatever has become of the file.
RC_GTEST_PROP(BinaryPropertyListComparison, SeesWhatLibplistReads, ()) {
  const Dictionary values = *tests::genDictionary({}, 3);
  Bytes file = *platform::writePropertyList(values).data;
  file[*rc::gen::inRange<std::size_t>(0, file.size())] = *rc::gen::arbitrary<std::uint8_t>();
  if (platform::repairBinaryPlist(file).refusal != platform::Cause::none) return;
  const auto read = platform::parsePropertyList(file, "read a changed file").optional();
  if (!read) return;
  if (read->isFaithful) RC_ASSERT(holdsExactly(file, read->values));
  RC_ASSERT(holdsExactly(file, values) <= (read->values == values));
}

}  // namespace
