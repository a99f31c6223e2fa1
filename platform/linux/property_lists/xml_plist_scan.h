#pragma once

#include "platform/property_value.h"

namespace platform {

// Makes an XML property list safe for libplist, whose parser is followed here step by step: one pass, no recursion, no
// tree. What is malformed is repaired in place. False where the file must be refused: it is none that libplist reads,
// nests too deeply, or would take time out of proportion.
[[nodiscard]] bool repairXmlPlist(Bytes& file);

}  // namespace platform
