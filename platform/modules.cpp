#include "platform/modules.h"

#include <algorithm>
#include <mutex>
#include <vector>

#include "platform/data_class_migrator.h"
#include "platform/kept_for_life.h"

namespace platform {
namespace {

struct Table {
  std::mutex guard;
  std::vector<std::shared_ptr<const ClassInfo>> classes;
};

// Modules leave it while the process ends.
Table& table() {
  static Table& only = keptForLife<Table>();
  return only;
}

class ProcessClassRegistry final : public ClassRegistry {
 public:
  [[nodiscard]] const ClassInfo* classNamed(std::string_view name) const override {
    const std::scoped_lock lock{table().guard};
    const auto& classes = table().classes;
    const auto found = std::find_if(classes.rbegin(), classes.rend(),
                                    [name](const auto& candidate) { return candidate->name() == name; });
    return found == classes.rend() ? nullptr : found->get();
  }
};

}  // namespace

// Defined here, so that the types have one home and are the same for the host, every plug-in and every module.
ClassInfo::~ClassInfo() = default;
DataClassMigrator::~DataClassMigrator() = default;
DataClassMigratorClass::~DataClassMigratorClass() = default;
MigrationFootprint DataClassMigrator::footprint() const { return {}; }

ClassRegistration::ClassRegistration(std::shared_ptr<const ClassInfo> info) : _info{std::move(info)} {
  const std::scoped_lock lock{table().guard};
  table().classes.push_back(_info);
}

ClassRegistration::~ClassRegistration() {
  const std::scoped_lock lock{table().guard};
  std::erase(table().classes, _info);
}

std::unique_ptr<ClassRegistry> makeProcessClassRegistry() { return std::make_unique<ProcessClassRegistry>(); }

}  // namespace platform
