#include "host/plugin.h"

#include <string>
#include <utility>

namespace host {
namespace {

constexpr const char* kMigratorClass = "AccountsDataMigrator";

platform::Status noPlugin(std::string reason) {
  return platform::Status::failure(platform::Cause::unsuitable, "load the plug-in", std::move(reason));
}

}  // namespace

platform::Result<std::unique_ptr<platform::DataClassMigrator>> loadMigrator(
    const platform::Platform& platform, const std::optional<std::filesystem::path>& given) {
  const auto installed = [] {
    return (std::filesystem::read_symlink("/proc/self/exe").parent_path() / HOST_PLUGIN_FROM_PROGRAM)
        .lexically_normal();
  };
  const std::string plugin = given ? given->string() : installed().string();
  const platform::Status opened = platform.modules->open(plugin);
  if (!opened.isOk()) return noPlugin("cannot load the plug-in: " + opened.reason());
  const std::string isNone = plugin + " is no migrator plug-in: ";
  const auto* const found = platform.classes->classNamed(kMigratorClass);
  if (found == nullptr) return noPlugin(isNone + "it defines no class " + kMigratorClass);
  const auto* const migratorClass = dynamic_cast<const platform::DataClassMigratorClass*>(found);
  if (migratorClass == nullptr || !migratorClass->make) {
    return noPlugin(isNone + "its class " + kMigratorClass + " is no migrator");
  }
  auto migrator = migratorClass->make();
  if (migrator == nullptr) return noPlugin(isNone + "it makes no migrator");
  return migrator;
}

}  // namespace host
