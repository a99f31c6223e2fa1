#pragma once

#include <string_view>

#include "platform/platform.h"
#include "records/message.h"

namespace migrator {

// Writes one message to the console: `format` with %@, %s, %d and %ld replaced by the arguments.
template <typename... Arguments>
void writeToConsole(std::string_view format, const Arguments&... arguments) {
  platform::current().console->write(records::message(format, {records::MessageArgument{arguments}...}));
}

}  // namespace migrator
