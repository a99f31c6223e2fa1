#pragma once

#include <filesystem>
#include <memory>
#include <optional>

#include "platform/data_class_migrator.h"
#include "platform/platform.h"

namespace host {

// Opens the plug-in (where none is given, the one that was built or installed together with this program) and makes its
// migrator. The reason of a failure is one line that is a sentence of its own.
[[nodiscard]] platform::Result<std::unique_ptr<platform::DataClassMigrator>> loadMigrator(
    const platform::Platform& platform, const std::optional<std::filesystem::path>& given);

}  // namespace host
