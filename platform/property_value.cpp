#include "platform/property_value.h"

#include <algorithm>
#include <array>
#include <bit>
#include <charconv>
#include <cmath>
#include <limits>

namespace platform {
namespace {

constexpr std::int64_t kMinInteger = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t kMaxInteger = std::numeric_limits<std::int64_t>::max();

bool sameReal(double left, double right) {
  return std::bit_cast<std::uint64_t>(left) == std::bit_cast<std::uint64_t>(right) ||
         (std::isnan(left) && std::isnan(right));
}

std::int64_t truncated(double real) {
  constexpr double kLimit = 9223372036854775808.0;  // 2^63
  if (std::isnan(real)) return 0;
  if (real >= kLimit) return kMaxInteger;
  if (real < -kLimit) return kMinInteger;
  return static_cast<std::int64_t>(real);
}

std::int64_t leadingInteger(std::string_view text) {
  const bool negative = text.starts_with('-');
  if (text.starts_with('+')) {
    text.remove_prefix(1);
    if (text.starts_with('-')) return 0;
  }
  std::int64_t integer = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), integer);
  if (error == std::errc::result_out_of_range) return negative ? kMinInteger : kMaxInteger;
  return integer;
}

bool equalIgnoringCase(std::string_view text, std::string_view lowerCase) {
  return std::ranges::equal(text, lowerCase, [](char left, char right) {
    return (left >= 'A' && left <= 'Z' ? static_cast<char>(left - 'A' + 'a') : left) == right;
  });
}

}  // namespace

PropertyValue::PropertyValue(std::uint64_t value) : _storage{value} {
  if (value <= static_cast<std::uint64_t>(kMaxInteger)) _storage = static_cast<std::int64_t>(value);
}
PropertyValue::PropertyValue(Bytes value) : _storage{std::make_shared<const Bytes>(std::move(value))} {}
PropertyValue::PropertyValue(Array value) : _storage{std::make_shared<const Array>(std::move(value))} {}

PropertyValue::Kind PropertyValue::kind() const {
  static constexpr std::array kKinds{Kind::string, Kind::integer, Kind::integer, Kind::real,  Kind::boolean,
                                     Kind::date,   Kind::uid,     Kind::data,    Kind::array, Kind::dictionary};
  static_assert(kKinds.size() == std::variant_size_v<decltype(_storage)>);
  return kKinds[_storage.index()];
}

const Bytes* PropertyValue::asData() const {
  const auto* const data = std::get_if<std::shared_ptr<const Bytes>>(&_storage);
  return data == nullptr ? nullptr : data->get();
}
const Array* PropertyValue::asArray() const {
  const auto* const array = std::get_if<std::shared_ptr<const Array>>(&_storage);
  return array == nullptr ? nullptr : array->get();
}

std::optional<PropertyValue::Integer> PropertyValue::asInteger() const {
  if (const auto* const integer = std::get_if<std::int64_t>(&_storage)) {
    return Integer{static_cast<std::uint64_t>(*integer), false};
  }
  if (const auto* const large = std::get_if<std::uint64_t>(&_storage)) return Integer{*large, true};
  return std::nullopt;
}

std::optional<std::int64_t> PropertyValue::integerValue() const {
  if (const auto integer = asInteger()) return static_cast<std::int64_t>(integer->bits);
  if (const double* const real = asReal()) return truncated(*real);
  if (const Text* const text = asText()) return leadingInteger(*text);
  return std::nullopt;
}

std::optional<bool> PropertyValue::booleanValue() const {
  if (const bool* const boolean = asBoolean()) return *boolean;
  if (const auto integer = asInteger()) return integer->bits != 0;
  if (const double* const real = asReal()) return *real != 0;
  if (const Text* const text = asText()) {
    return equalIgnoringCase(*text, "yes") || equalIgnoringCase(*text, "true") || leadingInteger(*text) != 0;
  }
  return std::nullopt;
}

bool operator==(const PropertyValue& left, const PropertyValue& right) {
  if (left._storage.index() != right._storage.index()) return false;
  return std::visit(
      [&right]<typename Value>(const Value& value) {
        const Value& other = *std::get_if<Value>(&right._storage);
        if constexpr (std::is_same_v<Value, double>) {
          return sameReal(value, other);
        } else if constexpr (std::is_same_v<Value, Date>) {
          return sameReal(value.secondsSince2001, other.secondsSince2001);
        } else if constexpr (requires { value.use_count(); }) {
          return value == other || *value == *other;
        } else {
          return value == other;
        }
      },
      left._storage);
}

}  // namespace platform
