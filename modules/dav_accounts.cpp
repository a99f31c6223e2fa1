// Accounts of calendars, contacts and bookmarks that are kept on a web server.

#include <array>
#include <utility>

#include "modules/account_classes.h"
#include "platform/kept_for_life.h"

namespace modules {
namespace {

constexpr ServiceKind kCalDAV{.name = "CalDAV",
                              .securePort = 443,
                              .plainPort = 80,
                              .hostSection = "CalDAVPrincipalConfiguration",
                              .hostKeyInSection = "CalDAV_Server_Key"};
constexpr ServiceKind kCardDAV{.name = "CardDAV", .securePort = 443, .plainPort = 80};
constexpr ServiceKind kBookmarkDAV{.name = "Bookmarks", .securePort = 443, .plainPort = 80};
constexpr ServiceKind kSubscribedCalendar{.name = "Subscribed Calendar", .securePort = 443, .plainPort = 80};

const accountsettings::AccountClassInfo* classForType(std::string_view type) {
  // Those who found a class keep its address until the process ends.
  using Classes = std::array<std::pair<std::string_view, AccountClass>, 4>;
  static const Classes& classes = platform::keptForLife<Classes>(Classes{{
      {accountsettings::kCalDAVAccountType, serviceAccountClass("CalDAVServiceAccount", kCalDAV)},
      {accountsettings::kCardDAVAccountType, serviceAccountClass("CardDAVServiceAccount", kCardDAV)},
      {accountsettings::kBookmarkDAVAccountType, serviceAccountClass("BookmarkDAVServiceAccount", kBookmarkDAV)},
      {accountsettings::kSubscribedCalendarAccountType,
       serviceAccountClass("SubscribedCalendarServiceAccount", kSubscribedCalendar)},
  }});
  for (const auto& [name, info] : classes) {
    if (name == type) return info.get();
  }
  return nullptr;
}

const platform::ClassRegistration kFullAccounts{fullAccountCreator("DAVAccountCreator", classForType)};
const platform::ClassRegistration kSyncAccounts{syncAccountCreator("DAVSyncAccountCreator")};

}  // namespace
}  // namespace modules
