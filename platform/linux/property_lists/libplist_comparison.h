#pragma once

#include "platform/property_value.h"

namespace platform {

// Whether a libplist tree, a dictionary at its root, holds exactly these values: kinds, values, keys and their order.
// No deeper than the tree was let pass.
[[nodiscard]] bool holdsInOrder(void* tree, const Dictionary& values);

}  // namespace platform
