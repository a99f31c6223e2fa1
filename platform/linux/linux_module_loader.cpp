#include "platform/linux/linux_services.h"

#include <dlfcn.h>
#include <sys/stat.h>

#include <cerrno>
#include <system_error>

namespace platform {
namespace {

constexpr const char* kAttempt = "open a module";

class LinuxModuleLoader final : public ModuleLoader {
 public:
  Status open(const std::string& path) override {
    // What the linker would stumble over: it takes an empty path for the program itself, looks for a bare name
    // elsewhere, and waits for the other side of a pipe.
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0) {
      const int error = errno;
      const Cause cause = Status::failure(error, {}).cause();
      return Status::failure(cause, kAttempt, path + ": " + std::generic_category().message(error));
    }
    if (!S_ISREG(status.st_mode)) {
      return Status::failure(Cause::unsuitable, kAttempt, path + ": not a regular file");
    }
    const std::string file = path.find('/') == std::string::npos ? "./" + path : path;
    if (::dlopen(file.c_str(), RTLD_NOW | RTLD_NODELETE) != nullptr) return {};
    const char* const error = ::dlerror();
    return Status::failure(Cause::other, kAttempt, error == nullptr ? path + ": cannot be opened" : error);
  }
};

}  // namespace

std::shared_ptr<ModuleLoader> makeModuleLoader() { return std::make_shared<LinuxModuleLoader>(); }

}  // namespace platform
