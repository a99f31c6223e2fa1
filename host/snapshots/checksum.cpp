#include "host/snapshots/checksum.h"

#include <sha2.h>
#include <sys/types.h>

#include <array>

namespace host::snapshots {
namespace {

std::string hexadecimal(std::span<const std::uint8_t> bytes) {
  std::string digits;
  for (const std::uint8_t byte : bytes) {
    digits += "0123456789abcdef"[byte >> 4U];
    digits += "0123456789abcdef"[byte & 15U];
  }
  return digits;
}

}  // namespace

std::string checksum(std::span<const std::uint8_t> bytes) {
  SHA2_CTX state;
  SHA256Init(&state);
  SHA256Update(&state, bytes.data(), bytes.size());
  std::array<std::uint8_t, SHA256_DIGEST_LENGTH> digest{};
  SHA256Final(digest.data(), &state);
  return hexadecimal(digest);
}

std::string checksum(std::string_view text) {
  const std::string copy{text};
  return checksum(std::span{reinterpret_cast<const std::uint8_t*>(copy.data()), copy.size()});
}

}  // namespace host::snapshots
