#pragma once

#include <cstdint>

#include "platform/property_value.h"

namespace platform {

enum class BinaryPlistFinding : std::uint8_t {
  refused,   // it lies about where things are, has a cycle, nests too deeply, or would unfold to more than its size
             // allows
  readable,  // now safe
  plain      // as any writer could have made it: nothing was repaired, and the root reaches every byte of every object
};

// Makes a binary property list safe for libplist, which unfolds whatever is shared and recurses into whatever is
// nested. Walks the objects that the root reaches, each once and without recursion; what is malformed is repaired in
// place.
[[nodiscard]] BinaryPlistFinding repairBinaryPlist(Bytes& file);

}  // namespace platform
