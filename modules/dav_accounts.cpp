// Accounts of calendars, contacts and bookmarks that are kept on a web server.

#include <array>
#include <utility>

#include "modules/account_classes.h"

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
  static const std::array<std::pair<std::string_view, AccountClass>, 4> classes{{
      {accountsettings::kCalDAVAccountType, serviceAccountClass("CalDAVServiceAccount", kCalDAV)},
      {accountsettings::kCardDAVAccountType, serviceAccountClass("CardDAVServiceAccount", kCardDAV)},
      {accountsettings::kBookmarkDAVAccountType, serviceAccountClass("BookmarkDAVServiceAccount", kBookmarkDAV)},
      {accountsettings::kSubscribedCalendarAccountType,
       serviceAccountClass("SubscribedCalendarServiceAccount", kSubscribedCalendar)},
  }};
  for (const auto& [name, info] : classes) {
    if (name == type) return info.get();
  }
  return nullptr;
}

const platform::ClassRegistration fullAccounts{fullAccountCreator("DAVAccountCreator", classForType)};
const platform::ClassRegistration syncAccounts{syncAccountCreator("DAVSyncAccountCreator")};

}  // namespace
}  // namespace modules
