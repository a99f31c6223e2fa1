#pragma once

#include "platform/property_value.h"

namespace platform {

// Whether a binary property list that was found sound (see binary_plist_scan.h) holds exactly these values: their
// kinds, their keys and their order. It is read by the format's layout alone, so that what libplist wrote is not judged
// by libplist itself, and no second tree is made of it.
[[nodiscard]] bool holdsExactly(const Bytes& file, const Dictionary& values);

}  // namespace platform
