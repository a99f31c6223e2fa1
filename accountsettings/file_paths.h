#pragma once

#include <string>
#include <string_view>

#include "platform/export.h"
#include "platform/file_system.h"
#include "platform/text.h"

// The names and places of the product's files, built here and nowhere else. The places follow the process's platform;
// nothing needs to exist at any of them.
namespace accountsettings {

using platform::StringConstant;

// The migration lock, by the name under which every process of the device takes it.
inline constexpr StringConstant kMigrationLockName{"AccountMigrationInProgress"};

// Where a migration puts its copy of the settings file, under that file's own name, below the shared resources, and its
// reports, below the home.
inline constexpr std::string_view kCrashReporterDirectory = "Library/Logs/CrashReporter";

// What an interrupted deletion of the legacy files leaves behind: exists only while they are being deleted.
[[nodiscard]] ACCOUNT_EXPORT platform::Path removalSentinelPath();
// The mail application's mark that it may fetch by itself; it goes when the accounts have been migrated.
[[nodiscard]] ACCOUNT_EXPORT platform::Path mailAutoFetchMarkerPath();
// A loadable module, by the path that the configuration names it by: relative to the system root, with or without a
// slash at its front.
[[nodiscard]] std::string modulePath(const platform::Text& framework);

}  // namespace accountsettings
