#pragma once

#include <ostream>

#include "platform/property_value.h"
#include "records/description.h"

// How values read in a failed expectation.
namespace platform {

inline void PrintTo(const PropertyValue& value, std::ostream* stream) { *stream << records::description(value); }
inline void PrintTo(const Dictionary& dictionary, std::ostream* stream) { *stream << records::description(dictionary); }

}  // namespace platform
