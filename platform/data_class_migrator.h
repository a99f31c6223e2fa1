#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/class_registry.h"
#include "platform/export.h"

namespace platform {

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
