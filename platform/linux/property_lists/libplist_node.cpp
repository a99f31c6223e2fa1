#include "platform/linux/property_lists/libplist_node.h"

#include <plist/plist.h>
#include <sys/mman.h>

#include <array>
#include <bit>
#include <cstddef>
#include <cstdlib>
#include <limits>
#include <new>
#include <string>

namespace platform {
namespace {

constexpr std::size_t kHeaderSize = 8;  // "bplist00"

void appendBigEndian(std::string& bytes, std::uint64_t number) {
  for (int shift = 56; shift >= 0; shift -= 8) bytes.push_back(static_cast<char>((number >> unsigned(shift)) & 0xFFU));
}

// The file: header, the object, a table with its one offset, and the trailer.
LibplistNode parseOneObject(const std::string& object) {
  std::string file = "bplist00" + object;
  const std::size_t table = file.size();
  file.push_back(char{kHeaderSize});
  file.append(6, '\0').append({char{1}, char{1}});  // sizes of an offset and of a reference
  appendBigEndian(file, 1);
  appendBigEndian(file, 0);
  appendBigEndian(file, table);
  plist_t node = nullptr;
  plist_from_bin(file.data(), static_cast<std::uint32_t>(file.size()), &node);
  return LibplistNode{node};
}

// Such seconds go through the library's own call as they are.
bool isWholeInt32(double seconds) {
  constexpr double kLimit = std::numeric_limits<std::int32_t>::max();
  return seconds > -kLimit && seconds < kLimit &&
         std::bit_cast<std::uint64_t>(seconds) ==
             std::bit_cast<std::uint64_t>(static_cast<double>(static_cast<std::int32_t>(seconds)));
}

double writtenSeconds(plist_t node) {
  char* written = nullptr;
  std::uint32_t size = 0;
  plist_to_bin(node, &written, &size);
  std::uint64_t bits = 0;
  for (std::size_t index = kHeaderSize + 1; index < kHeaderSize + 9; ++index) {
    bits = bits << 8U | static_cast<std::uint8_t>(written[index]);
  }
  plist_to_bin_free(written);
  return std::bit_cast<double>(bits);
}

}  // namespace

void LibplistNodeDeleter::operator()(void* node) const { plist_free(node); }

void LibplistMemoryDeleter::operator()(void* memory) const { std::free(memory); }

// Asked of the kernel, not of the allocator, whose blocks of one size or another it would disturb.
void requireMemory(std::size_t bytes) {
  if (bytes == 0) return;
  void* const memory = ::mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::bad_alloc{};
  ::munmap(memory, bytes);
}

LibplistNode makeLibplistDate(double secondsSince2001) {
  if (isWholeInt32(secondsSince2001)) {
    return LibplistNode{plist_new_date(static_cast<std::int32_t>(secondsSince2001), 0)};
  }
  std::string object{'\x33'};
  appendBigEndian(object, std::bit_cast<std::uint64_t>(secondsSince2001));
  return parseOneObject(object);
}

LibplistNode makeLibplistInteger(std::uint64_t aboveInt64) {
  std::string object{'\x14'};
  appendBigEndian(object, 0);
  appendBigEndian(object, aboveInt64);
  return parseOneObject(object);
}

double secondsOfLibplistDate(void* node) {
  std::int32_t seconds = 0;
  std::int32_t microseconds = 0;
  plist_get_date_val(node, &seconds, &microseconds);
  const LibplistNode rounded{plist_new_date(seconds, microseconds)};
  if (plist_compare_node_value(node, rounded.get()) == 0) return writtenSeconds(node);
  return static_cast<double>(seconds) + static_cast<double>(microseconds) / 1000000;
}

bool isAboveInt64(void* integerNode, std::uint64_t bits) {
  if (bits <= static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max())) return false;
  // The library keeps the number's width hidden, but compares it.
  const LibplistNode negative{plist_new_uint(bits)};
  return plist_compare_node_value(integerNode, negative.get()) == 0;
}

std::string_view textOfLibplist(void* stringNode) {
  std::uint64_t size = 0;
  const char* const characters = plist_get_string_ptr(stringNode, &size);
  return characters == nullptr ? std::string_view{} : std::string_view{characters, size};
}

std::span<const std::uint8_t> dataOfLibplist(void* dataNode) {
  std::uint64_t size = 0;
  const char* const bytes = plist_get_data_ptr(dataNode, &size);
  if (bytes == nullptr) return {};
  return {reinterpret_cast<const std::uint8_t*>(bytes), size};
}

PropertyValue scalarOfLibplist(void* node) {
  std::uint8_t boolean = 0;
  std::uint64_t bits = 0;
  double real = 0;
  Uid uid;
  switch (plist_get_node_type(node)) {
    case PLIST_BOOLEAN: plist_get_bool_val(node, &boolean); return boolean != 0;
    case PLIST_UINT:
      plist_get_uint_val(node, &bits);
      if (isAboveInt64(node, bits)) return bits;
      return static_cast<std::int64_t>(bits);
    case PLIST_REAL: plist_get_real_val(node, &real); return real;
    case PLIST_DATE: return Date{secondsOfLibplistDate(node)};
    case PLIST_UID: plist_get_uid_val(node, &uid.number); return uid;
    default: return Text{};
  }
}

LibplistArrayItems::LibplistArrayItems(void* array) : _array{array} {
  plist_array_iter iterator = nullptr;
  plist_array_new_iter(array, &iterator);
  _iterator.reset(iterator);
}

void* LibplistArrayItems::next() {
  plist_t item = nullptr;
  plist_array_next_item(_array, _iterator.get(), &item);
  return item;
}

LibplistEntries::LibplistEntries(void* dictionary) : _dictionary{dictionary} {
  plist_dict_iter iterator = nullptr;
  plist_dict_new_iter(dictionary, &iterator);
  _iterator.reset(iterator);
}

bool LibplistEntries::advance() {
  _item = nullptr;
  plist_dict_next_item(_dictionary, _iterator.get(), nullptr, &_item);
  return _item != nullptr;
}

LibplistText LibplistEntries::key() const {
  char* key = nullptr;
  plist_dict_get_item_key(_item, &key);
  return LibplistText{key};
}

bool LibplistEntries::hasKey(const char* key) const {
  return plist_key_val_compare(plist_dict_item_get_key(_item), key) == 0;
}

}  // namespace platform
