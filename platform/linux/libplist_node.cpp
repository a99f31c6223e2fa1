#include "platform/linux/libplist_node.h"

#include <plist/plist.h>

#include <array>
#include <bit>
#include <cstddef>
#include <limits>
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

LibplistNode makeLibplistDate(double secondsSince2001) {
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

}  // namespace platform
