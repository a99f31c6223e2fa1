#include "platform/linux/property_lists/binary_plist_layout.h"

#include <algorithm>
#include <string_view>

namespace platform {
namespace {

constexpr std::string_view kHeader = "bplist00";
constexpr std::size_t kTrailerSize = 32;
constexpr std::uint8_t kCountFollows = 0xF;

}  // namespace

std::uint64_t bigEndian(std::span<const std::uint8_t> bytes) {
  std::uint64_t number = 0;
  for (const std::uint8_t byte : bytes) number = number << 8U | byte;
  return number;
}

std::optional<BinaryPlistLayout> BinaryPlistLayout::of(std::span<const std::uint8_t> file) {
  if (file.size() < kHeader.size() + kTrailerSize) return std::nullopt;
  if (!std::equal(kHeader.begin(), kHeader.end(), file.begin())) return std::nullopt;
  const std::span<const std::uint8_t> trailer = file.last(kTrailerSize);
  const std::uint64_t objectCount = bigEndian(trailer.subspan(8, 8));
  const std::uint64_t root = bigEndian(trailer.subspan(16, 8));
  const std::uint64_t table = bigEndian(trailer.subspan(24, 8));
  const std::uint8_t offsetSize = trailer[6];
  const std::uint8_t referenceSize = trailer[7];
  const std::size_t end = file.size() - kTrailerSize;
  if (offsetSize == 0 || referenceSize == 0 || root >= objectCount) return std::nullopt;
  if (table < kHeader.size() || table >= end || objectCount > (end - table) / offsetSize) return std::nullopt;

  BinaryPlistLayout layout;
  layout._file = file;
  layout._offsetSize = offsetSize;
  layout._referenceSize = referenceSize;
  layout._objectCount = objectCount;
  layout._root = root;
  layout._table = table;
  return layout;
}

std::optional<BinaryPlistLayout::Object> BinaryPlistLayout::object(std::size_t index) const {
  if (index >= _objectCount) return std::nullopt;
  const std::uint64_t marker = bigEndian(_file.subspan(_table + index * _offsetSize, _offsetSize));
  if (marker >= _table) return std::nullopt;
  const auto kind = static_cast<std::uint8_t>(_file[marker] >> 4U);
  const auto low = static_cast<std::uint8_t>(_file[marker] & 0xFU);
  switch (kind) {
    case 0x0: return fixed(low == 8 || low == 9 ? Type::boolean : Type::other, marker, 0);
    case 0x1: return low <= 4 ? fixed(Type::integer, marker, std::size_t{1} << low) : fixed(Type::other, marker, 0);
    case 0x2:
      return low == 2 || low == 3 ? fixed(Type::real, marker, std::size_t{1} << low) : fixed(Type::other, marker, 0);
    case 0x3: return low == 3 ? fixed(Type::date, marker, 8) : fixed(Type::other, marker, 0);
    case 0x4: return counted(Type::data, marker, 1);
    case 0x5: return counted(Type::ascii, marker, 1);
    case 0x6: return counted(Type::utf16, marker, 2);
    case 0x8: return fixed(Type::uid, marker, low + std::size_t{1});
    case 0xA:
    case 0xB:
    case 0xC: return counted(Type::array, marker, _referenceSize);
    case 0xD: return counted(Type::dictionary, marker, 2 * _referenceSize);
    default: return fixed(Type::other, marker, 0);
  }
}

std::uint64_t BinaryPlistLayout::reference(const Object& container, std::size_t position) const {
  return bigEndian(_file.subspan(container.payload + position * _referenceSize, _referenceSize));
}

std::size_t BinaryPlistLayout::extent(const Object& object) const {
  const std::size_t payload = object.payload - object.marker;
  switch (object.type) {
    case Type::utf16: return payload + 2 * object.size;
    case Type::array: return payload + _referenceSize * object.size;
    case Type::dictionary: return payload + 2 * _referenceSize * object.size;
    default: return payload + object.size;
  }
}

std::size_t BinaryPlistLayout::objectArea() const { return _table - kHeader.size(); }

bool BinaryPlistLayout::endsWithTable() const {
  return _table + _objectCount * _offsetSize + kTrailerSize == _file.size();
}

std::optional<BinaryPlistLayout::Object> BinaryPlistLayout::fixed(Type type, std::size_t marker,
                                                                  std::size_t size) const {
  const std::size_t payload = marker + 1;
  if (size > _table - payload) return std::nullopt;
  return Object{type, marker, payload, size};
}

std::optional<BinaryPlistLayout::Object> BinaryPlistLayout::counted(Type type, std::size_t marker,
                                                                    std::size_t unit) const {
  std::size_t payload = marker + 1;
  std::uint64_t size = _file[marker] & 0xFU;
  if (size == kCountFollows) {
    if (payload >= _table || _file[payload] >> 4U != 0x1) return std::nullopt;
    const std::size_t width = std::size_t{1} << (_file[payload] & 0xFU);
    ++payload;
    if (width > _table - payload) return std::nullopt;
    size = bigEndian(_file.subspan(payload, width));
    payload += width;
  }
  if (size > (_table - payload) / unit) return std::nullopt;
  return Object{type, marker, payload, size};
}

}  // namespace platform
