#pragma once

#include <memory>

#include "platform/unique_identifiers.h"

namespace platform {

[[nodiscard]] std::shared_ptr<UniqueIdentifiers> makeUniqueIdentifiers();

}  // namespace platform
