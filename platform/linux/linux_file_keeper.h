#pragma once

#include <memory>

#include "platform/export.h"
#include "platform/file_keeper.h"

namespace platform {

[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<FileKeeper> makeFileKeeper();

}  // namespace platform
