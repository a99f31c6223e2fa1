// A module that makes one class known.

#include "platform/modules.h"

namespace {

const platform::ClassRegistration registration{std::make_shared<platform::ClassInfo>("KnownClass")};

}  // namespace
