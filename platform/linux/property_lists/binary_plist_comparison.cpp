#include "platform/linux/property_lists/binary_plist_comparison.h"

#include <utf8.h>

#include <algorithm>
#include <bit>
#include <span>
#include <string>

#include "platform/linux/property_lists/binary_plist_layout.h"

namespace platform {
namespace {

using Object = BinaryPlistLayout::Object;
using Type = BinaryPlistLayout::Type;

constexpr std::uint8_t kTrue = 0x09;

// No deeper than the nesting that the scan has let pass.
class Comparison {
 public:
  Comparison(std::span<const std::uint8_t> file, const BinaryPlistLayout& layout) : _file{file}, _layout{layout} {}

  [[nodiscard]] bool holds(std::size_t index, const Dictionary& values) const {
    const auto object = _layout.object(index);
    return object && holds(*object, values);
  }

 private:
  [[nodiscard]] bool holds(const Object& object, const Dictionary& values) const {
    if (object.type != Type::dictionary || object.size != values.size()) return false;
    std::size_t key = 0;
    return std::all_of(values.begin(), values.end(), [&](const Dictionary::Entry& entry) {
      const std::size_t value = object.size + key;
      return holds(object, key++, entry.key) && holds(object, value, entry.value);
    });
  }

  [[nodiscard]] bool holds(const Object& object, const Array& array) const {
    if (object.type != Type::array || object.size != array.size()) return false;
    std::size_t position = 0;
    return std::ranges::all_of(array, [&](const PropertyValue& value) { return holds(object, position++, value); });
  }

  // The object that the container refers to at this position.
  template <typename Value>
  [[nodiscard]] bool holds(const Object& container, std::size_t position, const Value& value) const {
    const auto object = _layout.object(_layout.reference(container, position));
    return object && holds(*object, value);
  }

  [[nodiscard]] bool holds(const Object& object, const PropertyValue& value) const {
    switch (value.kind()) {
      case PropertyValue::Kind::string: return holds(object, *value.asText());
      case PropertyValue::Kind::data:
        return object.type == Type::data && std::ranges::equal(*value.asData(), of(object));
      case PropertyValue::Kind::array: return holds(object, *value.asArray());
      case PropertyValue::Kind::dictionary: return holds(object, *value.asDictionary());
      default: return scalar(object) == value;
    }
  }

  [[nodiscard]] bool holds(const Object& object, const Text& text) const {
    const std::span<const std::uint8_t> characters = of(object);
    switch (object.type) {
      case Type::ascii: return text == std::string_view{reinterpret_cast<const char*>(characters.data()), object.size};
      case Type::utf16: return text == std::string_view{utf8(characters)};
      default: return false;
    }
  }

  static std::string utf8(std::span<const std::uint8_t> utf16) {
    std::u16string units;
    for (std::size_t unit = 0; unit < utf16.size(); unit += 2) {
      units.push_back(static_cast<char16_t>(utf16[unit] << 8U | utf16[unit + 1]));
    }
    return utf8::utf16to8(units);
  }

  // Of what is no scalar nothing that a scalar equals.
  [[nodiscard]] PropertyValue scalar(const Object& object) const {
    const std::uint64_t bits = bigEndian(of(object));
    switch (object.type) {
      case Type::boolean: return _file[object.marker] == kTrue;
      case Type::integer: return object.size > 8 ? PropertyValue{bits} : PropertyValue{static_cast<std::int64_t>(bits)};
      case Type::real: return real(object.size, bits);
      case Type::date: return Date{std::bit_cast<double>(bits)};
      case Type::uid: return Uid{bits};
      default: return Text{};
    }
  }

  static double real(std::size_t size, std::uint64_t bits) {
    return size == sizeof(float) ? double{std::bit_cast<float>(static_cast<std::uint32_t>(bits))}
                                 : std::bit_cast<double>(bits);
  }

  [[nodiscard]] std::span<const std::uint8_t> of(const Object& object) const {
    return _file.subspan(object.payload, object.type == Type::utf16 ? 2 * object.size : object.size);
  }

  std::span<const std::uint8_t> _file;
  const BinaryPlistLayout& _layout;
};

}  // namespace

bool holdsExactly(const Bytes& file, const Dictionary& values) {
  const auto layout = BinaryPlistLayout::of(file);
  return layout && Comparison{file, *layout}.holds(layout->root(), values);
}

}  // namespace platform
