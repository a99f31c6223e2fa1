#pragma once

#include "tests/support/fake_platform.h"

namespace tests {

// Puts configuration files into the device's resources: the fifteen account types with the data classes they ship with,
// the data classes of which several stores can be kept, and no creators.
void putAccountConfiguration(FakeDevice& device);

// The contents of the account-type file, for tests that change it before they put it.
[[nodiscard]] Dictionary accountTypesProperties();

// Takes a type out of the device's account-type file. For tests that have not yet asked the library for a type.
void removeAccountType(FakeDevice& device, std::string_view type);

}  // namespace tests
