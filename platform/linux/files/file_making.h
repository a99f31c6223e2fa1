#pragma once

#include <cstdint>
#include <span>

#include "platform/linux/files/file_access.h"

namespace platform {

// Files made whole: mode 0600 whatever the umask, the bytes and then the entry on stable storage. Each answers false,
// or a descriptor that is not open, with errno set, where it fails, and then leaves nothing that it made.

// A new file with these bytes, or with those of the opened one.
[[nodiscard]] Descriptor makeFileOf(const Place& place, std::span<const std::uint8_t> bytes);
[[nodiscard]] Descriptor makeCopyOf(const Place& place, const Descriptor& source);

// Moves what stands at one place onto the other. Only a failed sync can leave it moved and yet a failure.
[[nodiscard]] bool moveFile(const Place& from, const Place& to);

// A new file made beside the place and moved onto it.
[[nodiscard]] bool replaceFile(const Place& place, std::span<const std::uint8_t> bytes);

}  // namespace platform
