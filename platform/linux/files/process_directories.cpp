#include <dlfcn.h>
#include <fcntl.h>

#include <array>
#include <climits>
#include <cstdlib>

#include "platform/linux/files/descriptor.h"
#include "platform/linux/files/file_services.h"
#include "platform/platform.h"

namespace platform {
namespace {

// Where a file stands when every link is followed. The kernel tells it of an opened one in fewer calls than it takes to
// look at each directory on the way.
std::filesystem::path wholePathOf(const char* file) {
  const Descriptor opened{::open(file, O_PATH | O_CLOEXEC)};
  const std::string name = "/proc/self/fd/" + std::to_string(opened.number());
  std::array<char, PATH_MAX> target{};
  const ssize_t size = opened.isOpen() ? ::readlink(name.c_str(), target.data(), target.size()) : -1;
  if (size > 0 && target.front() == '/') return std::string{target.data(), static_cast<std::size_t>(size)};
  std::error_code failed;
  const std::filesystem::path found = std::filesystem::canonical(file, failed);
  return failed ? std::filesystem::absolute(file) : found;
}

}  // namespace

std::filesystem::path ownDirectory() {
  // Some function of the library's own, by which it is found in the file tree.
  const auto* const anchor = reinterpret_cast<const void*>(&ownDirectory);
  Dl_info library{};
  if (::dladdr(anchor, &library) == 0) return "/";  // where nothing of ours is found
  return wholePathOf(library.dli_fname).parent_path();
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
