#include "platform/data_class_migrator.h"

namespace platform {

// Defined here, so that the types have one home and are the same for the host and every plug-in.
DataClassMigrator::~DataClassMigrator() = default;
MigrationFootprint DataClassMigrator::footprint() const { return {}; }
DataClassMigratorClass::~DataClassMigratorClass() = default;

}  // namespace platform
