// A module that makes one class known.

#include "platform/class_registry.h"

namespace {

const platform::ClassRegistration registration{std::make_shared<platform::ClassInfo>("KnownClass")};

}  // namespace
