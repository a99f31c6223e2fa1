#include "host/rehearsal.h"

#include <memory>
#include <utility>

#include "platform/linux/files/rehearsal_file_system.h"
#include "platform/linux/property_lists/libplist_property_list_store.h"
#include "platform/silent_services.h"

namespace host {
namespace {

// Where there is no lock file, nobody holds the lock, and taking it leaves nothing behind.
class NobodysLock final : public platform::ExclusiveFileLock {
 public:
  platform::Status lock() override { return {}; }
  void unlock() override {}
};

class RehearsalLocks final : public platform::ExclusiveFileLocks {
 public:
  RehearsalLocks(std::shared_ptr<platform::ExclusiveFileLocks> inner, std::filesystem::path directory)
      : _inner{std::move(inner)}, _directory{std::move(directory)} {}

  platform::Result<std::unique_ptr<platform::ExclusiveFileLock>> lockNamed(std::string_view name) override {
    std::error_code ignored;
    const auto status = std::filesystem::symlink_status(_directory / name, ignored);
    if (!std::filesystem::exists(status)) return std::make_unique<NobodysLock>();
    return _inner->lockNamed(name);
  }

 private:
  std::shared_ptr<platform::ExclusiveFileLocks> _inner;
  std::filesystem::path _directory;
};

}  // namespace

void rehearseOn(platform::Platform& platform, const std::filesystem::path& lockDirectory) {
  platform.files = platform::makeRehearsalFileSystem(platform.files, platform.directories->systemRoot());
  platform.propertyLists = platform::makeLibplistPropertyListStore(platform.files);
  platform.locks = std::make_shared<RehearsalLocks>(std::move(platform.locks), lockDirectory);
  platform.systemLog = std::make_shared<platform::SilentSystemLog>();
  platform.preferencesChanged = std::make_shared<platform::SilentPreferencesChangedNotice>();
  platform.cloudTabs = std::make_shared<platform::SilentCloudTabsNotice>();
}

}  // namespace host
