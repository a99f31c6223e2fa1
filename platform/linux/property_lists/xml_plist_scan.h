#pragma once

#include "platform/property_value.h"
#include "platform/status.h"

namespace platform {

// Makes an XML property list safe for libplist, whose parser is followed here step by step: one pass, no recursion, no
// tree. What is malformed is repaired in place. Cause::none, or why the file must be refused: malformed, it is none
// that libplist reads; unsuitable, its root is no dictionary; excessive, it nests too deeply or would take time out of
// proportion.
[[nodiscard]] Cause repairXmlPlist(Bytes& file);

}  // namespace platform
