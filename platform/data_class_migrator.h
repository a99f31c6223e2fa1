#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/export.h"
#include "platform/modules.h"

namespace platform {

// A file that a run may make, change or delete.
struct MigrationFile {
  enum class Part : std::uint8_t {
    settings,  // what a run leaves behind
    legacy,    // what it converts and then deletes: the only copy of what is in it until the settings are saved
    sentinel,  // stands while legacy files are deleted: a later run that finds it has work to do
    marker,    // stands there or not; its bytes mean nothing
    other,
  };
  Part part = Part::other;
  std::filesystem::path path;
};

// What a host has to know about runs to keep copies of what they change. Records that a run only adds are not in it.
struct MigrationFootprint {
  std::string lockName;             // of the ExclusiveFileLock that performMigration takes
  std::string versionKey;           // under which the settings, a property list, tell their data version
  std::int64_t currentVersion = 0;  // the data version that a run leaves behind
  std::vector<MigrationFile> files;
  std::filesystem::path copyAside;  // where a run copies the settings before it begins; empty where it does not
};

// The base of every data-class migrator plug-in: what the migration host makes and calls once after a system update.
class ACCOUNT_EXPORT DataClassMigrator {
 public:
  DataClassMigrator() = default;
  DataClassMigrator(const DataClassMigrator&) = delete;
  DataClassMigrator& operator=(const DataClassMigrator&) = delete;
  virtual ~DataClassMigrator();

  [[nodiscard]] virtual std::string_view dataClassName() const = 0;
  // Migrates the data class; answers whether that succeeded. Never throws.
  virtual bool performMigration() = 0;
  // What a run on this platform may touch; empty where the migrator does not tell.
  [[nodiscard]] virtual MigrationFootprint footprint() const;
};

// How a plug-in makes itself known: opening it registers its migrator's class, under that class's name, as one of
// these.
class ACCOUNT_EXPORT DataClassMigratorClass : public ClassInfo {
 public:
  DataClassMigratorClass(std::string name, std::function<std::unique_ptr<DataClassMigrator>()> factory)
      : ClassInfo{std::move(name)}, make{std::move(factory)} {}
  ~DataClassMigratorClass() override;

  std::function<std::unique_ptr<DataClassMigrator>()> make;
};

}  // namespace platform
