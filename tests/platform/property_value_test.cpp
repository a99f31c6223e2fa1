#include "platform/property_value.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>
#include <vector>

using platform::Array;
using platform::Bytes;
using platform::Date;
using platform::Dictionary;
using platform::PropertyValue;
using platform::Uid;

namespace {

using Kind = PropertyValue::Kind;

constexpr std::int64_t kMinInteger = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMaxInteger = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t kMaxUnsigned = std::numeric_limits<std::uint64_t>::max();
const double kNotANumber = std::nan("");
const double kInfinity = std::numeric_limits<double>::infinity();

std::vector<PropertyValue> oneOfEachKind() {
  return {"text", 1, 1.0, true, Date{1.0}, Bytes{1}, Array{1}, Dictionary{{"k", 1}}, Uid{1}, kMaxUnsigned};
}

TEST(PropertyValues, KnowTheirKind) {
  EXPECT_EQ(PropertyValue{}.kind(), Kind::string);
  EXPECT_EQ(PropertyValue{"text"}.kind(), Kind::string);
  EXPECT_EQ(PropertyValue{1}.kind(), Kind::integer);
  EXPECT_EQ(PropertyValue{kMaxUnsigned}.kind(), Kind::integer);
  EXPECT_EQ(PropertyValue{1.0}.kind(), Kind::real);
  EXPECT_EQ(PropertyValue{true}.kind(), Kind::boolean);
  EXPECT_EQ(PropertyValue{Date{}}.kind(), Kind::date);
  EXPECT_EQ(PropertyValue{Bytes{}}.kind(), Kind::data);
  EXPECT_EQ(PropertyValue{Array{}}.kind(), Kind::array);
  EXPECT_EQ(PropertyValue{Dictionary{}}.kind(), Kind::dictionary);
  EXPECT_EQ(PropertyValue{Uid{}}.kind(), Kind::uid);
}

TEST(PropertyValues, AnswerTypedReadsOfTheirOwnKindAlone) {
  for (const PropertyValue& value : oneOfEachKind()) {
    EXPECT_EQ(value.asText() != nullptr, value.kind() == Kind::string);
    EXPECT_EQ(value.asReal() != nullptr, value.kind() == Kind::real);
    EXPECT_EQ(value.asBoolean() != nullptr, value.kind() == Kind::boolean);
    EXPECT_EQ(value.asDate() != nullptr, value.kind() == Kind::date);
    EXPECT_EQ(value.asUid() != nullptr, value.kind() == Kind::uid);
    EXPECT_EQ(value.asData() != nullptr, value.kind() == Kind::data);
    EXPECT_EQ(value.asArray() != nullptr, value.kind() == Kind::array);
    EXPECT_EQ(value.asDictionary() != nullptr, value.kind() == Kind::dictionary);
    EXPECT_EQ(value.asInteger().has_value(), value.kind() == Kind::integer);
  }
}

TEST(PropertyValues, AreEqualWhenKindAndValueAre) {
  const std::vector<PropertyValue> values = oneOfEachKind();
  const std::vector<PropertyValue> same = oneOfEachKind();
  for (std::size_t left = 0; left < values.size(); ++left) {
    for (std::size_t right = 0; right < same.size(); ++right) {
      EXPECT_EQ(values[left] == same[right], left == right) << left << " and " << right;
    }
  }
}

TEST(PropertyValues, CompareRealsAndDatesByTheirBits) {
  EXPECT_FALSE(PropertyValue{0.0} == PropertyValue{-0.0});
  EXPECT_FALSE(PropertyValue{Date{0.0}} == PropertyValue{Date{-0.0}});
  EXPECT_TRUE(PropertyValue{kNotANumber} == PropertyValue{-kNotANumber});
  EXPECT_TRUE(PropertyValue{Date{kNotANumber}} == PropertyValue{Date{kNotANumber}});
  EXPECT_FALSE(PropertyValue{kInfinity} == PropertyValue{-kInfinity});
}

TEST(PropertyValues, CompareContainersDeeply) {
  EXPECT_TRUE((PropertyValue{Array{1, Array{"a"}}} == PropertyValue{Array{1, Array{"a"}}}));
  EXPECT_FALSE((PropertyValue{Array{1, Array{"a"}}} == PropertyValue{Array{1, Array{"b"}}}));
  EXPECT_FALSE((PropertyValue{Array{1, 2}} == PropertyValue{Array{2, 1}}));
  EXPECT_TRUE((PropertyValue{Dictionary{{"a", 1}, {"b", 2}}} == PropertyValue{Dictionary{{"b", 2}, {"a", 1}}}));
  EXPECT_FALSE((PropertyValue{Dictionary{{"a", 1}}} == PropertyValue{Dictionary{{"a", 1.0}}}));
}

TEST(PropertyValues, HoldEachIntegerInOneForm) {
  EXPECT_EQ(PropertyValue{std::uint64_t{7}}, PropertyValue{7});
  EXPECT_EQ(PropertyValue{static_cast<std::uint64_t>(kMaxInteger)}, PropertyValue{kMaxInteger});
  const auto above = PropertyValue{static_cast<std::uint64_t>(kMaxInteger) + 1}.asInteger();
  ASSERT_TRUE(above);
  EXPECT_TRUE(above->isAboveInt64);
  EXPECT_NE(PropertyValue{static_cast<std::uint64_t>(kMaxInteger) + 1}, PropertyValue{kMinInteger});
}

TEST(PropertyValues, GiveAnInteger) {
  const std::vector<std::pair<PropertyValue, std::optional<std::int64_t>>> rows{
      {7, 7},
      {kMinInteger, kMinInteger},
      {kMaxUnsigned, -1},
      {2.9, 2},
      {-2.9, -2},
      {1e300, kMaxInteger},
      {-1e300, kMinInteger},
      {9223372036854775808.0, kMaxInteger},
      {-9223372036854775808.0, kMinInteger},
      {kInfinity, kMaxInteger},
      {kNotANumber, 0},
      {"12", 12},
      {"12 monkeys", 12},
      {"+12", 12},
      {"-12", -12},
      {"+-12", 0},
      {"--12", 0},
      {"1.9", 1},
      {"0x10", 0},
      {"010", 10},
      {"", 0},
      {"-", 0},
      {"twelve", 0},
      {"99999999999999999999", kMaxInteger},
      {"-99999999999999999999", kMinInteger},
      {"+99999999999999999999", kMaxInteger},
      {true, std::nullopt},
      {Date{1}, std::nullopt},
      {Bytes{'1'}, std::nullopt},
      {Array{1}, std::nullopt},
      {Dictionary{{"k", 1}}, std::nullopt},
      {Uid{1}, std::nullopt},
  };
  for (std::size_t row = 0; row < rows.size(); ++row) {
    EXPECT_EQ(rows[row].first.integerValue(), rows[row].second) << "row " << row;
  }
}

TEST(PropertyValues, GiveATruth) {
  const std::vector<std::pair<PropertyValue, std::optional<bool>>> rows{
      {true, true},
      {false, false},
      {1, true},
      {0, false},
      {-1, true},
      {kMaxUnsigned, true},
      {0.5, true},
      {0.0, false},
      {-0.0, false},
      {kNotANumber, true},
      {"yes", true},
      {"YES", true},
      {"Yes", true},
      {"true", true},
      {"TRUE", true},
      {"1", true},
      {"-1", true},
      {"12 monkeys", true},
      {"no", false},
      {"false", false},
      {"0", false},
      {"", false},
      {"y", false},
      {"yes ", false},
      {"on", false},
      {Date{1}, std::nullopt},
      {Bytes{1}, std::nullopt},
      {Array{true}, std::nullopt},
      {Dictionary{{"k", true}}, std::nullopt},
      {Uid{1}, std::nullopt},
  };
  for (std::size_t row = 0; row < rows.size(); ++row) {
    EXPECT_EQ(rows[row].first.booleanValue(), rows[row].second) << "row " << row;
  }
}

}  // namespace
