#include "platform/linux/property_lists/binary_plist_repair.h"

#include <limits>
#include <string_view>

namespace platform {
namespace {

using Type = BinaryPlistLayout::Type;

constexpr std::uint8_t kEmptyAscii = 0x50;
constexpr std::uint8_t kAscii = 0x5;
constexpr std::uint8_t kArray = 0xA;
constexpr std::uint8_t kOrderedSet = 0xB;
constexpr std::uint8_t kSet = 0xC;
constexpr std::uint8_t kInteger = 0x10;
constexpr std::uint8_t kCountFollows = 0xF;
constexpr std::uint8_t kNoUtf8 = 0xFF;  // becomes U+FFFD where the text is taken
constexpr std::uint64_t kReplacementUnit = 0xFFFD;
constexpr std::uint64_t kMaxUid = std::numeric_limits<std::uint32_t>::max();
constexpr std::uint64_t kSignBit = std::uint64_t{1} << 63U;

bool isLead(std::uint64_t unit) { return unit >= 0xD800 && unit <= 0xDBFF; }
bool isTrail(std::uint64_t unit) { return unit >= 0xDC00 && unit <= 0xDFFF; }

bool isTextOnceRepaired(const BinaryPlistLayout::Object& object) {
  return object.type == Type::ascii || object.type == Type::utf16 || object.type == Type::other;
}

}  // namespace

void BinaryPlistRepair::overwrite(std::size_t offset, std::uint8_t byte) {
  _file[offset] = byte;
  _hasRepaired = true;
}

void BinaryPlistRepair::overwrite(std::size_t offset, std::size_t width, std::uint64_t number) {
  for (std::size_t end = offset + width; end > offset; number >>= 8U) overwrite(--end, number & 0xFFU);
}

void BinaryPlistRepair::makeEmptyText(const Object& leaf) { overwrite(leaf.marker, kEmptyAscii); }

void BinaryPlistRepair::repairLeaf(const Object& leaf) {
  switch (leaf.type) {
    case Type::other: return makeEmptyText(leaf);
    case Type::integer: return repairInteger(leaf);
    case Type::uid: return repairUid(leaf);
    case Type::ascii: return repairAscii(leaf);
    case Type::utf16: return repairUtf16(leaf);
    default: return;
  }
}

// Of a 16-byte integer libplist takes the low half as unsigned.
void BinaryPlistRepair::repairInteger(const Object& integer) {
  if (integer.size != 16) return;
  const std::uint64_t high = bigEndian(std::span{_file}.subspan(integer.payload, 8));
  const std::uint64_t low = bigEndian(std::span{_file}.subspan(integer.payload + 8, 8));
  if (high == 0) return;
  const bool isNegative = (high & kSignBit) != 0;
  if (!isNegative) {
    overwrite(integer.payload, 8, 0);
    overwrite(integer.payload + 8, 8, std::numeric_limits<std::uint64_t>::max());
    return;
  }
  const bool isInt64 = high == std::numeric_limits<std::uint64_t>::max() && (low & kSignBit) != 0;
  overwrite(integer.marker, kInteger | 3U);
  overwrite(integer.payload, 8, isInt64 ? low : kSignBit);
}

void BinaryPlistRepair::repairUid(const Object& uid) {
  if (bigEndian(std::span{_file}.subspan(uid.payload, uid.size)) <= kMaxUid) return;
  switch (uid.size) {
    case 8: return overwrite(uid.marker, kInteger | 3U);
    case 16: return overwrite(uid.marker, kInteger | 4U);
    default: return makeEmptyText(uid);
  }
}

void BinaryPlistRepair::repairAscii(const Object& text) {
  const std::string_view characters{reinterpret_cast<const char*>(_file.data()) + text.payload, text.size};
  if (plainPrefix(characters) == text.size) return;
  _hasFoundOddities = true;
  for (std::size_t offset = text.payload; offset < text.payload + text.size; ++offset) {
    if (_file[offset] == 0) overwrite(offset, kNoUtf8);
  }
}

void BinaryPlistRepair::repairUtf16(const Object& text) {
  if (text.size == 0) {
    overwrite(text.marker, static_cast<std::uint8_t>(kAscii << 4U | (_file[text.marker] & 0xFU)));
  }
  for (std::size_t index = 0; index < text.size; ++index) {
    if (!isSoundUnit(text, index)) overwrite(text.payload + 2 * index, 2, kReplacementUnit);
  }
}

std::uint64_t BinaryPlistRepair::unit(const Object& text, std::size_t index) const {
  const std::size_t offset = text.payload + 2 * index;
  return static_cast<std::uint64_t>(_file[offset] << 8U | _file[offset + 1]);
}

// Units before this one are sound already.
bool BinaryPlistRepair::isSoundUnit(const Object& text, std::size_t index) const {
  const std::uint64_t here = unit(text, index);
  if (isLead(here)) return index + 1 < text.size && isTrail(unit(text, index + 1));
  if (isTrail(here)) return index > 0 && isLead(unit(text, index - 1));
  return here != 0;
}

bool BinaryPlistRepair::repairContainer(Object& container) {
  if (_file[container.marker] >> 4U == kOrderedSet) {
    overwrite(container.marker, static_cast<std::uint8_t>(kArray << 4U | (_file[container.marker] & 0xFU)));
  }
  if (_file[container.marker] >> 4U == kSet) _hasFoundOddities = true;
  return container.type != Type::dictionary || keepTextKeys(container);
}

bool BinaryPlistRepair::keepTextKeys(Object& dictionary) {
  bool areAllTexts = true;
  for (std::size_t entry = 0; entry < dictionary.size; ++entry) {
    const auto key = _layout.object(_layout.reference(dictionary, entry));
    if (!key) return false;
    areAllTexts = areAllTexts && isTextOnceRepaired(*key);
  }
  if (!areAllTexts) dropOtherEntries(dictionary);
  return true;
}

// The keys' references stand before those of the values; both move to the front, over those that are left out.
void BinaryPlistRepair::dropOtherEntries(Object& dictionary) {
  std::vector<std::size_t> kept;
  for (std::size_t entry = 0; entry < dictionary.size; ++entry) {
    if (isTextOnceRepaired(*_layout.object(_layout.reference(dictionary, entry)))) kept.push_back(entry);
  }
  const std::size_t width = _layout.referenceSize();
  std::size_t to = dictionary.payload;
  for (const std::size_t column : {std::size_t{0}, dictionary.size}) {
    for (const std::size_t entry : kept) {
      const std::size_t from = dictionary.payload + (column + entry) * width;
      for (std::size_t byte = 0; byte < width; ++byte) overwrite(to++, _file[from + byte]);
    }
  }
  setSize(dictionary, kept.size());
}

void BinaryPlistRepair::setSize(Object& container, std::size_t size) {
  const std::uint8_t marker = _file[container.marker];
  if ((marker & kCountFollows) == kCountFollows) {
    const std::size_t width = std::size_t{1} << (_file[container.marker + 1] & 0xFU);
    overwrite(container.marker + 2, width, size);
  } else {
    overwrite(container.marker, static_cast<std::uint8_t>((marker & 0xF0U) | size));
  }
  container.size = size;
}

}  // namespace platform
