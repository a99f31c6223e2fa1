#pragma once

#include <string>
#include <vector>

#include "platform/export.h"

namespace samples {

// What the sample modules were asked to do, in order. One journal of the process, in a library of its own, so that the
// modules write in the one that the test reads.
ACCOUNT_EXPORT std::vector<std::string>& journal();

}  // namespace samples
