#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/export.h"
#include "platform/system_log.h"

namespace platform {

// Where records can go. Asked for every record, since the journal may start after this process; the device's own sinks
// look again a tenth of a second after they last did.
struct LogSinks {
  std::function<bool()> hasJournal;
  std::function<void(const std::vector<std::string>& fields)> sendToJournal;  // "NAME=value" each
  std::function<bool()> hasSyslog;
  std::function<void(const std::string& line)> sendToSyslog;
};
[[nodiscard]] LogSinks systemLogSinks();

// The journal, with the parts of a record as its fields MESSAGE, PRIORITY, SUBSYSTEM, CATEGORY, CODE_FUNC and
// CODE_LINE, where there is one; else syslog, with one line a record.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<SystemLog> makeSystemLog(LogSinks sinks);

}  // namespace platform
