#pragma once

#include <string_view>

#include "platform/message.h"
#include "platform/platform.h"

namespace migrator {

// Writes one message to the console: `format` with %@, %s, %d and %ld replaced by the arguments.
template <typename... Arguments>
void writeToConsole(std::string_view format, const Arguments&... arguments) {
  platform::current().console->write(platform::message(format, {platform::MessageArgument{arguments}...}));
}

}  // namespace migrator
