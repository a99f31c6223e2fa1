#pragma once

#include <ostream>

#include "platform/description.h"
#include "platform/property_value.h"

// How values read in a failed expectation.
namespace platform {

inline void PrintTo(const PropertyValue& value, std::ostream* stream) { *stream << description(value); }
inline void PrintTo(const Dictionary& dictionary, std::ostream* stream) { *stream << description(dictionary); }

}  // namespace platform
