#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <variant>

#include "platform/data_class_migrator.h"
#include "platform/platform.h"

namespace host {

// Where the plug-in lies that was built or installed together with this program.
[[nodiscard]] std::filesystem::path installedPlugin();

// Opens the plug-in and makes its migrator, or says in one line why that cannot be.
[[nodiscard]] std::variant<std::unique_ptr<platform::DataClassMigrator>, std::string> loadMigrator(
    const platform::Platform& platform, const std::filesystem::path& plugin);

}  // namespace host
