#include "host/plugin.h"

#include <exception>

namespace host {
namespace {

constexpr std::string_view kMigratorClass = "AccountsDataMigrator";

std::string noPlugin(const std::filesystem::path& plugin, std::string_view reason) {
  return plugin.string() + " is no migrator plug-in: " + std::string{reason};
}

}  // namespace

std::filesystem::path installedPlugin() {
  const auto program = std::filesystem::read_symlink("/proc/self/exe");
  return (program.parent_path() / HOST_PLUGIN_FROM_PROGRAM).lexically_normal();
}

std::variant<std::unique_ptr<platform::DataClassMigrator>, std::string> loadMigrator(
    const platform::Platform& platform, const std::filesystem::path& plugin) {
  const platform::Status opened = platform.modules->open(plugin.string());
  if (!opened.isOk()) return "cannot load the plug-in: " + opened.reason();
  const auto* const found = platform.classes->classNamed(kMigratorClass);
  if (found == nullptr) return noPlugin(plugin, "it defines no class " + std::string{kMigratorClass});
  const auto* const migratorClass = dynamic_cast<const platform::DataClassMigratorClass*>(found);
  if (migratorClass == nullptr || !migratorClass->make) {
    return noPlugin(plugin, "its class " + std::string{kMigratorClass} + " is no migrator");
  }
  auto migrator = migratorClass->make();
  if (migrator == nullptr) return noPlugin(plugin, "it makes no migrator");
  return migrator;
}

}  // namespace host
