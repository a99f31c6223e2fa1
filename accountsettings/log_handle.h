#pragma once

#include <functional>
#include <memory>
#include <source_location>
#include <string>
#include <string_view>

#include "platform/export.h"
#include "platform/logs_and_notices.h"
#include "records/message.h"

namespace accountsettings {

// Where a message comes from: the full name of the logging method, in the system's own notation, and the source line of
// the logging call. Made from the name alone.
struct LogSite {
  std::string_view method;
  std::source_location place;

  LogSite(const char* name, std::source_location caller = std::source_location::current())
      : method{name}, place{caller} {}
};

// The library's log: subsystem "com.vorlix.accountsettings", category "log", default level. A message is written as
// `METHOD (LINE) "MESSAGE"`. While nobody reads the log, logging does nothing but ask.
class ACCOUNT_EXPORT LogHandle {
 public:
  explicit LogHandle(std::shared_ptr<platform::SystemLog> log) : _log{std::move(log)} {}

  // For whoever has work to do for a message before it can be logged.
  [[nodiscard]] bool hasReaders() const { return _log->hasReaders(); }

  // `format` with %@, %s, %d and %ld replaced by the arguments, which must outlive the call only.
  template <typename... Arguments>
  void log(const LogSite& site, std::string_view format, const Arguments&... arguments) const {
    if (hasReaders()) write(site, format, {records::MessageArgument{arguments}...});
  }

 private:
  void write(const LogSite& site, std::string_view format,
             std::initializer_list<records::MessageArgument> arguments) const;

  std::shared_ptr<platform::SystemLog> _log;
};

// The one log handle of the library, made at its first use from the platform as it is then, exactly once also when
// several threads ask at the same time, and kept for the life of the process.
[[nodiscard]] ACCOUNT_EXPORT const LogHandle& _ASLogSystem();

}  // namespace accountsettings
