#include <dlfcn.h>

#include <cstdlib>

#include "platform/linux/files/file_services.h"
#include "platform/platform.h"

namespace platform {

std::filesystem::path ownDirectory() {
  // Some function of the library's own, by which it is found in the file tree.
  const auto* const anchor = reinterpret_cast<const void*>(&ownDirectory);
  Dl_info library{};
  if (::dladdr(anchor, &library) == 0) return "/";  // where nothing of ours is found
  std::error_code failed;
  const std::filesystem::path file = std::filesystem::canonical(library.dli_fname, failed);
  return (failed ? std::filesystem::absolute(library.dli_fname) : file).parent_path();
}

void keepTemporaryDirectoryOnDeviceVolume(const Platform& platform) {
  constexpr unsigned kOwnerOnly = 0700;
  const char* const chosen = std::getenv("TMPDIR");
  if (chosen != nullptr && *chosen != '\0') return;
  const Path directory = platform.directories->systemRoot() / "var/mobile/tmp";
  if (!platform.files->kindOf(directory).isOk() && platform.files->createDirectories(directory, kOwnerOnly).isOk()) {
    static_cast<void>(platform.files->setOwner(directory, "mobile", "mobile"));
  }
  ::setenv("TMPDIR", directory.c_str(), 1);
}

}  // namespace platform
