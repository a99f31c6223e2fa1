#pragma once

#include "platform/property_list_store.h"

namespace platform {

// The dictionary as a binary property list, read back and compared before it is answered.
Result<std::shared_ptr<const Bytes>> writePropertyList(const Dictionary& dictionary);

}  // namespace platform
