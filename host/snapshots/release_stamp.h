#pragma once

#include <optional>
#include <string>

#include "host/snapshots/file_state.h"
#include "platform/platform.h"

namespace host::snapshots {

inline constexpr const char* kStampName = "stamp";

// What is installed: the host, and the system as its os-release file tells; a key that is not there is empty.
struct Release {
  std::string host;
  std::string imageVersion;
  std::string buildId;
  std::string versionId;

  bool operator==(const Release&) const = default;
};

// The release of the device below the root.
[[nodiscard]] Release releaseOf(platform::FileSystem& files, const Path& root, std::string host);

// Which release ran last on the device, and whether that ended well.
struct Stamp {
  Release release;
  bool endedWell = false;
};

// Nothing where there is none, or a damaged one.
[[nodiscard]] std::optional<Stamp> stampIn(platform::FileSystem& files, const Path& directory);

// Throws a Problem where it cannot be written; the stamp is then as it was.
void setStamp(platform::FileSystem& files, const Path& directory, const Stamp& stamp);

// Whether a run has something to do: this release has not run, or not well; something died or was not finished; legacy
// files are there; or the settings are older than what a run leaves behind. Touches nothing. A directory that cannot
// hold snapshots needs a run, which says so.
[[nodiscard]] bool isRunNeeded(const Storage& storage, const Path& directory, const platform::Platform& services,
                               const platform::MigrationFootprint& footprint, const std::string& host);

}  // namespace host::snapshots
