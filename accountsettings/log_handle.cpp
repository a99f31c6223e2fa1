#include "accountsettings/log_handle.h"

#include "platform/kept_for_life.h"
#include "platform/platform.h"

namespace accountsettings {
namespace {

constexpr std::string_view kSubsystem = "com.vorlix.accountsettings";
constexpr std::string_view kCategory = "log";

}  // namespace

void LogHandle::write(const LogSite& site, std::string_view format,
                      std::initializer_list<records::MessageArgument> arguments) const {
  const std::function<std::string()> text = [&] {
    return records::message("%s (%d) \"%s\"", {site.method, site.place.line(), records::message(format, arguments)});
  };
  _log->write({kSubsystem, kCategory, site.method, site.place.line(), text});
}

const LogHandle& _ASLogSystem() {
  static const LogHandle& handle = platform::keptForLife<LogHandle>(platform::current().systemLog);
  return handle;
}

}  // namespace accountsettings
