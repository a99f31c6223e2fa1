#include "platform/linux/linux_module_loader.h"

#include <dlfcn.h>
#include <sys/stat.h>

#include <cerrno>
#include <system_error>

namespace platform {
namespace {

// What the linker would stumble over: it takes an empty path for the program itself, looks for a bare name elsewhere,
// and waits for the other side of a pipe.
std::optional<std::string> obstacle(const std::string& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return std::generic_category().message(errno);
  return S_ISREG(status.st_mode) ? std::nullopt : std::optional<std::string>{"not a regular file"};
}

class LinuxModuleLoader final : public ModuleLoader {
 public:
  [[nodiscard]] std::optional<std::string> open(const std::string& path) override {
    if (const auto problem = obstacle(path)) return path + ": " + *problem;
    const std::string file = path.find('/') == std::string::npos ? "./" + path : path;
    if (::dlopen(file.c_str(), RTLD_NOW | RTLD_NODELETE) != nullptr) return std::nullopt;
    const char* const error = ::dlerror();
    return error == nullptr ? path + ": cannot be opened" : error;
  }
};

}  // namespace

std::shared_ptr<ModuleLoader> makeModuleLoader() { return std::make_shared<LinuxModuleLoader>(); }

}  // namespace platform
