#pragma once

#include "platform/platform.h"

namespace bench {

// The services of a device that keeps its settings file in memory, as values: what is measured on it is the product's
// own work, without the disk and without libplist. Nobody reads its log and nobody is told of changes; everything else
// is as on a device without a configuration.
[[nodiscard]] platform::Platform makeMemoryDevice();

}  // namespace bench
