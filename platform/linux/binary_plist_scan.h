#pragma once

#include "platform/property_value.h"

namespace platform {

// Makes a binary property list safe for libplist, which unfolds whatever is shared and recurses into whatever is
// nested. Walks the objects that the root reaches, each once and without recursion; what is malformed is repaired in
// place. False where the file must be refused: it lies about where things are, has a cycle, nests too deeply, or would
// unfold to more than its size allows.
[[nodiscard]] bool repairBinaryPlist(Bytes& file);

}  // namespace platform
