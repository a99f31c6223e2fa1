#pragma once

#include <memory>

#include "platform/console_log.h"

namespace platform {

// Standard error. Each message is one line, whatever it contains, and is written in one piece. A reader that has gone
// away does not end the process.
[[nodiscard]] std::shared_ptr<ConsoleLog> makeConsoleLog();

}  // namespace platform
