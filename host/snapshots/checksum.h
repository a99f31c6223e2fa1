#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <string_view>

namespace host::snapshots {

// The SHA-256 checksum, as 64 hexadecimal digits in lower case.
[[nodiscard]] std::string checksum(std::span<const std::uint8_t> bytes);
[[nodiscard]] std::string checksum(std::string_view text);

}  // namespace host::snapshots
