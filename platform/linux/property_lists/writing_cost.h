#pragma once

#include <cstddef>

#include "platform/property_value.h"

namespace platform {

// Whether writing these values would keep libplist busy out of all proportion. It writes equal texts and numbers once,
// and finds those that it had before through a table of fixed size: texts and numbers that are made to fall into one
// place of it are compared with each other, one by one. What is refused by this when it is read need not be feared when
// it is written. `size` is how many keys and values there are.
[[nodiscard]] bool isDearToWrite(const Dictionary& dictionary, std::size_t size);

}  // namespace platform
