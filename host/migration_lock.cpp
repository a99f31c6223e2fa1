#include "host/migration_lock.h"

#include <memory>
#include <utility>

#include "platform/platform.h"

namespace host {
namespace {

using HeldLock = std::unique_ptr<platform::ExclusiveFileLock>;

class HandedOverLocks final : public platform::ExclusiveFileLocks {
 public:
  HandedOverLocks(std::shared_ptr<platform::ExclusiveFileLocks> others, std::string name, HeldLock held)
      : _others{std::move(others)}, _name{std::move(name)}, _held{std::move(held)} {}

  platform::Result<HeldLock> lockNamed(std::string_view name) override {
    if (name != _name || _held == nullptr) return _others->lockNamed(name);
    return std::move(_held);
  }

 private:
  std::shared_ptr<platform::ExclusiveFileLocks> _others;
  std::string _name;
  HeldLock _held;  // until it is handed over
};

}  // namespace

platform::Status holdMigrationLock(const std::string& name) {
  if (name.empty()) return {};
  platform::Platform services = platform::current();
  auto made = services.locks->lockNamed(name);
  if (!made.isOk()) return made.status();
  HeldLock lock = made.take();
  platform::Status taken = lock->lock();
  if (!taken.isOk()) return taken;
  services.locks = std::make_shared<HandedOverLocks>(services.locks, name, std::move(lock));
  platform::setCurrent(std::move(services));
  return {};
}

}  // namespace host
