#include "platform/linux/linux_services.h"

#include <pwd.h>
#include <unistd.h>

#include <cstdlib>
#include <vector>

#include "platform/linux/files/file_services.h"

namespace platform {
namespace {

using std::filesystem::path;

path wholePath(const path& given) {
  std::error_code unused;
  const path whole = std::filesystem::absolute(given, unused).lexically_normal();
  return whole.has_filename() || whole == "/" ? whole : whole.parent_path();
}

// The build gives the way from the library's directory to the resources; it is the same built and installed.
class LinuxBaseDirectories final : public BaseDirectories {
 public:
  explicit LinuxBaseDirectories(const LinuxPlatformOptions& options)
      : _root{wholePath(options.systemRoot.value_or("/"))},
        _home{homeFor(options, _root)},
        _sharedResources{options.sharedResources ? wholePath(*options.sharedResources) : _root / "var/mobile"},
        _resources{
            wholePath(options.resources ? *options.resources : ownDirectory() / ACCOUNT_RESOURCES_FROM_LIBRARY)} {}

  [[nodiscard]] path systemRoot() const override { return _root; }
  [[nodiscard]] path home() const override { return _home; }
  [[nodiscard]] path sharedResources() const override { return _sharedResources; }
  [[nodiscard]] path mailData() const override { return _home / "Library/Mail"; }
  [[nodiscard]] path resources() const override { return _resources; }

 private:
  static path homeFor(const LinuxPlatformOptions& options, const path& root) {
    if (options.home) return wholePath(*options.home);
    if (options.systemRoot) return root / "var/mobile";
    const char* const named = std::getenv("HOME");
    if (named != nullptr && *named == '/') return wholePath(named);
    std::vector<char> buffer(std::size_t{1} << 16);
    passwd entry{};
    passwd* found = nullptr;
    ::getpwuid_r(::getuid(), &entry, buffer.data(), buffer.size(), &found);
    return found != nullptr && *found->pw_dir == '/' ? wholePath(found->pw_dir) : path{"/"};
  }

  path _root;
  path _home;
  path _sharedResources;
  path _resources;
};

}  // namespace

std::shared_ptr<BaseDirectories> makeBaseDirectories(const LinuxPlatformOptions& options) {
  return std::make_shared<LinuxBaseDirectories>(options);
}

}  // namespace platform
