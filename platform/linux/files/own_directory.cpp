#include "platform/linux/files/own_directory.h"

#include <dlfcn.h>

namespace platform {
namespace {

// A place of the library's own, by which it is found in the file tree.
void anchor() {}

}  // namespace

std::filesystem::path ownDirectory() {
  Dl_info library{};
  if (::dladdr(reinterpret_cast<const void*>(&anchor), &library) == 0) return "/";  // where nothing of ours is found
  std::error_code failed;
  const std::filesystem::path file = std::filesystem::canonical(library.dli_fname, failed);
  return (failed ? std::filesystem::absolute(library.dli_fname) : file).parent_path();
}

}  // namespace platform
