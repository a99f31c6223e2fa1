#include "platform/temporary_directory.h"

#include <cstdlib>

namespace platform {
namespace {

constexpr unsigned ownerOnly = 0700;

bool isSet(const char* variable) {
  const char* const value = std::getenv(variable);
  return value != nullptr && *value != '\0';
}

}  // namespace

void keepTemporaryDirectoryOnDeviceVolume(const Platform& platform) {
  if (isSet("TMPDIR")) return;
  const Path directory = platform.directories->systemRoot() / "var/mobile/tmp";
  if (!platform.files->kindOf(directory).isOk() && platform.files->createDirectories(directory, ownerOnly).isOk()) {
    static_cast<void>(platform.files->setOwner(directory, "mobile", "mobile"));
  }
  ::setenv("TMPDIR", directory.c_str(), 1);
}

}  // namespace platform
