#pragma once

#include <cstdint>

#include "platform/property_value.h"
#include "platform/status.h"

namespace platform {

struct BinaryPlistFinding {
  // none: it is now safe. malformed: it lies about where things are. excessive: it has a cycle, nests too deeply, or
  // would unfold to more than its size allows.
  Cause refusal = Cause::none;
  // As any writer could have made it: nothing was repaired, and the root reaches every byte of every object.
  bool isFaithful = false;
  std::uint64_t unfoldedBytes = 0;  // the memory that libplist's tree and the values take together, about
};

// Makes a binary property list safe for libplist, which unfolds whatever is shared and recurses into whatever is
// nested. Walks the objects that the root reaches, each once and without recursion; what is malformed is repaired in
// place.
[[nodiscard]] BinaryPlistFinding repairBinaryPlist(Bytes& file);

}  // namespace platform
