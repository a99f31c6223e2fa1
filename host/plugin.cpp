#include "host/plugin.h"

#include <string>
#include <utility>

namespace host {
namespace {

constexpr const char* kMigratorClass = "AccountsDataMigrator";

// What the installed plug-in stands on. The loader would look for it by its name in many directories first.
void openLibraryOf(const platform::Platform& platform, const std::filesystem::path& plugin) {
  const auto library = plugin.parent_path() / HOST_LIBRARY_FROM_PLUGIN;
  static_cast<void>(platform.modules->open(library.lexically_normal().string()));
}

std::filesystem::path installedPlugin() {
  static const auto kProgram = std::filesystem::read_symlink("/proc/self/exe");
  return (kProgram.parent_path() / HOST_PLUGIN_FROM_PROGRAM).lexically_normal();
}

platform::Status noPlugin(std::string reason) {
  return platform::Status::failure(platform::Cause::unsuitable, "load the plug-in", std::move(reason));
}

}  // namespace

platform::Result<std::unique_ptr<platform::DataClassMigrator>> loadMigrator(
    const platform::Platform& platform, const std::optional<std::filesystem::path>& given) {
  const auto plugin = given.value_or(installedPlugin());
  if (plugin == installedPlugin()) openLibraryOf(platform, plugin);
  const platform::Status opened = platform.modules->open(plugin.string());
  if (!opened.isOk()) return noPlugin("cannot load the plug-in: " + opened.reason());
  const std::string isNone = plugin.string() + " is no migrator plug-in: ";
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
