#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/export.h"
#include "platform/logs_and_notices.h"

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

// Standard error. Each message is one line, whatever it contains, and is written in one piece. A reader that has gone
// away does not end the process.
[[nodiscard]] std::shared_ptr<ConsoleLog> makeConsoleLog();

// The connection to the system bus that the notices share. It is made at the first notice and again where it broke.
class SystemBus;
[[nodiscard]] std::shared_ptr<SystemBus> makeSystemBus();

// Notices as signals on the system bus: path /com/vorlix/Notices, interface com.vorlix.Notices1, members
// PreferencesChanged (domain, key) and CloudTabs (whether enabled). Without a bus, or with one that does not answer
// within a second, a notice is lost; that is never an error.
[[nodiscard]] std::shared_ptr<PreferencesChangedNotice> makePreferencesChangedNotice(std::shared_ptr<SystemBus> bus);
[[nodiscard]] std::shared_ptr<CloudTabsNotice> makeCloudTabsNotice(std::shared_ptr<SystemBus> bus);

}  // namespace platform
