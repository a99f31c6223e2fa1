// A module that defines a class of the migrator's name which is no migrator.

#include <memory>

#include "platform/modules.h"

namespace {

const platform::ClassRegistration registration{std::make_shared<platform::ClassInfo>("AccountsDataMigrator")};

}  // namespace
